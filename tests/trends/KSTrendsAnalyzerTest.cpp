// SPDX-License-Identifier: Apache-2.0
#include "trends/KSTrendsAnalyzer.h"

#include <gmock/gmock.h>

#include <cmath>
#include <limits>

#include "StoreFixture.h"
#include "core/Json.h"
#include "sources/KSVitalsManager.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::Pair;

constexpr double kDay = 86400;

class SettablePolicy final : public DevicePolicy {
  public:
    bool healthData = true;
    bool diagnosticSubmissionAllowed() const override { return true; }
    bool healthDataSubmissionAllowed() const override { return healthData; }
};

/// A health store that does not answer for its owner until it is told to.
class HungHealthStore final : public HealthStore {
  public:
    mutable Semaphore gate;
    void queryWorkouts(KSDateInterval, std::function<void(Workouts)>) override {}
    std::string displayName(int) const override { return ""; }
    std::expected<std::optional<DateComponents>, KSError> dateOfBirth() const override {
        gate.wait();
        return DateComponents{1990, 1, 1};
    }
    std::expected<std::optional<int>, KSError> biologicalSex() const override { return 1; }
};

class Analyzer : public StoreFixture {
  protected:
    Analyzer() {
        platform.services.devicePolicy = &policy;
        universe->add("EventStore", store);
        analyzer = makeAnalyzer();
        plans = analyzer->buildAnalyticsPlans();
        today = plans.front()->testDateInterval.end.seconds;
    }

    std::unique_ptr<KSTrendsAnalyzer> makeAnalyzer() {
        return std::make_unique<KSTrendsAnalyzer>(platform.services,
                                                  KSVitalsManager::initWithUniverse(*universe));
    }

    /// A workout of that many minutes, eight hours into a day; yesterday is 1.
    std::shared_ptr<KSEvent> workout(int daysAgo, double minutes) const {
        const double start = today - kDay * daysAgo + 8 * 3600;
        return makeWorkout(static_cast<std::uint32_t>(daysAgo), start, start + 60 * minutes, "Run");
    }

    /// On days 28 to 2 ago, 20, 30 and 40 minutes in turn.
    KSEventArray fourWeeks() const {
        KSEventArray events;
        for (int daysAgo = 28; daysAgo >= 2; --daysAgo) {
            events.push_back(workout(daysAgo, 20 + 10 * (daysAgo % 3)));
        }
        return events;
    }

    struct Found {
        KSEventPointer event;
        int verdict = 0;
        KSDictionary trends;
        double number(std::string_view key) const {
            return valueForKey(trends, key).asNumber().value_or(NAN);
        }
    };
    /// What the first plan, that of workouts, finds.
    Found analyze(const KSEventArray& events) const {
        Found found;
        analyzer->analyzeEvents(events, *plans.front(),
                                [&](const KSEventPointer& event, KSTrendsVerdict verdict) {
                                    found.event = event;
                                    found.verdict = static_cast<int>(verdict);
                                    if (event) found.trends = *event->trends;
                                });
        return found;
    }

    SettablePolicy policy;
    std::unique_ptr<KSTrendsAnalyzer> analyzer;
    KSTrendsAnalyzerPlans plans;
    double today = 0;
};

TEST_F(Analyzer, NeedsEventsDaysAndDifferingQuartiles) {
    EXPECT_EQ(analyze({}).verdict, 1);
    EXPECT_EQ(analyze({}).event, nullptr);
    const struct {
        KSEventArray events;
        int verdict;
    } rows[] = {
        {{makeVisit(1, today - 5 * kDay, today, "elsewhere")}, 1},
        {{workout(9, 10), workout(8, 20), workout(1, 15)}, 1},
        {{workout(9, 10), workout(8, 20), workout(7, 30), workout(1, 15)}, 5},
        {{workout(9, 10), workout(8, 10), workout(7, 10), workout(1, 90)}, 3},
        {{workout(40, 10), workout(39, 10), workout(7, 10), workout(6, 20)}, 1},
    };
    for (const auto& row : rows) {
        const auto found = analyze(row.events);
        EXPECT_EQ(found.verdict, row.verdict);
        ASSERT_TRUE(found.event);
        EXPECT_EQ(found.trends.contains("trainMean"), row.verdict == 5);
        EXPECT_EQ(found.trends.contains("trends"), row.verdict == 5);
    }
}

TEST_F(Analyzer, TellsUnusualDaysFromUsualOnes) {
    const struct {
        std::vector<double> yesterday;
        int verdict;
        int forClients;
    } rows[] = {{{30}, 5, 1}, {{50, 21}, 6, 2}, {{50, 20}, 5, 1}, {{}, 5, 1}};
    for (const auto& row : rows) {
        auto events = fourWeeks();
        for (const double minutes : row.yesterday) events.push_back(workout(1, minutes));
        const auto found = analyze(events);
        EXPECT_EQ(found.verdict, row.verdict) << found.number("testMean");
        EXPECT_EQ(found.number("trends"), row.verdict);
        EXPECT_EQ(KSTrendsAnalyzer::trendsfromAnalyticsResult(found.verdict), row.forClients);
    }
    KSEventArray steady;
    for (int daysAgo = 28; daysAgo >= 2; --daysAgo) {
        steady.push_back(workout(daysAgo, 60 + daysAgo % 2));
    }
    EXPECT_EQ(analyze(steady).verdict, 4) << "nothing at all is a zero, and unusually low";
    EXPECT_EQ(KSTrendsAnalyzer::trendsfromAnalyticsResult(8), 0);
}

TEST_F(Analyzer, RecordsThePlanTheSummariesAndTheVerdict) {
    auto events = fourWeeks();
    events.push_back(workout(1, 90));
    const auto found = analyze(events);
    const auto& event = *found.event;
    EXPECT_EQ(event.provider(), KSEventProvider::postAnalytics);
    EXPECT_EQ(event.category(), KSEventCategory::workout);
    EXPECT_EQ(event.startDate(), KSDate{today - kDay});
    EXPECT_EQ(event.endDate(), KSDate{today});
    EXPECT_EQ(event.creationDate(), platform.clock.now());
    EXPECT_EQ(event.expirationDate, platform.clock.now() + 2419200);
    const KSDictionary expected{{"keyword", "workout.duration"},
                                {"trainStartDate", today - 28 * kDay},
                                {"trainEndDate", today - kDay},
                                {"testStartDate", today - kDay},
                                {"testEndDate", today},
                                {"aggregationDuration", 1},
                                {"aggregationMethod", 0},
                                {"valueFunctionType", 2},
                                {"lastEventDate", today - kDay + 8 * 3600},
                                {"lastEventInterval", 0.0},
                                {"trainMean", 1800.0},
                                {"trainStd", 240000.0},
                                {"trainCount", 27},
                                {"trainMin", 1200.0},
                                {"trainMax", 2400.0},
                                {"testMean", 5400.0},
                                {"testStd", 0.0},
                                {"testCount", 1},
                                {"testMin", 5400.0},
                                {"testMax", 5400.0},
                                {"trends", 6}};
    EXPECT_EQ(found.trends, expected) << KSValue(found.trends).description();
}

TEST_F(Analyzer, KnowsItsEarlierResultAgainAndHowLongAgoTheLastEventWas) {
    auto events = fourWeeks();
    auto other = analyze(events).event;
    const auto first = analyze(events);
    EXPECT_NE(first.event->eventIdentifier(), other->eventIdentifier());
    EXPECT_EQ(first.number("lastEventInterval"), 0) << "nothing is known of before";

    // As it comes back from the store.
    ASSERT_EQ(storeAll({first.event}).error, "");
    const auto stored = fetch({}).front();
    EXPECT_EQ(stored->trends, first.event->trends);
    const auto unlike =
        makeEvent(900, 0, 1, KSEventProvider::postAnalytics, KSEventCategory::workout);
    unlike->trends = first.trends;
    unlike->trends->insert_or_assign("aggregationMethod", 1);
    events.insert(events.begin(), {unlike, stored});
    const auto again = analyze(events);
    EXPECT_EQ(again.event->eventIdentifier(), first.event->eventIdentifier());
    EXPECT_EQ(again.number("lastEventInterval"), kDay) << "no newer event: the two newest count";
    EXPECT_EQ(again.number("trainCount"), 27) << "results are not sources";

    events.push_back(workout(1, 30));
    events.push_back(makeWorkout(77, today + 3600, today + 3700, "Run"));
    const auto newer = analyze(events);
    EXPECT_EQ(newer.number("lastEventDate"), today + 3600);
    EXPECT_EQ(newer.number("lastEventInterval"), 17 * 3600) << "the shorter of the two";
    EXPECT_EQ(analyze({stored, workout(2, 5)}).number("lastEventInterval"), 0)
        << "a single event that was known before";
}

TEST_F(Analyzer, ALongAbsenceIsSaidWhereNoVerdictIs) {
    EXPECT_EQ(analyze({workout(28, 5), workout(27, 5)}).number("trends"), 8);
    EXPECT_FALSE(analyze({workout(28, 5), workout(20, 5)}).trends.contains("trends"));
    auto stored = analyze({workout(28, 5)}).event;
    const auto back = analyze({stored, workout(28, 5), workout(2, 5)});
    EXPECT_EQ(back.number("lastEventInterval"), 26 * kDay);
    EXPECT_EQ(back.number("trends"), 8);
    EXPECT_EQ(back.verdict, 1);
}

TEST_F(Analyzer, GoesThroughEveryPlan) {
    auto events = fourWeeks();
    KSDictionary statuses;
    std::vector<std::string> keywords;
    analyzer->analyzeEvents(events, plans, [&](const KSEventArray& found, KSDictionary by) {
        for (const auto& event : found) {
            keywords.push_back(*valueForKey(*event->trends, "keyword").asString());
        }
        statuses = std::move(by);
    });
    EXPECT_THAT(keywords, ElementsAre("workout.duration", "work.duration", "work.exit",
                                      "meida.playTime", "contact.interactions"));
    EXPECT_EQ(statuses, (KSDictionary{{"workout.duration", 5},
                                      {"work.duration", 1},
                                      {"work.exit", 1},
                                      {"meida.playTime", 1},
                                      {"contact.interactions", 1}}));
}

TEST_F(Analyzer, EventsOfAbsurdSizeDoNoHarm) {
    auto events = fourWeeks();
    events.push_back(makeWorkout(80, today - 5 * kDay, 1e308, "x"));
    events.push_back(makeWorkout(81, today - 5 * kDay + 1, 1.7e308, "x"));
    events.push_back(makeWorkout(82, 1e300, -1e300, "x"));
    const auto found = analyze(events);
    EXPECT_TRUE(jsonText(found.trends)) << "every number in it is one";
    analyzer->sendMetricsForTrendsEvents({found.event});
    EXPECT_TRUE(jsonText(platform.analytics.take().front().second));
}

TEST_F(Analyzer, SendsAPayloadForEachTrendsEvent) {
    platform.health.born = DateComponents{1990, 5, 1};
    platform.health.sex = 2;
    auto events = fourWeeks();
    events.push_back(workout(1, 90));
    const auto found = analyze(events).event;
    const auto bare = makeEvent(1, 0, 1, KSEventProvider::postAnalytics, KSEventCategory::visit);
    analyzer->sendMetricsForTrendsEvents({bare, found});
    const auto sent = platform.analytics.take();
    ASSERT_EQ(sent.size(), 1u);
    EXPECT_EQ(sent[0].first, "com.brindle.Keepsakes.trends");
    auto payload = sent[0].second;
    EXPECT_EQ(payload.at("creationDate"), KSValue(platform.clock.now().seconds));
    payload.erase("creationDate");
    payload.erase("creationDateStartOfDay");
    const KSDictionary expected{{"trainDuration", 27 * kDay},
                                {"trainDuration_Bucketed", 28},
                                {"testDuration", kDay},
                                {"testDuration_Bucketed", 2},
                                {"category", 2},
                                {"keyword", "workout.duration"},
                                {"aggregationDuration", 1},
                                {"aggregationMethod", 0},
                                {"valueFunctionType", 2},
                                {"trends", 6},
                                {"trainMean", 1800.0},
                                {"trainMean_Scale", 3},
                                {"trainMean_SignificantValue", 18},
                                {"trainStd", 240000.0},
                                {"trainStd_Scale", 5},
                                {"trainStd_SignificantValue", 24},
                                {"trainCount", 27},
                                {"trainCount_Scale", 1},
                                {"trainCount_SignificantValue", 27},
                                {"trainMin", 1200.0},
                                {"trainMin_Scale", 3},
                                {"trainMin_SignificantValue", 12},
                                {"trainMax", 2400.0},
                                {"trainMax_Scale", 3},
                                {"trainMax_SignificantValue", 24},
                                {"testMean", 5400.0},
                                {"testMean_Scale", 3},
                                {"testMean_SignificantValue", 54},
                                {"testStd", 0.0},
                                {"testStd_Scale", 0},
                                {"testStd_SignificantValue", 0},
                                {"testCount", 1},
                                {"testCount_Scale", 0},
                                {"testCount_SignificantValue", 10},
                                {"testMin", 5400.0},
                                {"testMin_Scale", 3},
                                {"testMin_SignificantValue", 54},
                                {"testMax", 5400.0},
                                {"testMax_Scale", 3},
                                {"testMax_SignificantValue", 54},
                                {"IHA_State", true},
                                {"Age", 32},
                                {"Age_Bucketed", 3},
                                {"BiologicalSex", 2}};
    EXPECT_EQ(payload, expected) << KSValue(payload).description();

    const auto ownersFields = [&](const KSTrendsAnalyzer& sender) {
        sender.sendMetricsForTrendsEvents({found});
        std::vector<std::string> keys;
        const auto payloads = platform.analytics.take();
        for (const auto& [key, value] : payloads.front().second) {
            for (const char* owners : {"IHA_State", "Age", "Age_Bucketed", "BiologicalSex"}) {
                if (key == owners) keys.push_back(key);
            }
        }
        return keys;
    };
    platform.health.nextError = KSError::make("Health", 1, "not authorised");
    EXPECT_THAT(ownersFields(*analyzer), ElementsAre("IHA_State"));
    platform.health.nextError.reset();
    policy.healthData = false;
    EXPECT_THAT(ownersFields(*analyzer), ElementsAre()) << "without leave nobody is asked";
    policy.healthData = true;
    EXPECT_THAT(ownersFields(KSTrendsAnalyzer(platform.services, nullptr)), ElementsAre());
}

TEST_F(Analyzer, WaitsAnHourForAgeAndSexAndGoesOnWithout) {
    HungHealthStore hung;
    platform.services.healthStore = &hung;
    analyzer = makeAnalyzer();
    const auto found = analyze(fourWeeks()).event;
    WorkQueue queue("test");
    queue.async([&] { analyzer->sendMetricsForTrendsEvents({found}); });
    WorkerThreads::shared().settle();
    platform.clock.advance(3599);
    platform.clock.advance(3600);
    EXPECT_THAT(platform.analytics.take(), ElementsAre()) << "an hour for each";
    platform.clock.advance(1.5);
    const auto sent = platform.analytics.take();
    ASSERT_EQ(sent.size(), 1u);
    EXPECT_TRUE(sent[0].second.contains("IHA_State"));
    EXPECT_FALSE(sent[0].second.contains("Age"));
    EXPECT_FALSE(sent[0].second.contains("BiologicalSex"));
    hung.gate.signal();
    WorkerThreads::shared().settle();
}

}  // namespace
}  // namespace keepsakes
