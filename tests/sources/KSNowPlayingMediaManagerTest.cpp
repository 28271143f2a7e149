// SPDX-License-Identifier: Apache-2.0
#include "sources/KSNowPlayingMediaManager.h"

#include <gmock/gmock.h>

#include "StoreFixture.h"
#include "support/RecordedAssertions.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr auto kPodcasts = "org.gnome.Podcasts";

class NowPlaying : public StoreFixture {
  protected:
    NowPlaying() {
        universe->add("EventStore", store);
        media = KSNowPlayingMediaManager::initWithUniverse(*universe);
    }

    /// A record of `title` at a second of an hour that lies a day back.
    NowPlayingRecord record(double at, PlaybackState state, std::string title,
                            std::int64_t duration = 200, std::string app = "player") const {
        NowPlayingRecord made;
        made.absoluteTimestamp = platform.clock.now() - 86400 + at;
        made.playbackState = state;
        made.duration = duration;
        if (!title.empty()) made.title = std::move(title);
        made.bundleID = std::move(app);
        return made;
    }
    /// Plays of so many seconds each, a thousand apart.
    void play(const std::string& title, const std::vector<double>& seconds,
              const std::string& app = "player", double from = 0) {
        for (const double length : seconds) {
            platform.media.records.push_back(record(from, PlaybackState::playing, title, 200, app));
            platform.media.records.push_back(
                record(from + length, PlaybackState::paused, title, 200, app));
            from += 1000;
        }
    }

    Answer collect() {
        Answer answer;
        media->fetchAndSaveRepeatedMediaPlayBetweenStartDate({0}, {1}, into(answer));
        media->waitForQueueEmpty();
        return answer;
    }
    Answer purge() {
        Answer answer;
        media->removeMediaPlayEventsDeletedAtSource(fetch({}), into(answer));
        return answer;
    }

    /// "<title> <repetitions> <seconds>" of what was found.
    std::vector<std::string> found(const std::vector<NowPlayingRecord>& records) const {
        std::vector<std::string> lines;
        for (const auto& play : media->repeatingMediasFromEvents(records)) {
            lines.push_back(*play->title + " " + std::to_string(play->repetitions) + " " +
                            std::to_string(std::lround(play->sumTimePlayed.value_or(-1))));
        }
        return lines;
    }

    std::shared_ptr<KSNowPlayingMediaManager> media;
};

TEST_F(NowPlaying, FindsWhatWasPlayedThreeTimesOrAtLeisure) {
    struct Row {
        const char* what;
        std::vector<double> plays;
        const char* app;
        std::vector<std::string> expected;
    };
    for (const auto& row : std::initializer_list<Row>{
             {"three times", {40, 50, 60}, "player", {"T 3 150"}},
             {"twice at length", {2700, 2700}, "player", {}},
             {"twice at length in a leisure app", {2700, 2700}, kPodcasts, {"T 2 5400"}},
             {"a minute in a leisure app", {30, 30}, kPodcasts, {"T 0 60"}},
             {"less in a leisure app", {30, 29}, kPodcasts, {}},
             {"exactly 30 seconds", {30, 40, 40}, "player", {}},
             {"just more", {30.5, 40, 40}, "player", {"T 3 111"}},
             {"a day is none, but adds up", {31, 31, 31, 86400}, "player", {"T 3 86493"}},
         }) {
        platform.media.records.clear();
        play("T", row.plays, row.app);
        EXPECT_EQ(found(platform.media.records), row.expected) << row.what;
    }
}

TEST_F(NowPlaying, PairsRecordsOfOneTitleAlone) {
    using enum PlaybackState;
    std::vector<NowPlayingRecord> records;
    for (int turn = 0; turn < 3; ++turn) {
        const double from = 1000.0 * turn;
        records.push_back(record(from, playing, "A"));
        records.push_back(record(from + 10, jumped, "A"));   // does not break the pair
        records.push_back(record(from + 20, stopped, "B"));  // another title's
        records.push_back(record(from + 40, replaced, "A"));
        records.push_back(record(from + 90, stopped, "A"));  // nothing began
        records.push_back(record(from, playing, "short", 30));
        records.push_back(record(from + 40, stopped, "short", 30));
        records.push_back(record(from, playing, "enough", 31));
        records.push_back(record(from + 40, stopped, "enough", 31));
        records.push_back(record(from, playing, ""));
        records.push_back(record(from + 40, stopped, ""));
    }
    records[records.size() - 8].bundleID = "last";
    EXPECT_THAT(found(records), ElementsAre("A 3 120", "enough 3 120"));
    const auto plays = media->repeatingMediasFromEvents(records);
    EXPECT_EQ(plays[0]->events.size(), 12u) << "all records of the title";
}

TEST_F(NowPlaying, StoresTheCoreAndFillsTheRestFromTheStream) {
    play("Talk", {40, 40, 40}, kPodcasts);
    play("Song", {40, 40, 40}, "player", 100);
    platform.media.records.back().artist = "Artist";
    platform.media.records.back().storeProductIdentifier = "id";
    EXPECT_EQ(collect(), (Answer{"", 2}));
    EXPECT_EQ(platform.media.asked, (std::vector<KSDate>{platform.clock.now() - 1209600}))
        << "whatever window was given";

    const auto stored = fetch({.ascending = true});
    ASSERT_EQ(stored.size(), 2u);
    EXPECT_EQ(stored[0]->category(), KSEventCategory::leisureMedia);
    EXPECT_EQ(stored[1]->category(), KSEventCategory::mediaOnRepeat);
    EXPECT_EQ(stored[1]->provider(), KSEventProvider::foresight);
    EXPECT_EQ(stored[1]->startDate(), platform.clock.now() - 86400 + 100);
    EXPECT_EQ(stored[1]->endDate(), platform.clock.now() - 86400 + 2140);
    EXPECT_EQ(stored[1]->expirationDate, platform.clock.now() + 2419200);
    EXPECT_EQ(stored[1]->identifierFromProvider, std::nullopt);
    EXPECT_EQ(stored[1]->mediaTitle, std::nullopt);

    const auto filled = media->rehydratedMediaPlayEvents(stored);
    ASSERT_EQ(filled.size(), 2u);
    EXPECT_EQ(filled[0]->mediaTitle, "Talk");
    EXPECT_EQ(filled[1]->eventIdentifier(), stored[1]->eventIdentifier());
    EXPECT_EQ(filled[1]->mediaTitle, "Song");
    EXPECT_EQ(filled[1]->mediaArtist, "Artist");
    EXPECT_EQ(filled[1]->mediaPlayerBundleId, "player");
    EXPECT_EQ(filled[1]->mediaProductId, "id");
    EXPECT_EQ(filled[1]->mediaRepetitions, 3);
    EXPECT_EQ(filled[1]->mediaSumTimePlayed, 120);
}

TEST_F(NowPlaying, StoresOnlyWhatBeganAfterTheNewestStored) {
    play("First", {40, 40, 40}, "player", 500);
    EXPECT_EQ(collect(), (Answer{"", 1}));
    play("Older", {40, 40, 40}, "player", 400);
    play("As old", {40, 40, 40}, kPodcasts, 500);
    EXPECT_EQ(collect(), (Answer{"", 0}));
    play("Newer", {40, 40, 40}, kPodcasts, 500.5);
    EXPECT_EQ(collect(), (Answer{"", 1}));
}

TEST_F(NowPlaying, RemovesWhatTheStreamNoLongerHolds) {
    play("Stays", {40, 40, 40});
    play("Goes", {40, 40, 40}, "player", 100);
    ASSERT_EQ(collect().count, 2);
    std::erase_if(platform.media.records, [](const auto& each) { return each.title == "Goes"; });
    const auto stored = fetch({});
    EXPECT_EQ(media->rehydratedMediaPlayEvents(stored).size(), 1u);
    EXPECT_EQ(purge(), (Answer{"", 1}));
    platform.media.nextError = KSError::make("Media", 1, "broken");
    EXPECT_EQ(purge(), (Answer{"", -1})) << "nothing is known, so nothing goes";
    EXPECT_EQ(fetch({}).size(), 1u);
    platform.media.records.clear();
    EXPECT_EQ(purge(), (Answer{"", 1}));
}

TEST_F(NowPlaying, AFailedReadingIsTheCollectionsErrorAndNobodyElsesRecords) {
    play("Song", {40, 40, 40});
    platform.media.nextError = KSError::make("Media", 1, "broken");
    EXPECT_EQ(collect(), (Answer{"broken", -1}));
    bool called = false;
    const auto heard = [&called](const auto&) { called = true; };
    platform.media.nextError = KSError::make("Media", 1, "broken");
    media->fetchRepeatedMediaPlayBetweenStartDate({0}, {1}, heard);
    media->waitForQueueEmpty();
    EXPECT_FALSE(called);
    media->fetchNowPlayingEventsBetweenStartDate({0}, {1}, heard);
    media->waitForQueueEmpty();
    EXPECT_TRUE(called);
}

TEST_F(NowPlaying, KeysAreTruncatedCentiseconds) {
    EXPECT_EQ(KSNowPlayingMediaManager::_providerIdOfStartDate({12.3456}, {-0.019}), "1234,-1");
    EXPECT_EQ(KSNowPlayingMediaManager::_providerIdOfStartDate({1e300}, {-1e300}),
              "9000000000000000000,-9000000000000000000");
}

TEST_F(NowPlaying, NeedsTheStoreAndTheStream) {
    RecordedAssertions assertions;
    EXPECT_EQ(KSNowPlayingMediaManager::initWithNowPlayingStream(&platform.media, platform.clock,
                                                                 nullptr),
              nullptr);
    EXPECT_THAT(assertions.take(), ElementsAre("Invalid parameter not satisfying: keepsakeStore "
                                               "(KSNowPlayingMediaManager:68)"));
    EXPECT_EQ(KSNowPlayingMediaManager::initWithNowPlayingStream(nullptr, platform.clock, store),
              nullptr);
    EXPECT_THAT(assertions.take(), IsEmpty());
}

}  // namespace
}  // namespace keepsakes
