// SPDX-License-Identifier: Apache-2.0
#include "devicedata/MediaStreamFile.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <optional>
#include <string>
#include <vector>

#include "core/Problems.h"
#include "support/TemporaryFolder.h"
#include "support/VirtualClock.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class MediaStream : public testing::Test {
  protected:
    void open() { stream.emplace(path, clock, problems); }

    NowPlayingRecord record(std::string title, double age = 0) const {
        NowPlayingRecord made;
        made.title = std::move(title);
        made.duration = 100;
        made.absoluteTimestamp = clock.now() - age;
        return made;
    }
    void add(const NowPlayingRecord& made) { EXPECT_EQ(stream->append(made), std::nullopt); }

    /// The titles from `start` on, or the error.
    std::vector<std::string> titles(KSDate start = {0}) {
        std::vector<std::string> found;
        stream->read(
            start, [&found](const NowPlayingRecord& each) { found.push_back(*each.title); },
            [&found](const OptionalError& error) {
                if (error) found = {"error: " + error->description()};
            });
        return found;
    }

    TemporaryFolder folder;
    const std::filesystem::path path = folder / "cache/mediaStream.sqlite";
    VirtualClock clock;
    Problems problems;
    std::optional<MediaStreamFile> stream;
};

TEST_F(MediaStream, GivesRecordsBackWholeInTheOrderOfTheirArrival) {
    open();
    struct stat info {};
    ASSERT_EQ(::stat(path.c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 0777, 0600u);

    auto full = record("it's; \"quoted\" ä");
    full.album = "Album";
    full.artist = "Artist";
    full.genre = "";
    full.mediaType = "song";
    full.bundleID = "org.example.Player";
    full.storeProductIdentifier = "id";
    full.playbackState = PlaybackState::jumped;
    add(full);
    add(record("written late", 50));
    open();
    std::vector<NowPlayingRecord> records;
    stream->read(
        clock.now() - 50, [&records](const NowPlayingRecord& each) { records.push_back(each); },
        [](const OptionalError& error) { EXPECT_EQ(error, std::nullopt); });
    ASSERT_EQ(records.size(), 2u);
    EXPECT_EQ(records[0], full);
    EXPECT_EQ(records[1], record("written late", 50));
    EXPECT_THAT(titles(clock.now() - 49), ElementsAre(*full.title));
}

TEST_F(MediaStream, KeepsThirtyDays) {
    open();
    add(record("old"));
    clock.step(29 * 86400.0);
    add(record("new"));
    EXPECT_THAT(titles(), ElementsAre("old", "new"));
    clock.step(1.5 * 86400.0);
    EXPECT_THAT(titles(), ElementsAre("new")) << "whoever reads finds nothing older";
    SQLite::Database file(path.string());
    EXPECT_EQ(file.execAndGet("SELECT count(*) FROM records").getInt(), 1) << "and it is gone";
}

TEST_F(MediaStream, KeepsTheNewestOfTooMany) {
    open();
    {
        SQLite::Database file(path.string(), SQLite::OPEN_READWRITE);
        file.exec("WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < " +
                  std::to_string(MediaStreamFile::kMostRecords) +
                  ") INSERT INTO records(timestamp, state, duration, title)"
                  " SELECT 700000000, 1, 100, i FROM n");
    }
    add(record("newest"));
    const auto found = titles();
    ASSERT_EQ(found.size(), MediaStreamFile::kMostRecords);
    EXPECT_EQ(found.front(), "2");
    EXPECT_EQ(found.back(), "newest");
}

TEST_F(MediaStream, SetsADamagedFileAsideAndRefusesANewerOne) {
    folder.write("cache/mediaStream.sqlite", std::string(5000, 'x'));
    open();
    add(record("fresh"));
    EXPECT_THAT(titles(), ElementsAre("fresh"));
    EXPECT_THAT(problems.list(), ElementsAre(HasSubstr("mediaStream.sqlite.damaged-")));
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(folder / "cache"), {}), 2);

    SQLite::Database(path.string(), SQLite::OPEN_READWRITE).exec("PRAGMA user_version = 99");
    EXPECT_THAT(titles(), ElementsAre(HasSubstr("newer version")));
    EXPECT_THAT(stream->append(record("lost"))->description(), HasSubstr("newer version"));
    SQLite::Database(path.string(), SQLite::OPEN_READWRITE).exec("PRAGMA user_version = 1");
    EXPECT_THAT(titles(), ElementsAre("fresh"));
}

TEST_F(MediaStream, AFileThatIsDamagedWhileItIsReadIsNotTakenForAnEmptyOne) {
    open();
    for (int number = 0; number < 200; ++number) add(record(std::string(100, 'x')));
    std::filesystem::resize_file(path, 3 * 4096);
    EXPECT_THAT(titles(), ElementsAre(HasSubstr("error: ")));
    EXPECT_THAT(titles(), IsEmpty());
}

TEST_F(MediaStream, AFolderThatCannotBeMadeIsAnError) {
    folder.write("cache", "in the way");
    open();
    EXPECT_TRUE(stream->append(record("x")));
    EXPECT_EQ(problems.list().size(), 1u);
}

}  // namespace
}  // namespace keepsakes
