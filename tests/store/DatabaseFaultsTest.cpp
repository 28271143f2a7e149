// SPDX-License-Identifier: Apache-2.0
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <fstream>

#include "StoreFixture.h"
#include "store/Schema.h"
#include "support/SampleRecords.h"

namespace keepsakes {
namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::HasSubstr;
using DatabaseFaults = StoreFixture;

std::vector<std::string> namesIn(const fs::path& folder, std::string_view part) {
    std::vector<std::string> names;
    for (const auto& entry : fs::directory_iterator(folder)) {
        const auto name = entry.path().filename().string();
        if (name.find(part) != std::string::npos) names.push_back(name);
    }
    return names;
}

TEST_F(DatabaseFaults, AFileThatIsNoDatabaseIsSetAsideAndToldOf) {
    close();
    platform.folder.write("cache/keepsakesDataModel.sqlite", std::string(8192, 'x'));
    open();
    EXPECT_EQ(storeAll({makeWorkout(1, 1, 2, "a")}), (Answer{"", 1}));
    EXPECT_EQ(namesIn(platform.services.cacheFolder, ".damaged-").size(), 1u);
    ASSERT_EQ(platform.problems.list().size(), 1u);
    EXPECT_THAT(platform.problems.list()[0], HasSubstr("the database was damaged"));
}

TEST_F(DatabaseFaults, DamageInsideIsFoundWhenItIsOpened) {
    for (std::uint32_t number = 0; number < 200; ++number) {
        storeAll({samples::fullEvent(number)});
    }
    close();
    {
        // Past the header, so that it still opens.
        std::fstream bytes(file(), std::ios::in | std::ios::out | std::ios::binary);
        bytes.seekp(8192);
        bytes << std::string(20000, '\x7f');
    }
    open();
    EXPECT_EQ(namesIn(platform.services.cacheFolder, ".damaged-").size(), 1u);
    EXPECT_TRUE(fetch({}).empty());
}

TEST_F(DatabaseFaults, ANewerVersionIsRefusedAndLeftAsItIs) {
    close();
    execute("PRAGMA journal_mode = DELETE");
    execute("PRAGMA user_version = 99");
    std::ifstream before(file(), std::ios::binary);
    const std::string bytes{std::istreambuf_iterator<char>(before), {}};
    open();
    manager->checkAvailabilityWithCompletionHandler([](bool available, const OptionalError& error) {
        EXPECT_FALSE(available);
        EXPECT_THAT(error->description(), HasSubstr("newer version"));
    });
    EXPECT_EQ(storeAll({makeWorkout(1, 1, 2, "a")}).error, "database is not avaialble");
    std::ifstream after(file(), std::ios::binary);
    EXPECT_TRUE(bytes == std::string(std::istreambuf_iterator<char>(after), {}));
}

TEST_F(DatabaseFaults, AFullDiskIsAnErrorAndPassesWhenThereIsRoom) {
    storeAll({makeWorkout(1, 1, 2, "a")});
    // A limit on the file's size stands for the disk's.
    std::signal(SIGXFSZ, SIG_IGN);
    rlimit whole{};
    getrlimit(RLIMIT_FSIZE, &whole);
    rlimit full = whole;
    full.rlim_cur = 200 * 1024;
    setrlimit(RLIMIT_FSIZE, &full);
    KSEventArray many;
    for (std::uint32_t number = 10; number < 3000; ++number)
        many.push_back(samples::fullEvent(number));
    const auto refused = storeAll(many);
    setrlimit(RLIMIT_FSIZE, &whole);
    EXPECT_THAT(refused.error, HasSubstr("database: "));
    EXPECT_EQ(numbersOf(fetch({})), std::vector{1}) << "nothing of it is stored";
    EXPECT_EQ(storeAll(many), (Answer{"", 2990}));
}

TEST_F(DatabaseFaults, WhatWasAnsweredOutlivesAKill) {
    close();
    for (int round = 0; round < 5; ++round) {
        int answered[2];
        ASSERT_EQ(pipe(answered), 0);
        const pid_t child = fork();
        if (child == 0) {
            // Without the test's threads: a store on the context itself.
            Problems problems;
            auto context = ManagedObjectContext::open(file(), problems, nullptr);
            for (std::uint32_t number = 0;; ++number) {
                const auto base = static_cast<std::uint32_t>(round) * 10000;
                const auto error = (*context)->save({.events = true}, [&] {
                    auto& insert = (*context)->statement(
                        "INSERT INTO KSEventMO (category, creationDate, endDate, eventIdentifier, "
                        "provider, startDate) VALUES (2, 0, 0, randomblob(16), 1, ?)");
                    insert.bind(1, base + number);
                    insert.exec();
                });
                if (error || write(answered[1], "x", 1) != 1) _exit(1);
            }
        }
        // Killed at a moment of its own choosing: after some number of answers.
        char byte = 0;
        for (int count = 0; count < 5 + 7 * round; ++count) {
            ASSERT_EQ(read(answered[0], &byte, 1), 1);
        }
        kill(child, SIGKILL);
        waitpid(child, nullptr, 0);
        ::close(answered[1]);
        int total = 5 + 7 * round;
        while (read(answered[0], &byte, 1) == 1) ++total;
        ::close(answered[0]);

        SQLite::Database database(file().string(), SQLite::OPEN_READWRITE);
        EXPECT_EQ(database.execAndGet("PRAGMA integrity_check").getString(), "ok");
        SQLite::Statement count(database, "SELECT count(*) FROM KSEventMO WHERE startDate >= ?");
        count.bind(1, round * 10000);
        ASSERT_TRUE(count.executeStep());
        EXPECT_GE(count.getColumn(0).getInt(), total);
    }
}

}  // namespace
}  // namespace keepsakes
