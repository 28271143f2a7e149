// SPDX-License-Identifier: Apache-2.0
// The watcher and scripted players as processes, on a message bus of the test's own.
#include "linux/MediaWatcher.h"

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <condition_variable>
#include <cstdio>
#include <cstdlib>
#include <mutex>

#include "linux/PlayerProperties.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

/// A player that lives until it is destroyed, then vanishes without a word.
class ScriptedPlayer {
  public:
    ScriptedPlayer() : script_(popen("exec /usr/bin/python3 " MEDIA_PLAYER, "we")) {}
    ~ScriptedPlayer() { pclose(script_); }
    ScriptedPlayer(const ScriptedPlayer&) = delete;
    ScriptedPlayer& operator=(const ScriptedPlayer&) = delete;

    void tell(const std::string& line) {
        fmt::print(script_, "{}\n", line);
        std::fflush(script_);
    }
    void play(const std::string& title,
              const std::string& rest = R"("mpris:length": "i:90000000")") {
        tell(fmt::format(
            R"(say {{"PlaybackStatus": "Playing", "Metadata": {{"xesam:title": "{}", {}}}}})",
            title, rest));
    }

  private:
    std::FILE* const script_;
};

/// Time stands at what the test says. Waiting is for the watcher, which handles what players say
/// in their order; one that never does fails the test.
class Watching : public testing::Test {
  protected:
    void watch() {
        watcher =
            MediaWatcher::start(
                [this](const NowPlayingRecord& record) {
                    const std::lock_guard lock(mutex);
                    records.push_back(fmt::format("{} {} {} {}", record.absoluteTimestamp.seconds,
                                                  static_cast<int>(record.playbackState),
                                                  *record.title, record.bundleID.value_or("?")));
                    last = record;
                    changed.notify_all();
                },
                [this] {
                    const std::lock_guard lock(mutex);
                    return Moment{{time}, time};
                })
                .value();
    }

    void setTime(double seconds) {
        const std::lock_guard lock(mutex);
        time = seconds;
    }

    /// The next `count` records.
    std::vector<std::string> next(std::size_t count) {
        std::unique_lock lock(mutex);
        const bool came = changed.wait_for(lock, std::chrono::seconds(20),
                                           [&] { return records.size() >= count; });
        EXPECT_TRUE(came);
        return std::exchange(records, {});
    }

    std::mutex mutex;
    std::condition_variable changed;
    double time = 0;
    std::vector<std::string> records;
    NowPlayingRecord last;
    std::unique_ptr<MediaWatcher> watcher;
};

TEST_F(Watching, HearsPlayersThatAreThereThatComeAndThatVanish) {
    ScriptedPlayer early;
    early.tell("entry org.example.Early.desktop");
    early.tell(R"(keep {"PlaybackStatus": "Playing", "Metadata": {"xesam:title": "One",)"
               R"( "mpris:length": "i:90000000", "xesam:artist": ["A", "B"]}})");
    early.tell("own early.instance7");
    watch();
    EXPECT_THAT(next(1), ElementsAre("0 1 One org.example.Early"));
    EXPECT_EQ(last.artist, "A, B");
    EXPECT_EQ(last.duration, 90);
    {
        ScriptedPlayer late;
        late.tell(R"(keep {"PlaybackStatus": "Playing", "Metadata": {"xesam:title": "Two",)"
                  R"( "mpris:length": "d:80000000"}})");
        late.tell("own late.instance8");
        late.tell("own late");
        EXPECT_THAT(next(1), ElementsAre("0 1 Two late"));
        setTime(30);
        late.tell("drop late");
        late.tell(R"(say {"PlaybackStatus": "Paused"})");
        EXPECT_THAT(next(1), ElementsAre("30 2 Two late")) << "it still has a name";
        late.tell(R"(say {"PlaybackStatus": "Playing"})");
        EXPECT_THAT(next(1), ElementsAre("30 1 Two late"));
        setTime(40);
    }
    EXPECT_THAT(next(1), ElementsAre("40 3 Two late"));
    early.tell(R"(keep {"PlaybackStatus": "Paused"})");
    early.tell("hint PlaybackStatus");
    EXPECT_THAT(next(1), ElementsAre("40 2 One org.example.Early")) << "asked for it";
    early.tell(R"(say {"PlaybackStatus": "Playing"})");
    next(1);
    setTime(60);
    early.tell("seek 100000");
    EXPECT_THAT(next(2), ElementsAre("60 4 One org.example.Early", "60 1 One org.example.Early"));
    setTime(70);
    watcher.reset();
    EXPECT_THAT(next(1), ElementsAre("70 3 One org.example.Early")) << "its end ends the plays";
}

TEST_F(Watching, SurvivesNonsense) {
    ScriptedPlayer player;
    player.tell("own mad");
    watch();
    player.play("First");
    next(1);
    for (const auto* nonsense : {
             R"({"Metadata": "none", "PlaybackStatus": 7, "LoopStatus": ["Track"]})",
             R"({"Metadata": {"xesam:title": ["", "a", ""], "mpris:length": "long"}})",
             R"({"Metadata": {"xesam:title": {"a": 1}, "xesam:artist": 5, "mpris:trackid": true}})",
             R"({"Metadata": {"mpris:trackid": "o:/org/mpris/MediaPlayer2/TrackList/NoTrack"}})",
             R"({"PlaybackStatus": "Dancing", "Unheard": {"of": {"it": 1}}})",
             R"({"Metadata": {"xesam:title": "", "mpris:length": "i:-5"}})",
         }) {
        player.tell(std::string("say ") + nonsense);
    }
    EXPECT_THAT(next(1), ElementsAre("0 4 First mad"));
    player.play("x:5000000");
    EXPECT_THAT(next(1), ElementsAre("0 1 " + std::string(kLongestPlayerText, 'x') + " mad"));
    player.play("Live", R"("mpris:length": "i:9223372036854775807")");
    next(1);
    setTime(50);
    player.tell("seek -9223372036854775808");
    EXPECT_THAT(next(2), ElementsAre("0 1 Live mad", "50 4 Live mad"));
    EXPECT_EQ(last.duration, 50);
}

TEST_F(Watching, OnePlayerThatFloodsTheBusIsNotListenedTo) {
    ScriptedPlayer flood;
    ScriptedPlayer calm;
    flood.tell("own flood");
    calm.tell("own calm");
    watch();
    flood.play("Noise");
    EXPECT_THAT(next(1), ElementsAre("0 1 Noise flood"));
    flood.tell("flood 2000");
    EXPECT_THAT(next(1), ElementsAre("0 3 Noise flood"));
    flood.play("More noise");
    calm.play("Quiet");
    EXPECT_THAT(next(1), ElementsAre("0 1 Quiet calm"));
}

TEST(MediaWatcher, SaysThatThereIsNoBus) {
    const std::string bus = getenv("DBUS_SESSION_BUS_ADDRESS");
    setenv("DBUS_SESSION_BUS_ADDRESS", "unix:path=/nonexistent/bus", 1);
    const auto watcher =
        MediaWatcher::start([](const NowPlayingRecord&) {}, [] { return Moment(); });
    setenv("DBUS_SESSION_BUS_ADDRESS", bus.c_str(), 1);
    ASSERT_FALSE(watcher);
    EXPECT_THAT(watcher.error().description(), testing::HasSubstr("session bus"));
}

}  // namespace
}  // namespace keepsakes
