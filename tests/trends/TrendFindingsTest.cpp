// SPDX-License-Identifier: Apache-2.0
#include "trends/TrendFindings.h"

#include <gmock/gmock.h>
#include <unicode/timezone.h>

#include <cmath>

#include "support/RecordedAssertions.h"
#include "support/TestEvents.h"
#include "trends/AnalyticsPlans.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

KSDate at(const std::string& text) { return parseISO8601(text)->date; }

/// In Vienna, where the night before 2024-03-31 lost an hour.
class Findings : public testing::Test {
  public:
    Findings() : before_(icu::TimeZone::createDefault()) {
        icu::TimeZone::adoptDefault(icu::TimeZone::createTimeZone("Europe/Vienna"));
    }
    ~Findings() override { icu::TimeZone::adoptDefault(before_.release()); }
    Findings(const Findings&) = delete;
    Findings& operator=(const Findings&) = delete;

  private:
    std::unique_ptr<icu::TimeZone> before_;
};

TEST_F(Findings, DaysStartAtThreeAndWeeksKeepTheReferencesWeekday) {
    using enum KSAggregationDuration;
    const auto sunday = at("2024-06-16T12:00:00+02:00");
    const struct {
        KSAggregationDuration duration;
        const char* date;
        const char* bucket;
    } rows[] = {
        {none, "2024-06-15T10:02:03Z", "2024-06-15T10:02:03Z"},
        {day, "2024-06-15T02:59:59+02:00", "2024-06-14T03:00:00+02:00"},
        {day, "2024-06-15T03:00:00+02:00", "2024-06-15T03:00:00+02:00"},
        {day, "2024-04-01T02:59:59+02:00", "2024-03-31T04:00:00+02:00"},
        {week, "2024-06-16T23:00:00+02:00", "2024-06-16T00:00:00+02:00"},
        {week, "2024-06-15T23:00:00+02:00", "2024-06-09T00:00:00+02:00"},
        {week, "2024-06-10T00:00:00+02:00", "2024-06-09T00:00:00+02:00"},
        {week, "2024-04-01T00:30:00+02:00", "2024-03-31T00:00:00+01:00"},
    };
    for (const auto& row : rows) {
        const auto bucket = indexDate(at(row.date), row.duration, sunday);
        ASSERT_TRUE(bucket) << row.date;
        EXPECT_EQ(formatISO8601(*bucket), formatISO8601(at(row.bucket))) << row.date;
    }
    EXPECT_FALSE(indexDate(sunday, KSAggregationDuration{3}, sunday));
}

TEST_F(Findings, AggregateWhatHasAValue) {
    const double start = at("2024-06-10T10:00:00+02:00").seconds;
    const double nextDay = start + 86400;
    const auto nothing = makeWorkout(6, start - 86400, start, "x");
    const KSEventArray events = {makeWorkout(1, start, start + 60, "x"),
                                 makeWorkout(2, start + 100, start + 140, "x"),
                                 makeWorkout(3, nextDay, nextDay + 10, "x"),
                                 makeWorkout(4, start + 200, start + 220, "x"), nothing};
    const auto duration = [&](const KSEvent& event) {
        if (event.isEqual(*nothing)) return kKSTrendsAnalysisNoValue;
        return event.endDate() - event.startDate();
    };
    const auto series = [&](KSAggregationMethod method) {
        return prepareData(events, KSAggregationDuration::day, method, duration, KSDate{start});
    };
    const auto day = [&](double value) { return KSTimeSeries{KSDate{start}, value, 3}; };
    const KSTimeSeries next{KSDate{nextDay}, 10, 1};
    EXPECT_THAT(series(KSAggregationMethod::sum), ElementsAre(day(120), next));
    EXPECT_THAT(series(KSAggregationMethod::mean), ElementsAre(day(40), next));
    EXPECT_THAT(series(KSAggregationMethod::last), ElementsAre(day(20), next));
    EXPECT_THAT(series(KSAggregationMethod{9}),
                ElementsAre(day(0), KSTimeSeries{KSDate{nextDay}, 0, 1}));
    for (const double value :
         std::vector<double>{NAN, HUGE_VAL, -HUGE_VAL, std::numeric_limits<double>::max(),
                             kKSTrendsAnalysisNoValue}) {
        EXPECT_THAT(prepareData(
                        events, KSAggregationDuration::day, KSAggregationMethod::sum,
                        [value](const KSEvent&) { return value; }, KSDate{start}),
                    IsEmpty())
            << value;
    }
    const auto huge = prepareData(
        events, KSAggregationDuration::day, KSAggregationMethod::sum,
        [](const KSEvent&) { return 1e308; }, KSDate{start});
    ASSERT_EQ(huge.size(), 3u);
    EXPECT_EQ(huge[1].value, 1e308) << "a sum beyond what a number holds is not begun";
}

TEST_F(Findings, PlansCompareYesterdayWithTheFourWeeksBefore) {
    for (const auto& [now, today] :
         {std::pair("2024-06-16T02:59:00+02:00", "2024-06-15T03:00:00+02:00"),
          {"2024-06-16T03:00:00+02:00", "2024-06-16T03:00:00+02:00"}}) {
        const auto plans = analyticsPlansAt(at(now));
        std::vector<std::string> keywords;
        for (const auto& plan : plans) {
            keywords.push_back(plan->keyword);
            const auto start = at(today);
            EXPECT_EQ(plan->trainDateInterval, (KSDateInterval{start - 2419200, start - 86400}));
            EXPECT_EQ(plan->testDateInterval, (KSDateInterval{start - 86400, start}));
        }
        EXPECT_THAT(keywords, ElementsAre("workout.duration", "work.duration", "work.exit",
                                          "meida.playTime", "contact.interactions"));
    }
    EXPECT_THAT(analyticsPlansAt(at("2024-06-16T12:00:00Z"))[2]->description(),
                testing::StartsWith("keyword, work.exit, category, 1@, train.startDate, "));
}

TEST_F(Findings, EachPlanTakesItsOwnValue) {
    const double start = at("2024-06-10T08:00:00+02:00").seconds;
    const auto work = makeVisit(1, start, start + 8.5 * 3600, "Office");
    work->placeUserType = 2;
    const auto home = makeVisit(2, start, start + 3600, "Home");
    home->placeUserType = 1;
    const auto media = [start](std::optional<double> seconds) {
        auto event = makeEvent(3, start, start + 60, KSEventProvider::foresight,
                               KSEventCategory::leisureMedia);
        event->mediaSumTimePlayed = seconds;
        return event;
    };
    const auto contact = [start](const std::vector<KSValue>& mechanisms) {
        auto event = makeEvent(4, start, start + 60, KSEventProvider::foresight,
                               KSEventCategory::significantContact);
        event->interactions.emplace();
        for (const auto& mechanism : mechanisms) {
            event->interactions->push_back({{"mechanism", mechanism}});
        }
        return event;
    };
    const auto nobody =
        makeEvent(5, start, start, KSEventProvider::foresight, KSEventCategory::significantContact);
    constexpr double kNone = kKSTrendsAnalysisNoValue;
    const struct {
        std::size_t plan;
        KSEventPointer event;
        double value;
    } rows[] = {
        {0, makeWorkout(6, start, start + 1800, "Running"), 1800},
        {1, work, 8.5 * 3600},
        {1, home, kNone},
        {2, work, 16 * 60 + 30},
        {2, home, kNone},
        {3, media(90.5), 90.5},
        {3, media(0), kNone},
        {3, media(std::nullopt), kNone},
        {4, contact({0, 2, 3, 4, 8, 9, 10, 11, 12, 16}), 10},
        {4, contact({1, 5, 6, 7, 13, 14, 15, 17, -1, "2", 3}), 1},
        {4, contact({17}), kNone},
        {4, nobody, kNone},
    };
    const auto plans = analyticsPlansAt(KSDate{start});
    for (const auto& row : rows) {
        EXPECT_EQ(plans[row.plan]->valueFunction(*row.event), row.value)
            << plans[row.plan]->keyword << " " << row.event->description();
    }
    EXPECT_EQ(timeOfDay(std::nullopt), -1);
}

TEST_F(Findings, PlansNeedTheirPartsAndKnowTheirFunctions) {
    RecordedAssertions assertions;
    const KSDateInterval interval{{0}, {1}};
    const auto make = [](auto train, auto test, auto value) {
        return KSTrendsAnalyzerOptions::initWithKeyword("k", KSEventCategory::visit, train, test,
                                                        KSAggregationDuration::day,
                                                        KSAggregationMethod::sum, value);
    };
    using Function = KSTrendsAnalyzerOptions::ValueFunction;
    const Function one = [](const KSEvent&) { return 1.0; };
    EXPECT_FALSE(make(std::nullopt, interval, one));
    EXPECT_FALSE(make(interval, std::nullopt, one));
    EXPECT_FALSE(make(interval, interval, Function()));
    EXPECT_FALSE(make(interval, interval, KSTrendsAnalyzerValueFunctionTypeCustom));
    EXPECT_THAT(assertions.takeDescriptions(),
                ElementsAre("Invalid parameter not satisfying: trainDateInterval",
                            "Invalid parameter not satisfying: testDateInterval",
                            "Invalid parameter not satisfying: valueFunction",
                            "Invalid parameter not satisfying: category != "
                            "KSTrendsAnalyzerValueFunctionTypeCustom"));
    const auto longEvent = make(interval, interval, KSTrendsAnalyzerValueFunctionTypeLongEvent);
    EXPECT_EQ(longEvent->valueFunction(*makeVisit(1, 0, 600, "")), 0);
    EXPECT_EQ(longEvent->valueFunction(*makeVisit(1, 0, 600.5, "")), 1);
    EXPECT_EQ(longEvent->valueFunctionType, 1u);
}

}  // namespace
}  // namespace keepsakes
