// SPDX-License-Identifier: Apache-2.0
#include "service/KSDaemonClient.h"

#include <gmock/gmock.h>

#include <set>

#include "ManagersFixture.h"
#include "model/KSExtensions.h"
#include "model/ValueCoding.h"
#include "notify/KSDaemonSPINotifier.h"
#include "notify/KSDispatcher.h"
#include "service/KSManageServer.h"
#include "service/StatusReporter.h"
#include "support/RecordedAssertions.h"
#include "support/SampleWeeks.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;

class Client : public ManagersFixture {
  protected:
    Client() {
        server = KSManageServer::initWithUniverse(*universe);
        listener = KSDispatcher::initWithNotifier(server->getNotifier());
        for (std::int32_t identifier = 0; identifier <= 5; ++identifier) {
            listener->registerForNotification(
                identifier, [this](std::int32_t sent, const KSValue& payload) {
                    heard.push_back(std::to_string(sent) + " " + payload.description());
                });
        }
    }
    ~Client() override { listener->invalidate(); }

    KSDaemonClient& client() { return server->client(); }

    static KSConduitContext callingAs(const std::string& name) {
        const KSValue archive(KSDictionary{{"ProcessName", name}});
        ValueDecoder decoder(archive);
        KSConduitContext context;
        KSConduitContext::initWithCoder(decoder, context);
        return context;
    }

    /// "" for no error, once all is at rest.
    template <class Call>
    std::string errorOf(Call call) {
        std::string text = "(no answer)";
        call([&text](const OptionalError& error) { text = error ? error->description() : ""; });
        WorkerThreads::shared().settle();
        return text;
    }

    std::vector<std::string> takeHeard() {
        WorkerThreads::shared().settle();
        return std::exchange(heard, {});
    }

    std::shared_ptr<KSManageServer> server;
    std::shared_ptr<KSDispatcher> listener;
    std::vector<std::string> heard;
};

TEST_F(Client, AnnouncesWhatItDidAndForWhom) {
    const auto context = callingAs("diary");
    EXPECT_EQ(errorOf([&](auto reply) {
                  client().storeEvents({makeWorkout(1, 1, 2, "Running")}, context, reply);
              }),
              "");
    EXPECT_EQ(errorOf([&](auto reply) { client().collectEvents(context, reply); }), "");
    client().fetchEventsWithOptions(
        {}, context,
        [](const KSEventArray& events, const OptionalError&) { EXPECT_EQ(events.size(), 1u); });
    WorkerThreads::shared().settle();
    EXPECT_EQ(errorOf([&](auto reply) { client().bundleEvents(context, reply); }), "");
    client().fetchEventBundlesWithOptions({}, context,
                                          [](const KSEventBundleArray&, const OptionalError&) {});
    WorkerThreads::shared().settle();
    EXPECT_EQ(errorOf([&](auto reply) { client().purgeEvents(context, reply); }), "");
    EXPECT_EQ(errorOf([&](auto reply) { client().runAnalytics(context, reply); }), "");
    EXPECT_EQ(errorOf([&](auto reply) { client().clearEvents(context, reply); }), "");
    EXPECT_THAT(
        takeHeard(),
        ElementsAre(R"(2 {"resultNumberOfEvents": 0, "stateDatabaseAvailable": true, )"
                    R"("triggerSource": "diary"})",
                    R"(0 {"resultNumberOfEvents": 1, "triggerSource": "diary"})",
                    R"(3 {"stateDatabaseAvailable": true, "triggerSource": "diary"})",
                    R"(1 {"resultNumberOfBundleEvents": 0, "stateDatabaseAvailable": true, )"
                    R"("triggerSource": "diary"})",
                    R"(4 {"resultNumberOfBundleEvents": 0, "resultNumberOfEvents": 0, )"
                    R"("stateDatabaseAvailable": true, "triggerSource": "diary"})",
                    R"(5 {"resultNumberOfEvents": 0, "stateDatabaseAvailable": true, )"
                    R"("triggerSource": "diary"})"));
}

TEST_F(Client, AMissingReplyOrNameIsFine) {
    const auto nobody = KSConduitContext();
    client().storeEvents({}, nobody, nullptr);
    client().fetchEventsWithOptions({}, nobody, nullptr);
    client().purgeEvents(nobody, nullptr);
    client().analyzeTrendsInEvents({}, nobody, nullptr);
    client().fetchPhotoAnalyticsMetrics(nobody, nullptr);
    WorkerThreads::shared().settle();
    EXPECT_EQ(takeHeard().size(), 2u);
}

TEST_F(Client, FailuresAreToldToCallerAndListeners) {
    execute("DROP TABLE KSEventBundleMember; DROP TABLE KSEventBundleMO");
    const auto context = callingAs("diary");
    EXPECT_EQ(errorOf([&](auto reply) { client().purgeEvents(context, reply); }),
              "database: no such table: KSEventBundleMO");
    EXPECT_THAT(takeHeard(),
                ElementsAre(R"(4 {"resultNumberOfEvents": 0, "resultOverallSuccess": false, )"
                            R"("stateDatabaseAvailable": true, "triggerSource": "diary"})"))
        << "both clean-ups' results are in it, and one of them failed";
    execute("DROP TABLE KSEventMO");
    client().fetchEventsWithOptions({}, context,
                                    [](const KSEventArray& events, const OptionalError& error) {
                                        EXPECT_TRUE(events.empty());
                                        EXPECT_TRUE(error);
                                    });
    EXPECT_THAT(takeHeard(),
                ElementsAre(R"(0 {"resultOverallSuccess": false, "triggerSource": "diary"})"));
}

TEST_F(Client, TrendsAreAnsweredWithTheStatusOfEachPlanUnlessAllAreKnown) {
    const auto analyzed = [this](KSEventArray events) {
        std::pair<std::size_t, std::string> answer{0, "(no answer)"};
        client().analyzeTrendsInEvents(
            std::move(events), {}, [&answer](const KSEventArray& trends, OptionalError error) {
                answer = {trends.size(), error ? error->description() : ""};
                EXPECT_EQ(error.value_or(KSError()).code, 0);
            });
        WorkerThreads::shared().settle();
        return answer;
    };
    const auto today = KSExtensions::startOfDayWithBoundaryOfADay(platform.clock.now(), 10800);
    auto events = samples::weeks(today.seconds);
    EXPECT_EQ(analyzed(events), std::pair(std::size_t{5}, std::string()));
    EXPECT_EQ(analyzed({}),
              std::pair(std::size_t{0}, std::string("(contact.interactions:1)(meida.playTime:1)"
                                                    "(work.duration:1)(work.exit:1)"
                                                    "(workout.duration:1)")));
    std::erase_if(events, [](const auto& event) {
        return event->category() == KSEventCategory::leisureMedia;
    });
    EXPECT_EQ(analyzed(events),
              std::pair(std::size_t{5}, std::string("(contact.interactions:5)(meida.playTime:1)"
                                                    "(work.duration:5)(work.exit:5)"
                                                    "(workout.duration:6)")));
    EXPECT_THAT(takeHeard(), ElementsAre()) << "nobody is told";
    EXPECT_TRUE(fetch({}).empty()) << "and nothing is stored";
}

TEST_F(Client, PhotoMetricsHaveAVersionAndASeedInRange) {
    std::set<std::int64_t> seeds;
    for (int call = 0; call < 500; ++call) {
        client().fetchPhotoAnalyticsMetrics(
            {}, [&seeds](const KSDictionary& metrics, const OptionalError& error) {
                EXPECT_FALSE(error);
                EXPECT_EQ(*valueForKey(metrics, "version").asString(), "1.0.1");
                seeds.insert(*valueForKey(metrics, "seed").asInteger());
            });
    }
    EXPECT_GE(*seeds.begin(), 0);
    EXPECT_LE(*seeds.rbegin(), 73);
    EXPECT_GT(seeds.size(), 20u);
}

TEST_F(Client, StatusCountsAndNamesProblems) {
    storeAll({makeWorkout(1, 1, 2, "Running")});
    manager->persistCollectionDate();
    platform.problems.add("older");
    platform.problems.add("newer");
    platform.deviceData.report = {true, 12, 3, {"a file"}};
    StatusReporter reporter(platform.services, manager);
    DaemonStatus status;
    reporter.status([&status](DaemonStatus answer) { status = std::move(answer); });
    WorkerThreads::shared().settle();
    EXPECT_TRUE(status.databaseAvailable);
    EXPECT_EQ(status.eventCount, 1u);
    EXPECT_EQ(status.filesIndexed, 12u);
    EXPECT_EQ(status.filesRefused, 3u);
    EXPECT_EQ(status.lastCollection, platform.clock.now().seconds);
    EXPECT_THAT(status.problems, ElementsAre("newer", "older", "a file"));
}

TEST_F(Client, TheServerNeedsItsManagers) {
    TestUniverse empty(platform.services);
    RecordedAssertions assertions;
    EXPECT_EQ(KSManageServer::initWithUniverse(empty), nullptr);
    EXPECT_THAT(assertions.takeDescriptions(),
                ElementsAre("Invalid parameter not satisfying: eventManager"));
}

}  // namespace
}  // namespace keepsakes
