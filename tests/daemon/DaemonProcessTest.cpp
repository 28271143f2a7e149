// SPDX-License-Identifier: Apache-2.0
// The daemon as a process on a bus of its own, with its indexer and real files.
#include <SQLiteCpp/SQLiteCpp.h>
#include <fcntl.h>
#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <fstream>
#include <thread>

#include "client/ConduitClient.h"
#include "support/MockService.h"
#include "support/TemporaryFolder.h"
#include "support/TestEvents.h"

namespace keepsakes {
namespace {

using testing::HasSubstr;
using testing::MatchesRegex;

constexpr const char* kTrack =
    R"(<gpx version="1.1"><trk><type>hiking</type><trkseg>)"
    R"(<trkpt lat="47.5" lon="13.6"><time>2024-06-15T08:02:00Z</time></trkpt>)"
    R"(<trkpt lat="47.6" lon="13.6"><time>2024-06-15T10:31:00Z</time></trkpt>)"
    R"(</trkseg></trk></gpx>)";

class DaemonProcess : public testing::Test {
  protected:
    DaemonProcess() {
        setenv("XDG_CACHE_HOME", (folder / "cache").c_str(), 1);
        setenv("XDG_CONFIG_HOME", (folder / "config").c_str(), 1);
        setenv("XDG_STATE_HOME", (folder / "state").c_str(), 1);
        std::filesystem::create_directories(folder / "tracks");
        configure("tracks = [\"" + (folder / "tracks").string() + "\"]\nphotos = []\n");
    }
    ~DaemonProcess() override {
        if (running > 0) end(SIGKILL);
    }

    void configure(const std::string& deviceData) {
        folder.write("config/keepsakesd/config.toml", "[device_data]\n" + deviceData);
    }

    /// Waits until it holds; a daemon that ends meanwhile is a failure.
    template <class Condition>
    void waitUntil(const Condition& holds) const {
        while (!holds()) {
            siginfo_t ended{};
            waitid(P_PID, static_cast<id_t>(running), &ended, WEXITED | WNOHANG | WNOWAIT);
            ASSERT_EQ(ended.si_pid, 0) << log();
            std::this_thread::yield();
        }
    }

    void waitForLog(const std::string& text) const {
        waitUntil([this, &text] { return log().find(text) != std::string::npos; });
    }

    /// Starts a daemon whose log goes to a file; does not wait for it.
    pid_t start() {
        const pid_t child = fork();
        if (child == 0) {
            const int log = open((folder / "log").c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
            dup2(log, STDERR_FILENO);
            execl(KEEPSAKESD, "keepsakesd", "--now", "2024-06-16T18:00:00Z", nullptr);
            _exit(127);
        }
        return child;
    }

    /// Starts the daemon and waits until it answers.
    void startAndConnect() {
        running = start();
        client = ConduitClient::connect().value();
        waitUntil([this] { return client->status().has_value(); });
    }

    int end(int signal) {
        kill(running, signal);
        return exitStatusOf(std::exchange(running, 0));
    }

    static int exitStatusOf(pid_t child) {
        int status = 0;
        waitpid(child, &status, 0);
        return WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
    }

    bool hasThread(const std::string& name) const {
        const auto tasks = "/proc/" + std::to_string(running) + "/task";
        for (const auto& task : std::filesystem::directory_iterator(tasks)) {
            std::ifstream in(task.path() / "comm");
            std::string comm;
            if (in >> comm && comm == name) return true;
        }
        return false;
    }

    std::string log() const {
        std::ifstream in(folder / "log");
        return {std::istreambuf_iterator<char>(in), {}};
    }

    std::string integrity() const {
        SQLite::Database database(
            (folder / "cache/com.brindle.keepsakesd/keepsakesDataModel.sqlite").string(),
            SQLite::OPEN_READWRITE);
        return database.execAndGet("PRAGMA integrity_check").getString();
    }

    TemporaryFolder folder;
    pid_t running = 0;
    std::unique_ptr<ConduitClient> client;
};

TEST_F(DaemonProcess, WhatWasAnsweredOutlivesAKillAndFilesBecomeBundles) {
    folder.write("tracks/hike.gpx", kTrack);
    folder.write("tracks/broken.gpx", "<gpx><trk>");
    startAndConnect();
    ASSERT_FALSE(client->storeEvents({makeWorkout(1, 700000000, 700000600, "Running")}));
    ASSERT_FALSE(client->collectEvents());
    ASSERT_FALSE(client->bundleEvents());
    EXPECT_EQ(end(SIGKILL), -SIGKILL);
    EXPECT_EQ(integrity(), "ok");

    startAndConnect();
    const auto events = client->fetchEventsWithOptions({.ascending = true}).value();
    ASSERT_EQ(events.size(), 2u);
    EXPECT_EQ(events[0]->workoutType, "Running");
    EXPECT_EQ(events[1]->workoutType, "Hiking");
    const auto bundles = client->fetchEventBundlesWithOptions({}).value();
    ASSERT_EQ(bundles.size(), 1u);
    EXPECT_THAT(*bundles[0]->promptLanguage, HasSubstr("A cardio workout: Hiking, Saturday"));
    ASSERT_FALSE(client->collectEvents());
    const auto status = client->status().value();
    EXPECT_EQ(status.filesRefused, 1u);
    ASSERT_EQ(status.problems.size(), 1u);
    EXPECT_THAT(status.problems[0], HasSubstr("broken.gpx"));
    EXPECT_EQ(client->fetchEventsWithOptions({}).value().size(), 2u) << "collected once";
    EXPECT_EQ(end(SIGTERM), 0);
}

/// A stay of twenty minutes, and where the owner went from there.
std::string stayedAt(const std::string& day, double latitude) {
    std::string points;
    const auto start = parseISO8601(day + "T10:00:00Z")->date;
    for (int minute = 0; minute <= 20; ++minute) {
        points += fmt::format(R"(<trkpt lat="{}" lon="13.6"><time>{}</time></trkpt>)", latitude,
                              formatISO8601(start + 60 * minute));
    }
    return "<gpx version=\"1.1\"><trk><trkseg>" + points + "</trkseg></trk></gpx>";
}

TEST_F(DaemonProcess, ADeletedTrackTakesItsVisitsAlongAtThePurge) {
    folder.write("tracks/friday.gpx", stayedAt("2024-06-14", 47.5));
    folder.write("tracks/saturday.gpx", stayedAt("2024-06-15", 47.6));
    startAndConnect();
    ASSERT_FALSE(client->collectEvents());
    ASSERT_EQ(client->fetchEventsWithOptions({}).value().size(), 2u);
    ASSERT_FALSE(client->purgeEvents());
    EXPECT_EQ(client->fetchEventsWithOptions({}).value().size(), 2u);
    std::filesystem::remove(folder / "tracks/friday.gpx");
    ASSERT_FALSE(client->purgeEvents());
    const auto left = client->fetchEventsWithOptions({}).value();
    ASSERT_EQ(left.size(), 1u);
    EXPECT_EQ(formatISO8601(left[0]->startDate()), "2024-06-15T10:00:00Z");
    EXPECT_EQ(formatISO8601(left[0]->endDate()), "2024-06-15T10:20:00Z");
}

TEST_F(DaemonProcess, ASongOnRepeatBecomesABundle) {
    startAndConnect();
    SQLite::Database((folder / "cache/com.brindle.keepsakesd/mediaStream.sqlite").string(),
                     SQLite::OPEN_READWRITE, 5000)
        .exec(
            "WITH plays(start) AS (VALUES (740217600), (740218000), (740219000)), "
            "     states(state, after) AS (VALUES (1, 0), (2, 180)) "
            "INSERT INTO records(timestamp, state, duration, title, artist) "
            "SELECT start + after, state, 200, 'Song', 'Band' FROM plays, states "
            "ORDER BY start, state");
    ASSERT_FALSE(client->collectEvents());
    ASSERT_FALSE(client->bundleEvents());
    const auto bundles = client->fetchEventBundlesWithOptions({}).value();
    ASSERT_EQ(bundles.size(), 1u);
    EXPECT_THAT(*bundles[0]->promptLanguage,
                HasSubstr("Played again and again: Song by Band (3 times), Sunday"));
    EXPECT_EQ(bundles[0]->events[0]->mediaSumTimePlayed, 540);
}

TEST_F(DaemonProcess, ListensToPlayersUnlessTheOwnerSaysNo) {
    for (const bool wanted : {true, false}) {
        configure(std::string("tracks = []\nphotos = []\nmedia = ") + (wanted ? "true" : "false"));
        startAndConnect();
        EXPECT_EQ(hasThread("media"), wanted);
        EXPECT_EQ(end(SIGTERM), 0);
    }
}

TEST_F(DaemonProcess, SigtermDuringACollectionEndsInOrder) {
    for (int file = 0; file < 300; ++file) {
        folder.write("tracks/" + std::to_string(file) + ".gpx", kTrack);
    }
    startAndConnect();
    std::thread caller([] {
        const auto other = ConduitClient::connect().value();
        static_cast<void>(other->collectEvents());
    });
    // The first sign of the collection is its date on disk.
    waitUntil([this] {
        const auto status = client->status();
        return status && status->lastCollection != 0;
    });
    EXPECT_EQ(end(SIGTERM), 0) << log();
    caller.join();
    EXPECT_EQ(integrity(), "ok");
}

TEST_F(DaemonProcess, ASecondDaemonSaysThatTheNameIsTaken) {
    startAndConnect();
    const pid_t second = start();
    EXPECT_EQ(exitStatusOf(second), 1);
    EXPECT_THAT(log(), HasSubstr("taken"));
    EXPECT_TRUE(client->status());
}

TEST_F(DaemonProcess, ABadConfigurationIsNamedInOneLine) {
    configure("tracks = []\nfotos = []\n");
    EXPECT_EQ(exitStatusOf(start()), 1);
    EXPECT_THAT(log(), MatchesRegex("keepsakesd: [^\n]*config.toml:3: device_data.fotos:[^\n]*\n"));
}

TEST_F(DaemonProcess, StartsLockedAndOpensTheDatabaseWithTheUnlock) {
    MockService::useSessionBusAsSystemBus();
    MockLogind logind;
    logind.startWithUser();
    logind.addSession("c1", true, true);
    configure("tracks = []\nphotos = []\n[device]\ncontent_protection = true\n");
    startAndConnect();
    EXPECT_FALSE(client->status()->databaseAvailable);
    EXPECT_EQ(client->fetchEventsWithOptions({}).error().code, 16);
    logind.end();
    logind.startWithUser();
    logind.addSession("c1", true, true);
    EXPECT_FALSE(client->status()->databaseAvailable);
    logind.setLocked("c1", false);
    waitUntil([this] {
        const auto status = client->status();
        return status && status->databaseAvailable;
    });
    EXPECT_EQ(end(SIGTERM), 0) << log();
}

TEST_F(DaemonProcess, WaitsForTheChargerWhenToldTo) {
    MockService::useSessionBusAsSystemBus();
    MockUPower upower;
    upower.start();
    upower.addBattery("battery", 50);
    configure(
        "tracks = []\nphotos = []\n[activities]\ncollection = \"1s\"\n"
        "require_external_power = true\n");
    startAndConnect();
    waitForLog("eventCollection waits for external power");
    EXPECT_EQ(client->status()->lastCollection, 0);
    upower.update("/org/freedesktop/UPower", "org.freedesktop.UPower", "{'OnBattery': <false>}");
    waitForLog("eventCollection finished");
    EXPECT_GT(client->status()->lastCollection, 0);
    EXPECT_EQ(end(SIGTERM), 0) << log();
    EXPECT_TRUE(std::filesystem::exists(folder / "state/keepsakesd/activities.plist"));
}

TEST_F(DaemonProcess, ReportsWhatItIsDoingAndThatItsSettingsBroke) {
    startAndConnect();
    configure("tracks = []\nphotos = 3\n");
    waitForLog("config.toml:3: device_data.photos");
    kill(running, SIGUSR1);
    waitForLog("report: ends");
    const auto report = log();
    for (const auto* text : {"report:   DaemonClientNotifier: somebody listens", "KSEventManager",
                             "EventPurgeScheduler: com.brindle.keepsakesd.eventPurge: due in",
                             "DiagnosticReport: running", "events 0, bundles 0", "problems 1",
                             "the settings before it stay in force"}) {
        EXPECT_THAT(report, HasSubstr(text));
    }
    EXPECT_EQ(client->status()->problems.size(), 1u);
    EXPECT_EQ(end(SIGTERM), 0);
}

}  // namespace
}  // namespace keepsakes
