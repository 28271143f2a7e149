// SPDX-License-Identifier: Apache-2.0
#include "daemon/KSDaemonUniverse.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/RecordedAssertions.h"
#include "support/TestPlatform.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;

TEST(KSDaemonUniverse, MakesItsServicesInTheirOrderAndFindsThemByName) {
    TestPlatform platform;
    RecordedAssertions assertions;
    const KSDaemonUniverse universe(platform.services);
    EXPECT_THAT(assertions.take(), ElementsAre());
    EXPECT_THAT(
        universe.serviceNames(),
        ElementsAre("TocsinNotifier", "PersistenceManager", "EventBundleStore", "EventStore",
                    "PhotoManager", "RoutineServiceManager", "VitalsManager", "LinkshelfManager",
                    "SuggestedEventManager", "ForesightTravelManager", "NowPlayingMediaManager",
                    "SignificantContactManager", "TopicManager", "DefaultsManager", "EventManager",
                    "EventBundleManager", "Server", "DaemonClientNotifier",
                    "EventCollectionScheduler", "EventCollectionSchedulerNotifier",
                    "EventComputeScheduler", "EventComputeSchedulerNotifier", "EventPurgeScheduler",
                    "EventPurgeSchedulerNotifier", "DaemonAnalytics"));
    for (const auto& name : universe.serviceNames()) {
        EXPECT_NE(universe.getService(name), nullptr) << name;
        EXPECT_EQ(universe.getService(name), universe.getService(name));
    }
    EXPECT_EQ(universe.getService("DiscoveryManager"), nullptr);
    EXPECT_THAT(assertions.take(),
                ElementsAre("No service named [DiscoveryManager] (KSDaemonUniverse:133)"));
}

TEST(KSDaemonUniverse, WithoutAnyFeatureItEndsAfterTenSeconds) {
    TestPlatform platform;
    KSDaemonUniverse universe(platform.services);
    int ends = 0;
    universe.run(true, [&ends] { ++ends; });
    platform.clock.advance(100);
    EXPECT_EQ(ends, 0);
    universe.run(false, [&ends] { ++ends; });
    platform.clock.advance(9.9);
    EXPECT_EQ(ends, 0);
    platform.clock.advance(0.2);
    EXPECT_EQ(ends, 1);
}

}  // namespace
}  // namespace keepsakes
