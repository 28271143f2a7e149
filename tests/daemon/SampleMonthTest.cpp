// SPDX-License-Identifier: Apache-2.0
// The daemon left alone with the sample set, from the first Monday of its month on.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <cstdlib>
#include <deque>
#include <fstream>
#include <map>
#include <set>
#include <sstream>

#include "bundle/BundleRules.h"
#include "bundle/KSEventBundleManager.h"
#include "collect/KSEventManager.h"
#include "core/Json.h"
#include "core/PropertyList.h"
#include "daemon/KSDaemonUniverse.h"
#include "devicedata/IndexedCalendarService.h"
#include "devicedata/IndexedContactStore.h"
#include "devicedata/IndexedHealthStore.h"
#include "devicedata/IndexedInteractionStore.h"
#include "devicedata/IndexedPhotoAnalysis.h"
#include "devicedata/IndexedProfileEventStore.h"
#include "devicedata/IndexedRoutineService.h"
#include "devicedata/IndexedSearchIndex.h"
#include "devicedata/IndexedTopicStore.h"
#include "devicedata/MediaStreamFile.h"
#include "linux/ActivityTimers.h"
#include "linux/AnalyticsLog.h"
#include "notify/KSDispatcher.h"
#include "notify/KSNotifier.h"
#include "support/ScannedFolders.h"
#include "support/TestPlatform.h"

namespace keepsakes {
namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::IsSupersetOf;
using testing::Pair;
using testing::SizeIs;

const std::filesystem::path kSample = KEEPSAKES_SAMPLE;

/// For each rule a bundle that it forms in the month.
const std::map<std::string, std::string, std::less<>> kShownBy = {
    {"ActiveBabyParent",
     "Active with the baby: Running, Wednesday 18:30 to 19:15, 3 photos of a baby"},
    {"ActivePetParent", "Active with a pet: Running, Wednesday 18:30 to 19:15, 3 photos of a pet"},
    {"AnniversaryPhotos",
     "An anniversary: Sunday 13:09 to 14:06, 2 photos of an anniversary, with Tom Vorlage"},
    {"BabyParent", "Time with the baby: Monday 18:21 to 18:32, 2 photos of a baby, with Mia"},
    {"BirthdayPhotos",
     "A birthday: Friday 19:30 to 21:16, 5 photos of a birthday, with Anna Beispiel and Jakob "
     "Muster"},
    {"CardioActivity", "A cardio workout: Swimming, Sunday 15:05 to 15:43"},
    {"HikingPlusPhotos",
     "A hike with photos: Hiking, Saturday 10:02 to 12:31, 6 photos of mountains, with Anna "
     "Beispiel and Jakob Muster"},
    {"MediaOnRepeat",
     "Played again and again: Morgenlauf by Die Beispiele (4 times), Wednesday 18:31 to 18:49"},
    {"PetParent", "Time with a pet: Wednesday 20:04 to 20:06, 1 photo of a pet"},
    {"SignificantContactInteraction",
     "In touch with somebody close: Tom Vorlage, Monday 19:15 to 21:34, 2 messages and 1 call"},
    {"StructuredEventMovie", "A film: Kino: Der lange Sommer, Thursday 20:15 to 22:30"},
    {"StructuredEventTransportation",
     "On the way: Zug von Graz nach Frohnleiten, Saturday 09:28 to 09:57"},
    {"TravelEvent", "A trip: Hamburg, 6 to 9 June, Thursday 06:30 to Sunday 16:20"},
    {"VisitPlusAmusementPark",
     "A visit to an amusement park: Märchenpark Rosental, Thursday 09:50 to 16:20, 3 photos of an "
     "amusement park, with Mia and Tom Vorlage"},
    {"VisitPlusConcert",
     "A concert: Konzerthaus, Saturday 19:15 to 22:41, 2 photos of a concert, with Anna Beispiel"},
    {"WeddingPhotos",
     "A wedding: Saturday 14:01 to 16:13, 4 photos of a wedding, with Lena Vorlage, Anna Beispiel "
     "and Tom Vorlage"},
};

class SampleMonth : public testing::Test {
  protected:
    SampleMonth() {
        setenv("TZ", "Europe/Vienna", 1);  // NOLINT(concurrency-mt-unsafe): before any thread
        platform.clock.step(monday.seconds - platform.clock.now().seconds);
        auto& services = platform.services;
        services.healthStore = &health;
        services.photoAnalysis = &photos;
        services.routineService = &routine;
        services.interactionStore = &interactions;
        services.contactStore = &contacts;
        services.topicStore = &topics;
        services.searchIndex = &links;
        services.profileEventStore = &profile;
        services.calendars = &calendars;
        services.nowPlayingStream = &media;
        services.deviceData = &folders;
        services.analytics = &*analytics;
        services.activities = &timers;
        platform.defaults.values["com.brindle.Sharelane/LinkshelfEnabled"] = true;
        universe.emplace(services);
        listen();
    }
    ~SampleMonth() override {
        collections->invalidate();
        timers.stop();
        universe.reset();
        unsetenv("TZ");  // NOLINT(concurrency-mt-unsafe): after the last thread
    }

    /// How many stored events there are of each category.
    std::map<std::string, int> events() {
        std::map<std::string, int> counts;
        universe->service<KSEventManager>("EventManager")
            ->fetchEventsWithOptions({}, [&](const KSEventArray& found, const OptionalError&) {
                for (const auto& event : found) {
                    const bool trend = event->provider() == KSEventProvider::postAnalytics;
                    ++counts[trend ? "Trend" : event->describeCategory()];
                }
            });
        WorkerThreads::shared().settle();
        return counts;
    }

    /// Notes of each collection which sources failed.
    void listen() {
        collections = KSDispatcher::initWithNotifier(
            universe->service<KSNotifier>("EventCollectionSchedulerNotifier"));
        collections->registerForNotification(2, [this](std::int32_t, const KSValue& payload) {
            ++collected;
            for (const auto& [key, value] : *payload.asDictionary()) {
                if (key.ends_with("Success") && value == KSValue(false)) failed.insert(key);
            }
        });
    }

    /// What the owner's player played, in order.
    static std::deque<NowPlayingRecord> plays() {
        std::deque<NowPlayingRecord> records;
        std::ifstream file(kSample / "media/plays.csv");
        std::string line;
        std::getline(file, line);  // the columns' names
        while (std::getline(file, line)) {
            std::istringstream text(line);
            std::array<std::string, 8> columns;
            for (auto& column : columns) std::getline(text, column, ',');
            const auto& [timestamp, state, duration, title, album, artist, genre, player] = columns;
            records.push_back({.duration = std::stol(duration),
                               .title = title,
                               .album = album,
                               .artist = artist,
                               .genre = genre,
                               .bundleID = player,
                               .playbackState = static_cast<PlaybackState>(std::stol(state)),
                               .absoluteTimestamp = {std::stod(timestamp)}});
        }
        return records;
    }

    /// Lets time pass, and the player play.
    void liveUntil(KSDate end) {
        while (!toPlay.empty() && toPlay.front().absoluteTimestamp <= end) {
            platform.clock.advance(toPlay.front().absoluteTimestamp - platform.clock.now());
            EXPECT_FALSE(media.append(toPlay.front()));
            toPlay.pop_front();
        }
        platform.clock.advance(end - platform.clock.now());
    }

    /// Adds the sentences of the bundles that rules formed.
    void addSuggestions(std::set<std::string>& sentences) {
        universe->service<KSEventBundleManager>("EventBundleManager")
            ->fetchEventBundlesWithOptions(
                {.ascending = true, .filterBundle = true},
                [&](const KSEventBundleArray& found, const OptionalError&, const KSDictionary&) {
                    for (const auto& bundle : found) {
                        // Those of a day of contacts that went on once the bundle was formed have
                        // none.
                        if (bundle->events.empty()) continue;
                        sentences.insert(bundle->promptLanguage.value_or(""));
                    }
                });
        WorkerThreads::shared().settle();
    }

    /// What the analytics sink wrote, line by line.
    std::vector<KSDictionary> lines() {
        analytics->flush();
        std::vector<KSDictionary> read;
        std::ifstream file(platform.folder / "analytics.jsonl");
        for (std::string line; std::getline(file, line);) {
            const auto value = parseJson(line);
            if (!value || !value->asDictionary()) {
                ADD_FAILURE() << line;
                continue;
            }
            read.push_back(*value->asDictionary());
        }
        return read;
    }

    const KSDate monday = parseISO8601("2024-05-20T00:00:00+02:00")->date;
    TestPlatform platform;
    const std::filesystem::path index = platform.folder / "deviceData.sqlite";
    IndexedHealthStore health{index, {}};
    IndexedPhotoAnalysis photos{index};
    IndexedRoutineService routine{index, platform.clock};
    IndexedInteractionStore interactions{index};
    IndexedContactStore contacts{index};
    IndexedSearchIndex links{index, {"+43 664 555 00 77"}};
    IndexedProfileEventStore profile{index};
    IndexedCalendarService calendars{index};
    MediaStreamFile media{platform.folder / "mediaStream.sqlite", platform.clock,
                          platform.problems};
    IndexedTopicStore topics{index, {}, media, platform.problems};
    ScannedFolders folders{[this] {
        return ScanOptions{.index = index,
                           .tracks = {kSample / "tracks"},
                           .photos = {kSample / "photos"},
                           .places = {kSample / "places"},
                           .gazetteer = {},
                           .messages = {kSample / "messages"},
                           .calendars = {kSample / "calendars"},
                           .contacts = {kSample / "contacts"},
                           .now = platform.clock.now(),
                           .latest = monday + 60 * kDay};
    }};
    std::optional<AnalyticsLog> analytics{std::in_place, platform.folder / "analytics.jsonl",
                                          platform.clock};
    ActivityTimers timers{platform.clock,
                          platform.power,
                          {{"com.brindle.keepsakesd.eventCollection", 4 * kHour},
                           {"com.brindle.keepsakesd.eventCompute", 12 * kHour},
                           {"com.brindle.keepsakesd.eventPurge", kDay}},
                          platform.folder / "activities.plist"};
    std::optional<KSDaemonUniverse> universe;
    std::shared_ptr<KSDispatcher> collections;
    std::deque<NowPlayingRecord> toPlay = plays();
    int collected = 0;             // these two in the dispatcher's turn, read when all is at rest
    std::set<std::string> failed;  // keys of a collection's result
};

TEST_F(SampleMonth, IsCollectedBundledAnalysedAndPurgedByItself) {
    std::set<std::string> sentences;
    for (int week = 1; week <= 4; ++week) {
        liveUntil(monday + week * 7 * kDay + 0.5 * kHour);
        addSuggestions(sentences);
    }
    // Visits are kept for a week, media for two, the others for four.
    EXPECT_THAT(
        events(),
        ElementsAre(Pair("Leisure Media", 3), Pair("Linkshelf", 5), Pair("Media On Repeat", 1),
                    Pair("Photo Keepsake", 13), Pair("Significant Contact", 30),
                    Pair("Social Event", 3), Pair("Structured Event", 6), Pair("Topic", 2),
                    Pair("Travel", 2), Pair("Trend", 5), Pair("Visit", 19), Pair("Workout", 10)));
    for (const auto& rule : predicatesOfDesiredExperiences()) {
        EXPECT_TRUE(kShownBy.contains(rule.name)) << "what in the month shows " << rule.name << '?';
    }
    for (const auto& [rule, sentence] : kShownBy) {
        EXPECT_THAT(sentences, Contains(sentence)) << rule;
    }

    EXPECT_EQ(collected, 28 * 6 + 1);
    EXPECT_THAT(failed, IsEmpty());
    EXPECT_THAT(universe->service<KSEventManager>("EventManager")->lastOutcome().answered,
                SizeIs(9));

    // The first of each a minute after the start (and half a minute apart), then once a period.
    std::map<std::string, int> counts;
    std::set<std::string> keys;
    for (const auto& line : lines()) {
        const auto event = *valueForKey(line, "event").asString();
        ++counts[event];
        if (event != "com.brindle.Keepsakes.Daemon") continue;
        const auto& fields = *valueForKey(line, "fields").asDictionary();
        ++counts[*valueForKey(fields, "triggerReason").asString()];
        for (const auto& [key, value] : fields) keys.insert(key);
        EXPECT_EQ(valueForKey(fields, "triggerSource"), KSValue("bootd"));
        EXPECT_EQ(valueForKey(fields, "stateDatabaseAvailable"), KSValue(true));
    }
    EXPECT_THAT(counts, ElementsAre(Pair("collect", 169), Pair("com.brindle.Keepsakes.Daemon", 312),
                                    Pair("com.brindle.Keepsakes.EventData", 57),
                                    Pair("com.brindle.Keepsakes.PromptMetrics", 8 * 57),
                                    Pair("com.brindle.Keepsakes.UserData", 57),
                                    Pair("com.brindle.Keepsakes.trends", 5 * 56),
                                    Pair("compute", 57), Pair("purge", 29), Pair("trends", 57)));
    EXPECT_THAT(keys,
                IsSupersetOf({"resultMusicSuccess", "resultNumberOfEvents",
                              "resultNumberOfBundleEvents", "resultOverallSuccess",
                              "triggerTimeSinceLastLaunch", "triggerTimeSinceLastSimilarTrigger",
                              "triggerTimeSinceLastSuccessfulSimilarTrigger",
                              "triggerTimeSinceLastTrigger"}));
    const auto history =
        readPropertyListFile(platform.services.cacheFolder / "daemonTriggerPersistence.plist");
    const double last = monday.seconds + 28 * kDay;
    EXPECT_EQ(*history, (KSDictionary{{"lastLaunch", monday.seconds},
                                      {"lastTrigger", last + 120},
                                      {"lastCollectTrigger", last + 60},
                                      {"lastComputeTrigger", last + 90},
                                      {"lastTrendsTrigger", last + 90},
                                      {"lastPurgeTrigger", last + 120}}));

    platform.clock.advance(8 * kDay);
    EXPECT_EQ(events().count("Visit"), 0u);
}

}  // namespace
}  // namespace keepsakes
