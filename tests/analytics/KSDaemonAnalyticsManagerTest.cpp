// SPDX-License-Identifier: Apache-2.0
#include "analytics/KSDaemonAnalyticsManager.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include "core/PropertyList.h"
#include "notify/KSDaemonSPINotifier.h"
#include "support/RecordedAssertions.h"
#include "support/TestPlatform.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;

const std::vector<std::string> kNotifiers = {"TocsinNotifier", "EventCollectionSchedulerNotifier",
                                             "EventComputeSchedulerNotifier",
                                             "EventPurgeSchedulerNotifier", "DaemonClientNotifier"};

class DaemonAnalytics : public testing::Test {
  protected:
    DaemonAnalytics() {
        for (const auto& name : kNotifiers) {
            universe.add(name, std::make_shared<KSDaemonSPINotifier>(name));
        }
    }

    void start() {
        manager = KSDaemonAnalyticsManager::initWithUniverse(universe);
        WorkerThreads::shared().settle();
    }

    void tell(const std::string& notifier, std::int32_t identifier, const KSDictionary& payload) {
        universe.service<KSDaemonSPINotifier>(notifier)->sendNotification(identifier, payload);
        WorkerThreads::shared().settle();
    }
    /// What is sent of a unit of work that a client asked for.
    KSDictionary sentFor(std::int32_t identifier, const KSDictionary& payload) {
        tell("DaemonClientNotifier", identifier, payload);
        auto sent = platform.analytics.take();
        if (sent.size() != 1) return {};
        EXPECT_EQ(sent[0].first, "com.brindle.Keepsakes.Daemon");
        return std::move(sent[0].second);
    }

    std::filesystem::path file() const {
        return platform.services.cacheFolder / "daemonTriggerPersistence.plist";
    }
    KSDictionary history() const { return readPropertyListFile(file()).value_or(KSDictionary()); }
    double now() const { return platform.clock.now().seconds; }

    /// A payload in which everything went well.
    static KSDictionary allWell() {
        KSDictionary payload{{"stateDatabaseAvailable", true}};
        for (const char* source : {"Workouts", "Visits", "Photos", "Topics", "Shared", "Suggested",
                                   "Trips", "Music", "Contacts"}) {
            payload.emplace(std::string("result") + source + "Success", true);
        }
        return payload;
    }

    TestPlatform platform;
    TestUniverse universe{platform.services};
    std::shared_ptr<KSDaemonAnalyticsManager> manager;
};

TEST_F(DaemonAnalytics, CompletesTheFirstReportOfAllAndBeginsTheHistory) {
    start();
    platform.clock.advance(7200);
    auto expected = allWell();
    expected.merge(KSDictionary{{"triggerSource", "diary"},
                                {"resultOverallSuccess", true},
                                {"resultNumberOfEvents", 4},
                                {"resultNumberOfBundleEvents", 0},
                                {"triggerReason", "collect"},
                                {"triggerTimeSinceLastTrigger", -1},
                                {"triggerTimeSinceLastSuccessfulTrigger", -1},
                                {"triggerTimeSinceLastLaunch", 3},
                                {"triggerTimeSinceLastSimilarTrigger", -1},
                                {"triggerTimeSinceLastSuccessfulSimilarTrigger", -1}});
    auto payload = allWell();
    payload["triggerSource"] = "diary";
    payload["resultNumberOfEvents"] = 4;
    const auto sent = sentFor(2, payload);
    EXPECT_EQ(sent, expected) << KSValue(sent).description();
    EXPECT_EQ(history(), (KSDictionary{{"lastLaunch", now() - 7200},
                                       {"lastTrigger", now()},
                                       {"lastSuccessfulTrigger", now()},
                                       {"lastCollectTrigger", now()},
                                       {"lastCollectSuccessfulTrigger", now()}}));
}

TEST_F(DaemonAnalytics, AFailureMovesOnlyTheTimesOfTriggers) {
    start();
    ASSERT_FALSE(sentFor(2, allWell()).empty());
    const double first = now();
    platform.clock.advance(3600);
    auto payload = allWell();
    payload.erase("resultMusicSuccess");
    auto sent = sentFor(2, payload);
    EXPECT_EQ(sent.at("resultMusicSuccess"), KSValue(false));
    EXPECT_EQ(sent.at("resultOverallSuccess"), KSValue(false));
    EXPECT_EQ(sent.at("triggerTimeSinceLastTrigger"), KSValue(2));
    EXPECT_EQ(sent.at("triggerTimeSinceLastSimilarTrigger"), KSValue(2));
    EXPECT_EQ(sent.at("triggerTimeSinceLastSuccessfulSimilarTrigger"), KSValue(-1));
    EXPECT_FALSE(sent.contains("triggerTimeSinceLastSuccessfulTrigger"));
    EXPECT_EQ(history().at("lastTrigger"), KSValue(now()));
    EXPECT_EQ(history().at("lastCollectTrigger"), KSValue(now()));
    EXPECT_EQ(history().at("lastSuccessfulTrigger"), KSValue(first));
    EXPECT_EQ(history().at("lastCollectSuccessfulTrigger"), KSValue(first));

    payload["resultOverallSuccess"] = true;
    platform.clock.advance(10 * 86400);
    sent = sentFor(2, payload);
    EXPECT_EQ(sent.at("resultOverallSuccess"), KSValue(true)) << "what is told stands";
    EXPECT_EQ(sent.at("triggerTimeSinceLastSuccessfulTrigger"), KSValue(97)) << "the last bin";
    platform.clock.step(-5 * 86400);
    EXPECT_EQ(sentFor(2, payload).at("triggerTimeSinceLastTrigger"), KSValue(0))
        << "the clock went back";
}

TEST_F(DaemonAnalytics, EveryKindOfWorkHasItsReasonAndItsKeys) {
    const struct {
        const char* notifier;
        std::int32_t identifier;
        const char* reason;
        const char* key;
        const char* successKey;
    } rows[] = {
        {"DaemonClientNotifier", 0, "fetch", "lastFetchTrigger", "lastSuccessfulFetchTrigger"},
        {"DaemonClientNotifier", 1, "fetchBundle", "lastFetchBundleTrigger",
         "lastSuccessfulFetchBundleTrigger"},
        {"DaemonClientNotifier", 3, "compute", "lastComputeTrigger",
         "lastComputeSuccessfulTrigger"},
        {"DaemonClientNotifier", 4, "purge", "lastPurgeTrigger", "lastPurgeSuccessfulTrigger"},
        {"DaemonClientNotifier", 5, "trends", "lastTrendsTrigger", "lastTrendsSuccessfulTrigger"},
        {"EventCollectionSchedulerNotifier", 2, "collect", "lastCollectTrigger",
         "lastCollectSuccessfulTrigger"},
        {"EventComputeSchedulerNotifier", 3, "compute", "lastComputeTrigger",
         "lastComputeSuccessfulTrigger"},
        {"EventComputeSchedulerNotifier", 5, "trends", "lastTrendsTrigger",
         "lastTrendsSuccessfulTrigger"},
        {"EventPurgeSchedulerNotifier", 4, "purge", "lastPurgeTrigger",
         "lastPurgeSuccessfulTrigger"},
    };
    start();
    for (const auto& row : rows) {
        platform.clock.advance(60);
        tell(row.notifier, row.identifier, {{"resultOverallSuccess", true}});
        const auto sent = platform.analytics.take();
        ASSERT_EQ(sent.size(), 1u) << row.notifier << row.identifier;
        EXPECT_EQ(sent[0].second.at("triggerReason"), KSValue(row.reason));
        EXPECT_EQ(history().at(row.key), KSValue(now()));
        EXPECT_EQ(history().at(row.successKey), KSValue(now()));
    }
    tell("EventPurgeSchedulerNotifier", 2, {});
    tell("EventCollectionSchedulerNotifier", 3, {});
    tell("TocsinNotifier", 2, {});
    EXPECT_THAT(platform.analytics.take(), ElementsAre()) << "not theirs to tell";
}

TEST_F(DaemonAnalytics, AHistoryThatCannotBeReadIsBegunAnew) {
    const auto broken = [this](auto spoil) {
        manager.reset();
        std::filesystem::remove_all(file());
        spoil();
        start();
        EXPECT_EQ(history(), (KSDictionary{{"lastLaunch", now()}}));
        spoil();
        EXPECT_EQ(sentFor(4, {}).at("triggerTimeSinceLastTrigger"), KSValue(-1));
        EXPECT_EQ(history(), (KSDictionary{{"lastTrigger", now()}, {"lastPurgeTrigger", now()}}));
    };
    broken([this] { platform.folder.write("cache/daemonTriggerPersistence.plist", "<plist><di"); });
    broken([this] { platform.folder.write("cache/daemonTriggerPersistence.plist", ""); });
    broken([this] {
        std::filesystem::remove(file());
        std::filesystem::create_directory(file());
    });
    broken([this] {
        std::filesystem::remove(file());
        ASSERT_EQ(mkfifo(file().c_str(), 0600), 0);
    });
    manager.reset();
    ASSERT_FALSE(writePropertyListFile(
        file(), {{"lastTrigger", "yesterday"}, {"lastPurgeTrigger", true}, {"kept", 1}}));
    start();
    EXPECT_EQ(sentFor(4, {}).at("triggerTimeSinceLastTrigger"), KSValue(-1));
    EXPECT_EQ(history().at("kept"), KSValue(1));
}

TEST_F(DaemonAnalytics, KeepsTheDevicesStatesAndOutlivesAnUnwritablePlace) {
    universe.service<KSDaemonSPINotifier>("TocsinNotifier")
        ->notifyAndPersist(1, KSDictionary{{"optInDNU", true}, {"optInIHA", true}});
    WorkerThreads::shared().settle();
    platform.folder.write("cache", "a file where the folder should be");
    start();
    tell("TocsinNotifier", 2, {{"isUnlocked", true}});
    EXPECT_TRUE(manager->deviceStates().stateUnlocked);
    tell("TocsinNotifier", 2, {{"stateUnlocked", false}});
    tell("TocsinNotifier", 4, {{"stateOnCharger", true}, {"optInDNU", false}});
    tell("TocsinNotifier", 4, {{"stateOnCharger", "yes"}});
    tell("TocsinNotifier", 1, {{"optInIHA", false}});
    const auto states = manager->deviceStates();
    EXPECT_TRUE(states.stateOnCharger);
    EXPECT_FALSE(states.stateUnlocked);
    EXPECT_TRUE(states.optInDNU);
    EXPECT_FALSE(states.optInIHA);
    EXPECT_EQ(sentFor(0, {}).at("triggerTimeSinceLastLaunch"), KSValue(-1));
}

TEST_F(DaemonAnalytics, NeedsEveryNotifierAndBothTimes) {
    TestUniverse empty(platform.services);
    RecordedAssertions assertions;
    for (const auto& name : kNotifiers) {
        EXPECT_EQ(KSDaemonAnalyticsManager::initWithUniverse(empty), nullptr);
        empty.add(name, std::make_shared<KSDaemonSPINotifier>(name));
    }
    EXPECT_THAT(assertions.takeDescriptions(),
                ElementsAre("Invalid parameter not satisfying: tocsinNotifier",
                            "Invalid parameter not satisfying: eventCollectionSchedulerNotifier",
                            "Invalid parameter not satisfying: eventComputeSchedulerNotifier",
                            "Invalid parameter not satisfying: eventPurgeSchedulerNotifier",
                            "Invalid parameter not satisfying: daemonClientNotifier"));
    EXPECT_EQ(KSDaemonAnalyticsManager::calculateDeltaTime(std::nullopt, 1, {0}), 0u);
    EXPECT_EQ(KSDaemonAnalyticsManager::calculateDeltaTime(1, std::nullopt, {0}), 0u);
    EXPECT_THAT(assertions.takeDescriptions(),
                ElementsAre("Invalid parameter not satisfying: currentTime != nil",
                            "Invalid parameter not satisfying: lastTime != nil"));
}

}  // namespace
}  // namespace keepsakes
