// SPDX-License-Identifier: Apache-2.0
#include "linux/PlayTracker.h"

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "linux/PlayerProperties.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

PlayerItem item(std::string title, std::optional<double> length = 200, std::string track = "") {
    PlayerItem made;
    made.trackId = std::move(track);
    made.title = std::move(title);
    made.lengthSeconds = length;
    return made;
}

/// Players act at seconds from the start; records come back as "<second> <state> <title>
/// <duration>".
class Tracker : public testing::Test {
  protected:
    void say(double at, const PlayerUpdate& update, const std::string& player = "a") {
        tracker.update(player, "app." + player, update, moment(at));
    }
    void play(double at, const PlayerItem& played, const std::string& player = "a") {
        say(at, {PlayerStatus::playing, played, {}}, player);
    }
    void pause(double at, const std::string& player = "a") {
        say(at, {PlayerStatus::paused, {}, {}}, player);
    }
    void jump(double at, double position) { tracker.jumped("a", position, moment(at)); }

    /// The machine sleeps for `asleep` seconds in all.
    Moment moment(double at) const { return {{at}, at - asleep}; }

    std::vector<std::string> take() { return std::exchange(records, {}); }

    double asleep = 0;
    std::vector<std::string> records;
    std::vector<NowPlayingRecord> whole;
    PlayTracker tracker{[this](const NowPlayingRecord& record) {
        static constexpr std::array kWords = {"?", "plays", "pauses", "stops", "ends", "jumps"};
        whole.push_back(record);
        records.push_back(fmt::format("{} {} {} {}", record.absoluteTimestamp.seconds,
                                      kWords[static_cast<std::size_t>(record.playbackState)],
                                      *record.title, record.duration));
    }};
};

TEST_F(Tracker, TellsOfEachStartPauseStopAndChange) {
    say(0, {PlayerStatus::paused, item("One"), {}});
    say(10, {PlayerStatus::playing, {}, {}});
    say(11, {PlayerStatus::playing, item("One"), {}});  // said again: nothing new
    pause(50);
    pause(51);
    play(60, item("One"));
    play(90, item("Two", 100));
    say(120, {PlayerStatus::stopped, {}, {}});
    play(130, item("Two", 100));
    tracker.gone("a", moment(140));
    tracker.gone("a", moment(141));
    EXPECT_THAT(take(), ElementsAre("10 plays One 200", "50 pauses One 200", "60 plays One 200",
                                    "90 ends One 200", "90 plays Two 100", "120 stops Two 100",
                                    "130 plays Two 100", "140 stops Two 100"));
    play(150, item("Three"));
    tracker.allGone(moment(160));
    EXPECT_THAT(take(), ElementsAre("150 plays Three 200", "160 stops Three 200"));
}

TEST_F(Tracker, LearnsOfAnItemLittleByLittle) {
    play(0, item("One", {}, "/1"));
    auto more = item("One", 200, "/1");
    more.artist = "Band";
    say(5, {{}, more, {}});
    say(6, {{}, item("One", {}), {}});  // and forgets it
    pause(40);
    ASSERT_THAT(take(), ElementsAre("0 plays One 200", "40 pauses One 200"));
    EXPECT_EQ(whole.back().artist, "Band");
    EXPECT_EQ(whole.back().album, std::nullopt);
    EXPECT_EQ(whole.back().bundleID, "app.a");
}

TEST_F(Tracker, AnItemWithoutALengthLastsAsLongAsItWasHeard) {
    play(0, item("Radio", {}));
    EXPECT_THAT(take(), IsEmpty()) << "nothing is known yet";
    jump(20, 500);
    pause(45.9);
    play(50, item("Radio", {}));
    pause(70);
    EXPECT_THAT(take(), ElementsAre("0 plays Radio 45", "45.9 pauses Radio 45", "50 plays Radio 20",
                                    "70 pauses Radio 20"));
}

TEST_F(Tracker, APlayLastsNoLongerThanItsItemUnlessTheOwnerJumped) {
    play(0, item("Hung", 40));
    pause(5000);
    EXPECT_THAT(take(), ElementsAre("0 plays Hung 40", "40 pauses Hung 40"));
    play(6000, item("Heard twice", 40));
    jump(6035, 10);
    jump(6040, 5);
    pause(6060);
    EXPECT_THAT(take(), ElementsAre("6000 plays Heard twice 40", "6035 jumps Heard twice 40",
                                    "6060 pauses Heard twice 40"));
}

TEST_F(Tracker, SleepOfTheMachineIsNotListening) {
    play(0, item("Long", 20000));
    asleep = 9000;
    pause(10000);
    EXPECT_THAT(take(), ElementsAre("0 plays Long 20000", "1000 pauses Long 20000"));
}

TEST_F(Tracker, ALoopedItemIsPlayedAgainEachTimeRound) {
    play(0, item("Told", 40));
    jump(1, 0);  // belongs to the start
    jump(40, 0.2);
    jump(80, 0);
    pause(100);
    EXPECT_THAT(take(), ElementsAre("0 plays Told 40", "40 ends Told 40", "40 plays Told 40",
                                    "80 ends Told 40", "80 plays Told 40", "100 pauses Told 40"));
    say(200, {PlayerStatus::playing, item("Silent", 40), true});
    pause(290);
    EXPECT_THAT(take(),
                ElementsAre("200 plays Silent 40", "240 ends Silent 40", "240 plays Silent 40",
                            "280 ends Silent 40", "280 plays Silent 40", "290 pauses Silent 40"));
    play(300, item("Twice in the list", 40, "/1"));
    say(340, {{}, item("Twice in the list", 40, "/2"), false});
    EXPECT_THAT(take(),
                ElementsAre("300 plays Twice in the list 40", "340 ends Twice in the list 40",
                            "340 plays Twice in the list 40"));
}

TEST_F(Tracker, WhatTwoPlayersSayOfOnePlayCountsOnce) {
    play(0, item("Clip"), "browser");
    play(0.1, item("Clip", 201), "integration");
    play(1, item("Song"), "other");
    pause(60, "browser");
    pause(60.1, "integration");
    pause(61, "other");
    EXPECT_THAT(take(), ElementsAre("0 plays Clip 200", "1 plays Song 200", "60 pauses Clip 200",
                                    "61 pauses Song 200"));
    play(70, item("Clip"), "integration");
    EXPECT_THAT(take(), ElementsAre("70 plays Clip 200"));
}

TEST_F(Tracker, PlaceholdersAreNoTitles) {
    for (const auto* title : {"", "Unknown", "loading…", "N/A", "A browser is playing media"}) {
        play(0, item(title));
        pause(100);
        EXPECT_THAT(take(), IsEmpty()) << title;
    }
    auto untitled = item("Untitled");
    untitled.artist = "A band that means it";
    play(200, untitled);
    EXPECT_THAT(take(), ElementsAre("200 plays Untitled 200"));
}

TEST_F(Tracker, AFloodOfItemsIsNotWrittenDown) {
    for (int number = 0; number < 1000; ++number) {
        play(0.01 * number, item(std::to_string(number)));
    }
    EXPECT_LE(take().size(), 2 * PlayTracker::kMostPlays);
    play(100, item("Later"));
    EXPECT_THAT(take(), ElementsAre("100 plays Later 200"));
    say(200, {{}, item("Short loop", 1), true});
    tracker.gone("a", moment(90000));
    EXPECT_LE(take().size(), 3 + 2 * PlayTracker::kMostLoops);
}

TEST(PlayerText, IsTrimmedAndCutBetweenCharacters) {
    EXPECT_EQ(cleanPlayerText("  a\n\tb\x01 c  "), "a b c");
    const std::string tail = "ä";
    const auto cut = cleanPlayerText(std::string(kLongestPlayerText - 1, 'x') + tail + tail);
    EXPECT_EQ(cut, std::string(kLongestPlayerText - 1, 'x'));
}

TEST(PlayerText, NamesTheApplication) {
    constexpr auto kName = "org.mpris.MediaPlayer2.vid.instance42";
    EXPECT_EQ(playerApplication("org.example.Vid", kName), "org.example.Vid");
    EXPECT_EQ(playerApplication("org.example.Vid.desktop", kName), "org.example.Vid");
    EXPECT_EQ(playerApplication("", kName), "vid");
    EXPECT_EQ(playerApplication("", "org.mpris.MediaPlayer2.a.b"), "a.b");
}

}  // namespace
}  // namespace keepsakes
