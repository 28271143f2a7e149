// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "ManagersFixture.h"
#include "notify/KSDaemonSPINotifier.h"
#include "notify/KSDispatcher.h"
#include "schedulers/KSEventCollectionScheduler.h"
#include "schedulers/KSEventComputeScheduler.h"
#include "schedulers/KSEventPurgeScheduler.h"
#include "support/RecordedAssertions.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::UnorderedElementsAre;

const std::string kCollection = "com.brindle.keepsakesd.eventCollection";
const std::string kCompute = "com.brindle.keepsakesd.eventCompute";
const std::string kPurge = "com.brindle.keepsakesd.eventPurge";

class Schedulers : public ManagersFixture {
  protected:
    Schedulers() { make(true); }
    ~Schedulers() override { forget(); }

    void make(bool enabled) {
        forget();
        collection = KSEventCollectionScheduler::initWithUniverse(*universe, enabled);
        compute = KSEventComputeScheduler::initWithUniverse(*universe, enabled);
        purge = KSEventPurgeScheduler::initWithUniverse(*universe, enabled);
        for (const auto& notifier :
             {collection->notifier(), compute->notifier(), purge->notifier()}) {
            const auto listener = KSDispatcher::initWithNotifier(notifier);
            for (int identifier = 0; identifier <= 5; ++identifier) {
                listener->registerForNotification(
                    identifier, [this](std::int32_t sent, const KSValue& payload) {
                        const std::lock_guard lock(mutex);
                        heard.push_back(std::to_string(sent) + " " + payload.description());
                    });
            }
            listeners.push_back(listener);
        }
    }

    void forget() {
        for (const auto& listener : std::exchange(listeners, {})) listener->invalidate();
        collection.reset();
        compute.reset();
        purge.reset();
    }

    /// What was announced, and how the run ended.
    std::vector<std::string> fire(const std::string& activity) {
        EXPECT_TRUE(platform.activities.fire(activity));
        WorkerThreads::shared().settle();
        const std::lock_guard lock(mutex);
        return std::exchange(heard, {});
    }

    std::shared_ptr<KSEventCollectionScheduler> collection;
    std::shared_ptr<KSEventComputeScheduler> compute;
    std::shared_ptr<KSEventPurgeScheduler> purge;
    std::vector<std::shared_ptr<KSDispatcher>> listeners;
    std::mutex mutex;
    std::vector<std::string> heard;
};

TEST_F(Schedulers, EachAnnouncesWhatItDidAndThenReportsTheActivityFinished) {
    const double now = platform.clock.now().seconds;
    platform.health.samples = {{{now - 300}, {now - 100}, 37}};
    EXPECT_THAT(fire(kCollection),
                ElementsAre(R"(2 {"resultNumberOfEvents": 1, "stateDatabaseAvailable": true, )"
                            R"("triggerSource": "bootd"})"));
    EXPECT_THAT(
        fire(kCompute),
        UnorderedElementsAre(R"(5 {"resultNumberOfEvents": 0, "stateDatabaseAvailable": true, )"
                             R"("triggerSource": "bootd"})",
                             R"(3 {"resultNumberOfBundleEvents": 1, "resultNumberOfEvents": 1, )"
                             R"("stateDatabaseAvailable": true, "triggerSource": "bootd"})"));
    const auto event = makeWorkout(1, 10, 20, "Running");
    event->expirationDate = KSDate{now - 1};
    storeAll({event});
    EXPECT_THAT(fire(kPurge),
                ElementsAre(R"(4 {"resultNumberOfBundleEvents": 0, "resultNumberOfEvents": 1, )"
                            R"("stateDatabaseAvailable": true, "triggerSource": "bootd"})"));
    EXPECT_THAT(
        platform.activities.takeEnds(),
        ElementsAre(kCollection + " finished", kCompute + " finished", kPurge + " finished"));
    platform.clock.advance(1000);
    EXPECT_THAT(platform.analytics.take(), IsEmpty()) << "no watchdog is left running";
}

TEST_F(Schedulers, ACollectionThatWaitsForASourceIsNotFinishedBefore) {
    platform.health.silent = true;
    EXPECT_THAT(fire(kCollection), IsEmpty());
    platform.clock.advance(119);
    EXPECT_THAT(platform.activities.takeEnds(), IsEmpty());
    platform.clock.advance(2);
    EXPECT_THAT(platform.activities.takeEnds(), ElementsAre(kCollection + " finished"));
}

TEST_F(Schedulers, APurgeWhoseBundlesFailStillTellsWhatBecameOfTheEvents) {
    const auto event = makeWorkout(1, 10, 20, "Running");
    event->expirationDate = platform.clock.now() - 1;
    storeAll({event});
    execute("ALTER TABLE KSEventBundleMO RENAME COLUMN expirationDate TO gone");
    EXPECT_THAT(fire(kPurge),
                ElementsAre(R"(4 {"resultNumberOfEvents": 1, "resultOverallSuccess": false, )"
                            R"("stateDatabaseAvailable": true, "triggerSource": "bootd"})"));
    EXPECT_THAT(platform.activities.takeEnds(), ElementsAre(kPurge + " finished"));
}

TEST_F(Schedulers, DisabledOnesRegisterButDoNothingWhenFired) {
    make(false);
    EXPECT_THAT(platform.activities.registered(),
                UnorderedElementsAre(kCollection, kCompute, kPurge));
    for (const auto& activity : {kCollection, kCompute, kPurge}) {
        EXPECT_THAT(fire(activity), IsEmpty());
    }
    EXPECT_EQ(platform.deviceData.scans, 0);
    EXPECT_THAT(
        platform.activities.takeEnds(),
        ElementsAre(kCollection + " given up", kCompute + " given up", kPurge + " given up"));
    forget();
    EXPECT_THAT(platform.activities.registered(), IsEmpty());
}

TEST_F(Schedulers, NameTheServiceThatTheyMiss) {
    RecordedAssertions assertions;
    TestUniverse empty(platform.services);
    EXPECT_EQ(KSEventCollectionScheduler::initWithUniverse(empty, true), nullptr);
    EXPECT_EQ(KSEventComputeScheduler::initWithUniverse(empty, true), nullptr);
    empty.add("EventManager", universe->getService("EventManager"));
    EXPECT_EQ(KSEventPurgeScheduler::initWithUniverse(empty, true), nullptr);
    const std::string text = "Invalid parameter not satisfying: ";
    EXPECT_THAT(
        assertions.takeDescriptions(),
        ElementsAre(text + "eventManager", text + "eventManager", text + "eventBundleManager"));
}

}  // namespace
}  // namespace keepsakes
