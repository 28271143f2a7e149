// SPDX-License-Identifier: Apache-2.0
// The daemon left alone for a week, with the timers that it has on a device.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>

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

constexpr double kHour = 3600;

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
}

}  // namespace
}  // namespace keepsakes
