// SPDX-License-Identifier: Apache-2.0
#include "collect/KSEventManager.h"

#include <fmt/format.h>
#include <gmock/gmock.h>

#include "StoreFixture.h"
#include "model/KSExtensions.h"
#include "sources/KSNowPlayingMediaManager.h"
#include "sources/KSPhotoManager.h"
#include "sources/KSTopicManager.h"
#include "sources/KSVitalsManager.h"
#include "store/KSDefaultsManager.h"
#include "support/RecordedAssertions.h"
#include "support/SampleWeeks.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;

class Manager : public StoreFixture {
  protected:
    Manager() {
        universe->add("EventStore", store);
        universe->add("DefaultsManager", std::make_shared<KSDefaultsManager>(platform.defaults));
        universe->add("PhotoManager", KSPhotoManager::initWithUniverse(*universe));
        universe->add("VitalsManager", KSVitalsManager::initWithUniverse(*universe));
        universe->add("NowPlayingMediaManager",
                      KSNowPlayingMediaManager::initWithUniverse(*universe));
        universe->add("TopicManager", KSTopicManager::initWithUniverse(*universe));
        events = KSEventManager::initWithUniverse(*universe);
    }

    /// The error's text and the result, once the queues are at rest.
    struct Outcome {
        std::string error = "(no answer)";
        std::string result;
    };
    ResultHandler into(const std::shared_ptr<Outcome>& outcome) {
        return [outcome](const OptionalError& error, const KSDictionary& result) {
            outcome->error = error ? error->description() : "";
            outcome->result = KSValue(result).description();
        };
    }
    template <class Operation>
    Outcome run(Operation operation) {
        const auto outcome = std::make_shared<Outcome>();
        (events.get()->*operation)(into(outcome));
        WorkerThreads::shared().settle();
        return *outcome;
    }

    KSDate now() const { return platform.clock.now(); }

    std::shared_ptr<KSEventManager> events;
};

TEST_F(Manager, CollectsEverySourceAndSumsWhatTheySaved) {
    platform.health.samples = {{now() - 5000, now() - 4000, 24}, {now() - 300, now() - 100, 37}};
    platform.photos.keepsakes = {{"a", {now() - 4900, now() - 4800}, {}}};
    const auto outcome = run(&KSEventManager::collectEventsWithHandler);
    EXPECT_EQ(outcome.error, "");
    EXPECT_EQ(outcome.result, R"({"resultNumberOfEvents": 3, "stateDatabaseAvailable": true})");
    EXPECT_EQ(platform.deviceData.scans, 1) << "the index is brought up to date first";
    EXPECT_EQ(manager->getCollectionDate(), now());
}

TEST_F(Manager, TakesTheWindowFromTheDefaultsUnlessItLiesAhead) {
    const std::string key = "com.brindle.keepsakesd/EventManagerEventCollectionStartDate";
    const auto windowStart = [this] {
        run(&KSEventManager::collectEventsWithHandler);
        EXPECT_EQ(platform.health.asked.back().end, now());
        return platform.health.asked.back().start - now();
    };
    EXPECT_EQ(windowStart(), -259200);
    platform.defaults.values[key] = now() - 10;
    EXPECT_EQ(windowStart(), -10);
    platform.defaults.values[key] = now();
    EXPECT_EQ(windowStart(), 0);
    platform.defaults.values[key] = now() + 1;
    EXPECT_EQ(windowStart(), -259200);
    platform.defaults.values[key] = "not a date";
    EXPECT_EQ(windowStart(), -259200);
}

TEST_F(Manager, AFailingSourceIsMarkedAndTheNextOneStillRuns) {
    platform.health.nextError = KSError::make("Health", 1, "not authorised");
    platform.photos.keepsakes = {{"a", {now() - 4900, now() - 4800}, {}}};
    const auto outcome = run(&KSEventManager::collectEventsWithHandler);
    EXPECT_EQ(outcome.error, "");
    EXPECT_EQ(outcome.result, R"({"resultNumberOfEvents": 1, "resultWorkoutsSuccess": false, )"
                              R"("stateDatabaseAvailable": true})");
}

TEST_F(Manager, ASilentSourceCostsTwoMinutesAndOnlyItself) {
    platform.health.silent = true;
    platform.photos.keepsakes = {{"a", {now() - 4900, now() - 4800}, {}}};
    const auto outcome = std::make_shared<Outcome>();
    events->collectEventsWithHandler(into(outcome));
    platform.clock.advance(119.9);
    EXPECT_EQ(outcome->error, "(no answer)");
    platform.clock.advance(0.2);
    EXPECT_EQ(outcome->error, "");
    EXPECT_EQ(outcome->result, R"({"resultNumberOfEvents": 1, "resultWorkoutsSuccess": false, )"
                               R"("stateDatabaseAvailable": true})");
    EXPECT_THAT(events->lastOutcome().answered, ElementsAre("Photos", "Topics", "Music"));
    EXPECT_THAT(events->lastOutcome().failed, ElementsAre("Workouts"));
    EXPECT_THAT(platform.problems.list(),
                ElementsAre("collected, 3 sources answered, but not Workouts"));
}

TEST_F(Manager, FetchesInTheOrderAskedForWithDetailsFilledInAgain) {
    storeAll({makePhotos(1, 10, 20, {}), makeWorkout(2, 5, 8, "a"), makeWorkout(3, 30, 40, "b"),
              makePhotos(4, 35, 36, {})});
    platform.photos.keepsakes = {{"keepsake1", {{10}, {20}}, {"Beach"}}};
    const auto fetched = [this](bool ascending) {
        KSEventArray answer;
        events->fetchEventsWithOptions(
            {.ascending = ascending},
            [&answer](KSEventArray found, const OptionalError&) { answer = std::move(found); });
        WorkerThreads::shared().settle();
        return answer;
    };
    EXPECT_EQ(numbersOf(fetched(true)), (std::vector{2, 1, 3})) << "4 is gone at its source";
    EXPECT_EQ(numbersOf(fetched(false)), (std::vector{3, 1, 2}));
    EXPECT_THAT(*fetched(true)[1]->extendedAttributes->photoKeepsakeInferences,
                ElementsAre("beach"));
}

TEST_F(Manager, MediaOfBothKindsAreTheirSourcesBusiness) {
    for (const std::string title : {"Song", "Talk"}) {
        const auto app = title == "Song" ? "player" : kLeisureMediaBundleId[1];
        for (const double at : {-5000.0, -4000.0, -3000.0}) {
            NowPlayingRecord record{.duration = 200, .title = title, .bundleID = std::string(app)};
            record.absoluteTimestamp = now() + at + static_cast<double>(title.front());
            platform.media.records.push_back(record);
            record.playbackState = PlaybackState::paused;
            record.absoluteTimestamp = record.absoluteTimestamp + 100;
            platform.media.records.push_back(record);
        }
    }
    EXPECT_EQ(run(&KSEventManager::collectEventsWithHandler).result,
              R"({"resultNumberOfEvents": 2, "stateDatabaseAvailable": true})");
    KSEventArray filled;
    events->fetchEventsWithOptions(
        {}, [&filled](KSEventArray found, const OptionalError&) { filled = std::move(found); });
    WorkerThreads::shared().settle();
    ASSERT_EQ(filled.size(), 2u);
    EXPECT_NE(filled[0]->category(), filled[1]->category());
    for (const auto& event : filled) EXPECT_EQ(event->mediaRepetitions, 3);
    std::erase_if(platform.media.records, [](const auto& each) { return each.title == "Talk"; });
    run(&KSEventManager::cleanUpEventsWithHandler);
    EXPECT_EQ(fetch({}).size(), 1u);
    platform.media.nextError = KSError::make("Media", 1, "broken");
    EXPECT_EQ(run(&KSEventManager::collectEventsWithHandler).result,
              R"({"resultMusicSuccess": false, "resultNumberOfEvents": 0, )"
              R"("stateDatabaseAvailable": true})");
}

TEST_F(Manager, CollectsTopicsOfTheDayBeforeAndFillsThemIn) {
    const std::string topic = "TN5KR8Z7ESDORJr1QSxzJFA";
    platform.topics.scores = {{topic, 0.75}, {"other", 0.5}};
    platform.defaults.values["com.brindle.keepsakesd/EventManagerEventCollectionStartDate"] =
        now() - 864000;
    for (const int count : {1, 0}) {
        EXPECT_EQ(run(&KSEventManager::collectEventsWithHandler).result,
                  fmt::format(R"({{"resultNumberOfEvents": {}, "stateDatabaseAvailable": true}})",
                              count));
    }
    KSEventArray filled;
    events->fetchEventsWithOptions(
        {}, [&filled](KSEventArray found, const OptionalError&) { filled = std::move(found); });
    WorkerThreads::shared().settle();
    ASSERT_EQ(filled.size(), 1u);
    EXPECT_EQ(filled[0]->scoredTopics, (KSDictionary{{topic, 0.75}}));
    EXPECT_EQ(filled[0]->startDate(), KSTopicManager::startOfDayBefore(now()));
    EXPECT_EQ(filled[0]->endDate(), KSTopicManager::endOfDayBefore(now()));
    platform.clock.step(86400);
    platform.topics.nextError = KSError::make("Topics", 1, "broken");
    EXPECT_EQ(run(&KSEventManager::collectEventsWithHandler).result,
              R"({"resultNumberOfEvents": 0, "resultTopicsSuccess": false, )"
              R"("stateDatabaseAvailable": true})");
}

TEST_F(Manager, CountsNearbyDevicesWithEachCollectionWhereTheOwnerWantsThat) {
    run(&KSEventManager::collectEventsWithHandler);
    platform.services.nearbyDevices = &platform.nearby;
    events = KSEventManager::initWithUniverse(*universe);
    platform.nearby.nextError = KSError::make("Radio", 1, "no radio");
    const auto collected = run(&KSEventManager::collectEventsWithHandler).result;
    EXPECT_EQ(collected, R"({"resultNumberOfEvents": 0, "stateDatabaseAvailable": true})");
    run(&KSEventManager::cleanUpEventsWithHandler);
    EXPECT_EQ(platform.nearby.asked, 1);
}

TEST_F(Manager, CleansWhatExpiredIsUnknownOrWasDeletedAtItsSource) {
    const auto expired = makeWorkout(1, 10, 20, "a");
    expired->expirationDate = now() - 1;
    const auto topic = makeEvent(5, 1, 2, KSEventProvider::foresight, KSEventCategory::topic);
    storeAll({expired, makeWorkout(2, 10, 20, "b"), makePhotos(3, 10, 20, {}),
              makePhotos(4, 10, 20, {}), topic, makeVisit(6, 1, 2, "unknown")});
    execute("UPDATE KSEventMO SET category = 0 WHERE placeName = 'unknown'");
    platform.photos.keepsakes = {{"keepsake3", {{10}, {20}}, {}}};
    const auto outcome = run(&KSEventManager::cleanUpEventsWithHandler);
    EXPECT_EQ(outcome.error, "");
    EXPECT_EQ(outcome.result, R"({"resultNumberOfEvents": 3, "stateDatabaseAvailable": true})");
    EXPECT_EQ(platform.deviceData.scans, 1) << "what was deleted is known before it is asked for";
    auto left = numbersOf(fetch({}));
    std::ranges::sort(left);
    EXPECT_EQ(left, (std::vector{2, 3, 5}));
    EXPECT_EQ(run(&KSEventManager::clearEventsWithHandler).result,
              R"({"resultNumberOfEvents": 3})");
}

TEST_F(Manager, WithoutADatabaseEveryOperationSaysSo) {
    events.reset();
    close();
    platform.folder.write("cache/keepsakesDataModel.sqlite", "");
    std::filesystem::remove_all(platform.services.cacheFolder);
    platform.folder.write("cache", "a file where the folder should be");
    open();
    universe->add("EventStore", store);
    universe->add("DefaultsManager", std::make_shared<KSDefaultsManager>(platform.defaults));
    events = KSEventManager::initWithUniverse(*universe);
    for (const auto operation :
         {&KSEventManager::collectEventsWithHandler, &KSEventManager::cleanUpEventsWithHandler,
          &KSEventManager::clearEventsWithHandler, &KSEventManager::runAnalyticsWithHandler}) {
        const auto outcome = run(operation);
        EXPECT_EQ(outcome.error, "database is not avaialble");
        EXPECT_EQ(outcome.result, R"({"stateDatabaseAvailable": false})");
    }
    EXPECT_EQ(platform.deviceData.scans, 0);
    EXPECT_FALSE(platform.problems.list().empty());
    std::filesystem::remove(platform.services.cacheFolder);
    EXPECT_EQ(run(&KSEventManager::clearEventsWithHandler).error, "")
        << "the next check tries again";
}

TEST_F(Manager, AnalyticsKeepsOneEventOfEachTrendHoweverOftenItRuns) {
    const auto trends = [this] {
        std::map<std::string, KSUUID> byKeyword;
        for (const auto& event : fetch({})) {
            if (event->provider() != KSEventProvider::postAnalytics) continue;
            byKeyword.emplace(*valueForKey(*event->trends, "keyword").asString(),
                              event->eventIdentifier());
        }
        return byKeyword;
    };
    const auto today = KSExtensions::startOfDayWithBoundaryOfADay(now(), 10800);
    // The store keeps workouts whole; what the other plans need comes from their sources.
    storeAll(samples::weeks(today.seconds));
    auto outcome = run(&KSEventManager::runAnalyticsWithHandler);
    EXPECT_EQ(outcome.error, "");
    EXPECT_EQ(outcome.result, R"({"resultNumberOfEvents": 5, "stateDatabaseAvailable": true})");
    const auto first = trends();
    EXPECT_EQ(first.size(), 5u);
    std::map<std::string, std::string> verdicts;
    for (const auto& [name, fields] : platform.analytics.take()) {
        EXPECT_EQ(name, "com.brindle.Keepsakes.trends");
        verdicts[*valueForKey(fields, "keyword").asString()] =
            valueForKey(fields, "trends").description();
    }
    const std::map<std::string, std::string> expected{{"workout.duration", "6"},
                                                      {"work.duration", "null"},
                                                      {"work.exit", "null"},
                                                      {"meida.playTime", "null"},
                                                      {"contact.interactions", "null"}};
    EXPECT_EQ(verdicts, expected);
    platform.clock.advance(86400);
    EXPECT_EQ(run(&KSEventManager::runAnalyticsWithHandler).error, "");
    EXPECT_EQ(trends(), first);
    EXPECT_EQ(platform.analytics.take().size(), 5u);
}

TEST_F(Manager, WhatAnAnalysisMadeHasNoSourceThatCouldLackIt) {
    auto trend =
        makeEvent(9, 10, 20, KSEventProvider::postAnalytics, KSEventCategory::photoKeepsake);
    storeAll({trend});
    EXPECT_EQ(run(&KSEventManager::cleanUpEventsWithHandler).result,
              R"({"resultNumberOfEvents": 0, "stateDatabaseAvailable": true})");
    events->fetchEventsWithOptions({}, [](const KSEventArray& found, const OptionalError&) {
        EXPECT_EQ(numbersOf(found), (std::vector{9}));
    });
    WorkerThreads::shared().settle();
}

TEST_F(Manager, AnalyticsWithoutItsEventsSaysWhy) {
    execute("DROP TABLE KSEventBundleMember; DROP TABLE KSEventMO");
    const auto outcome = run(&KSEventManager::runAnalyticsWithHandler);
    EXPECT_EQ(outcome.error, "database: no such table: KSEventMO");
    EXPECT_TRUE(platform.analytics.take().empty());
}

TEST_F(Manager, NeedsItsServices) {
    TestUniverse empty(platform.services);
    RecordedAssertions assertions;
    EXPECT_EQ(KSEventManager::initWithUniverse(empty), nullptr);
    empty.add("EventStore", store);
    EXPECT_EQ(KSEventManager::initWithUniverse(empty), nullptr);
    EXPECT_THAT(assertions.takeDescriptions(),
                ElementsAre("Invalid parameter not satisfying: eventStore",
                            "Invalid parameter not satisfying: defaultsManager"));
}

TEST(EventGroups, AreNamedByCategoryAndProvider) {
    const auto groups = KSEventManager::splitEventArrayByCategory(
        {makeVisit(1, 1, 2, "a"), makeWorkout(2, 1, 2, "b"), makeVisit(3, 0, 1, "c")});
    ASSERT_EQ(groups.size(), 2u);
    EXPECT_EQ(groups.at("Visit:Routine").size(), 2u);
    EXPECT_EQ(groups.at("Workout:Health").size(), 1u);
    EXPECT_EQ(KSEventManager::mergeEventArraysFromDict(groups).size(), 3u);
}

}  // namespace
}  // namespace keepsakes
