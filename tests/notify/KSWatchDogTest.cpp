// SPDX-License-Identifier: Apache-2.0
#include "notify/KSWatchDog.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/TestPlatform.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;

/// Arms as nothing in the daemon does: without a cancel behind it.
void armAlone(KSWatchDog& watchDog) {
    const_cast<WorkQueue&>(watchDog.queue()).sync([&watchDog] { watchDog._arm(); });
}

TEST(KSWatchDog, WarnsEighteenTimesAndThenEndsTheDaemon) {
    TestPlatform platform;
    std::vector<std::int32_t> warnings;
    KSWatchDog watchDog("StoreEvents", platform.services,
                        [&warnings](std::int32_t count) { warnings.push_back(count); });
    platform.clock.advance(0);
    armAlone(watchDog);
    platform.clock.advance(180);
    const auto sent = platform.analytics.take();
    ASSERT_EQ(sent.size(), 18u);
    EXPECT_EQ(sent.back().first, "com.brindle.Keepsakes.DaemonWatchDog");
    EXPECT_EQ(KSValue(sent.back().second).description(),
              R"({"Fatal": 0, "Name": "StoreEvents", "SuccessiveWarningCount": 18})");
    EXPECT_EQ(warnings.size(), 18u);
    EXPECT_THAT(platform.exits, ElementsAre());
    platform.clock.advance(10);
    EXPECT_THAT(platform.exits, ElementsAre(255));
    EXPECT_EQ(KSValue(platform.analytics.take().back().second).description(),
              R"({"Fatal": 1, "Name": "StoreEvents", "SuccessiveWarningCount": 18})");
}

TEST(KSWatchDog, APetLeavesTheTimerDisarmedAndTheCountAtZero) {
    TestPlatform platform;
    KSWatchDog watchDog("PurgeEvents", platform.services);
    EXPECT_EQ(watchDog.queue().label(), "KSWatchDog:PurgeEvents");
    platform.clock.advance(0);
    armAlone(watchDog);
    platform.clock.advance(30);
    EXPECT_EQ(platform.analytics.take().size(), 3u);
    watchDog.pet();
    platform.clock.advance(1000);
    EXPECT_EQ(platform.analytics.take().size(), 0u);
    armAlone(watchDog);
    platform.clock.advance(10);
    EXPECT_EQ(KSValue(platform.analytics.take().at(0).second).description(),
              R"({"Fatal": 0, "Name": "PurgeEvents", "SuccessiveWarningCount": 1})");
}

TEST(KSWatchDog, IgnoresPeriodsThatAreNone) {
    TestPlatform platform;
    KSWatchDog watchDog("X", platform.services);
    platform.clock.advance(0);
    armAlone(watchDog);
    for (const float period : {0.0F, -1.0F, std::numeric_limits<float>::quiet_NaN()}) {
        watchDog.setCadenceSeconds(period);
        EXPECT_EQ(watchDog.getCadenceSeconds(), 10);
    }
    platform.clock.advance(10);
    EXPECT_EQ(platform.analytics.take().size(), 1u) << "it was petted";
    watchDog.setCadenceSeconds(2);
    platform.clock.advance(0);
    armAlone(watchDog);
    platform.clock.advance(2);
    EXPECT_EQ(platform.analytics.take().size(), 1u);
}

}  // namespace
}  // namespace keepsakes
