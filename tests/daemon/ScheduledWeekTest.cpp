// SPDX-License-Identifier: Apache-2.0
// The daemon left alone for a week, with the timers that it has on a device.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>

#include "core/PropertyList.h"
#include "daemon/KSDaemonUniverse.h"
#include "linux/ActivityTimers.h"
#include "notify/KSDispatcher.h"
#include "notify/KSNotifier.h"
#include "support/TestPlatform.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::MatchesRegex;
using testing::Pair;

constexpr const char* kDaemonEvent = "com.brindle.Keepsakes.Daemon";

class ScheduledWeek : public testing::Test {
  protected:
    ScheduledWeek() {
        platform.services.activities = &timers;
        universe.emplace(platform.services);
        for (const char* scheduler :
             {"EventCollectionSchedulerNotifier", "EventComputeSchedulerNotifier",
              "EventPurgeSchedulerNotifier"}) {
            const auto listener =
                KSDispatcher::initWithNotifier(universe->service<KSNotifier>(scheduler));
            for (int identifier = 0; identifier <= 5; ++identifier) {
                listener->registerForNotification(
                    identifier, [this](std::int32_t sent, const KSValue& payload) {
                        const std::lock_guard lock(mutex);
                        ++announced[sent];
                        EXPECT_EQ(valueForKey(*payload.asDictionary(), "triggerSource"),
                                  KSValue("bootd"));
                    });
            }
            listeners.push_back(listener);
        }
    }
    ~ScheduledWeek() override {
        for (const auto& listener : listeners) listener->invalidate();
        timers.stop();
        universe.reset();
    }

    TestPlatform platform;
    ActivityTimers timers{platform.clock,
                          platform.power,
                          {{"com.brindle.keepsakesd.eventCollection", kHour},
                           {"com.brindle.keepsakesd.eventCompute", 6 * kHour},
                           {"com.brindle.keepsakesd.eventPurge", 24 * kHour}},
                          platform.folder / "activities.plist"};
    std::optional<KSDaemonUniverse> universe;
    std::vector<std::shared_ptr<KSDispatcher>> listeners;
    std::mutex mutex;
    std::map<std::int32_t, int> announced;
};

TEST_F(ScheduledWeek, CollectsComputesAndPurgesOnTimeWhileTheDeviceIsAwake) {
    const double begin = platform.clock.now().seconds;
    for (int day = 0; day < 7; ++day) {
        const double now = platform.clock.now().seconds;
        platform.health.samples = {{{now - 2 * kHour}, {now - kHour}, 37}};
        platform.clock.advance(16 * kHour - 100);
        platform.clock.suspend(8 * kHour + 100);
    }
    // Every hour and every six hours awake, and what came due at night once, in the morning; the
    // morning of the eighth day has begun.
    EXPECT_THAT(announced,
                ElementsAre(Pair(2, 7 * 16 + 1), Pair(3, 7 * 3), Pair(4, 7), Pair(5, 7 * 3)));
    EXPECT_THAT(universe->getService("EventCollectionScheduler")->diagnosticLines(),
                ElementsAre(MatchesRegex("com.brindle.keepsakesd.eventCollection: due in 1 h; "
                                         "every 1 h; last run 20.*Z")));
    EXPECT_THAT(
        universe->getService("EventComputeScheduler")->diagnosticLines(),
        ElementsAre(MatchesRegex(".*eventCompute: due for 5 h 59 min; every 6 h; last run .*")));

    std::map<std::string, int> lines;
    std::map<std::string, KSDictionary> lastOf;
    for (const auto& [event, fields] : platform.analytics.take()) {
        ++lines[event];
        if (event != kDaemonEvent) continue;
        const auto reason = *valueForKey(fields, "triggerReason").asString();
        ++lines[reason];
        lastOf[reason] = fields;
    }
    lines.erase("com.brindle.Keepsakes.trends");  // as many as trends had something to tell
    EXPECT_THAT(lines, ElementsAre(Pair("collect", 113), Pair(kDaemonEvent, 113 + 21 + 7 + 21),
                                   Pair("com.brindle.Keepsakes.EventData", 21),
                                   Pair("com.brindle.Keepsakes.PromptMetrics", 21 * 8),
                                   Pair("com.brindle.Keepsakes.UserData", 21), Pair("compute", 21),
                                   Pair("purge", 7), Pair("trends", 21)));
    // Hours, counted from 1; the last collection was the first of the morning. Nothing counts as a
    // success, since no source says that it had any.
    const struct {
        const char* reason;
        int sinceSimilar, sinceAny;
    } rows[] = {{"collect", 10, 10}, {"compute", 7, 1}, {"purge", 25, 1}, {"trends", 7, 1}};
    for (const auto& row : rows) {
        const auto& fields = lastOf[row.reason];
        EXPECT_EQ(valueForKey(fields, "triggerSource"), KSValue("bootd"));
        EXPECT_EQ(valueForKey(fields, "stateDatabaseAvailable"), KSValue(true));
        EXPECT_EQ(valueForKey(fields, "resultOverallSuccess"), KSValue(false));
        EXPECT_EQ(valueForKey(fields, "triggerTimeSinceLastLaunch"), KSValue(97)) << "four days";
        EXPECT_EQ(valueForKey(fields, "triggerTimeSinceLastSimilarTrigger"),
                  KSValue(row.sinceSimilar));
        EXPECT_EQ(valueForKey(fields, "triggerTimeSinceLastTrigger"), KSValue(row.sinceAny))
            << row.reason;
    }
    const double days = 24 * kHour;
    EXPECT_EQ(readPropertyListFile(platform.services.cacheFolder / "daemonTriggerPersistence.plist")
                  .value(),
              (KSDictionary{{"lastLaunch", begin},
                            {"lastTrigger", begin + 7 * days},
                            {"lastCollectTrigger", begin + 7 * days},
                            {"lastComputeTrigger", begin + 6 * days + 30 + 12 * kHour},
                            {"lastTrendsTrigger", begin + 6 * days + 30 + 12 * kHour},
                            {"lastPurgeTrigger", begin + 6 * days + 120}}));
}

}  // namespace
}  // namespace keepsakes
