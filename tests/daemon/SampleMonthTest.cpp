// SPDX-License-Identifier: Apache-2.0
// The daemon left alone with the sample set, from the Monday of its week on.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <fstream>
#include <map>
#include <set>

#include "bundle/KSEventBundleManager.h"
#include "collect/KSEventManager.h"
#include "core/Json.h"
#include "core/PropertyList.h"
#include "daemon/KSDaemonUniverse.h"
#include "devicedata/IndexedContactStore.h"
#include "devicedata/IndexedHealthStore.h"
#include "devicedata/IndexedInteractionStore.h"
#include "devicedata/IndexedPhotoAnalysis.h"
#include "devicedata/IndexedRoutineService.h"
#include "linux/ActivityTimers.h"
#include "linux/AnalyticsLog.h"
#include "support/ScannedFolders.h"
#include "support/TestPlatform.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::IsSupersetOf;
using testing::Pair;

constexpr double kHour = 3600;
constexpr double kDay = 24 * kHour;
const std::filesystem::path kSample = KEEPSAKES_SAMPLE;

class SampleWeek : public testing::Test {
  protected:
    SampleWeek() {
        setenv("TZ", "Europe/Vienna", 1);  // NOLINT(concurrency-mt-unsafe): before any thread
        platform.clock.step(monday.seconds - platform.clock.now().seconds);
        auto& services = platform.services;
        services.healthStore = &health;
        services.photoAnalysis = &photos;
        services.routineService = &routine;
        services.interactionStore = &interactions;
        services.contactStore = &contacts;
        services.deviceData = &folders;
        services.analytics = &*analytics;
        services.activities = &timers;
        universe.emplace(services);
    }
    ~SampleWeek() override {
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

    /// The sentences of the bundles that rules formed.
    std::vector<std::string> suggestions() {
        std::vector<std::string> sentences;
        universe->service<KSEventBundleManager>("EventBundleManager")
            ->fetchEventBundlesWithOptions(
                {.ascending = true, .filterBundle = true},
                [&](const KSEventBundleArray& found, const OptionalError&, const KSDictionary&) {
                    for (const auto& bundle : found) {
                        sentences.push_back(bundle->promptLanguage.value_or(""));
                    }
                });
        WorkerThreads::shared().settle();
        return sentences;
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

    const KSDate monday = parseISO8601("2024-06-10T00:00:00+02:00")->date;
    TestPlatform platform;
    const std::filesystem::path index = platform.folder / "deviceData.sqlite";
    IndexedHealthStore health{index, {}};
    IndexedPhotoAnalysis photos{index};
    IndexedRoutineService routine{index, platform.clock};
    IndexedInteractionStore interactions{index};
    IndexedContactStore contacts{index};
    ScannedFolders folders{[this] {
        return ScanOptions{.index = index,
                           .tracks = {kSample / "tracks"},
                           .photos = {kSample / "photos"},
                           .places = {kSample / "places"},
                           .gazetteer = {},
                           .messages = {kSample / "messages"},
                           .contacts = {kSample / "contacts"},
                           .now = platform.clock.now(),
                           .latest = monday + 30 * kDay};
    }};
    std::optional<AnalyticsLog> analytics{std::in_place, platform.folder / "analytics.jsonl",
                                          platform.clock};
    ActivityTimers timers{platform.clock,
                          platform.power,
                          {{"com.brindle.keepsakesd.eventCollection", kHour},
                           {"com.brindle.keepsakesd.eventCompute", 6 * kHour},
                           {"com.brindle.keepsakesd.eventPurge", kDay}},
                          platform.folder / "activities.plist"};
    std::optional<KSDaemonUniverse> universe;
};

TEST_F(SampleWeek, IsCollectedBundledAnalysedAndPurgedByItself) {
    platform.clock.advance(7 * kDay + 0.5 * kHour);
    EXPECT_THAT(events(), ElementsAre(Pair("Photo Keepsake", 5), Pair("Significant Contact", 8),
                                      Pair("Trend", 5), Pair("Visit", 9), Pair("Workout", 3)));
    EXPECT_THAT(
        suggestions(),
        IsSupersetOf({"A hike with photos: Hiking, Saturday 10:02 to 12:31, 6 photos of mountains, "
                      "with Anna Beispiel and Jakob Muster",
                      "A concert: Konzerthaus, Saturday 19:15 to 22:41, 2 photos of a concert, "
                      "with Anna Beispiel",
                      "In touch with somebody close: Jakob Muster, Monday 20:05 to 20:41, "
                      "2 messages"}));

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
    EXPECT_THAT(counts, ElementsAre(Pair("collect", 169), Pair("com.brindle.Keepsakes.Daemon", 235),
                                    Pair("com.brindle.Keepsakes.EventData", 29),
                                    Pair("com.brindle.Keepsakes.PromptMetrics", 8 * 29),
                                    Pair("com.brindle.Keepsakes.UserData", 29),
                                    Pair("com.brindle.Keepsakes.trends", 5 * 29),
                                    Pair("compute", 29), Pair("purge", 8), Pair("trends", 29)));
    EXPECT_THAT(keys,
                IsSupersetOf({"resultMusicSuccess", "resultNumberOfEvents",
                              "resultNumberOfBundleEvents", "resultOverallSuccess",
                              "triggerTimeSinceLastLaunch", "triggerTimeSinceLastSimilarTrigger",
                              "triggerTimeSinceLastSuccessfulSimilarTrigger",
                              "triggerTimeSinceLastTrigger"}));
    const auto history =
        readPropertyListFile(platform.services.cacheFolder / "daemonTriggerPersistence.plist");
    EXPECT_EQ(*history, (KSDictionary{{"lastLaunch", monday.seconds},
                                      {"lastTrigger", monday.seconds + 7 * kDay + 120},
                                      {"lastCollectTrigger", monday.seconds + 7 * kDay + 60},
                                      {"lastComputeTrigger", monday.seconds + 7 * kDay + 90},
                                      {"lastTrendsTrigger", monday.seconds + 7 * kDay + 90},
                                      {"lastPurgeTrigger", monday.seconds + 7 * kDay + 120}}));

    // Visits are kept for a week, the others for four; trends are looked for all the time.
    platform.clock.advance(8 * kDay);
    EXPECT_THAT(events(), ElementsAre(Pair("Photo Keepsake", 5), Pair("Significant Contact", 8),
                                      Pair("Trend", 5), Pair("Workout", 3)));
}

}  // namespace
}  // namespace keepsakes
