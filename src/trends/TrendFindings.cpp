// SPDX-License-Identifier: Apache-2.0
#include "trends/TrendFindings.h"

#include <algorithm>
#include <iterator>
#include <limits>
#include <map>

#include "core/Calendar.h"
#include "core/KSDate.h"
#include "model/KSExtensions.h"
#include "trends/AnalyticsPlans.h"

namespace keepsakes {

namespace {

constexpr std::size_t kFewestTrainingPoints = 3;

/// The same clock time some calendar days later, or earlier.
KSDate addingDays(KSDate date, int days) {
    return calendar::fromLocal(date + calendar::offsetAt(date) + kDay * days);
}

/// The value of a bucket once another event's is added to it.
double aggregated(KSAggregationMethod method, const KSTimeSeries& point, double value) {
    const auto count = static_cast<double>(point.count);
    switch (method) {
        case KSAggregationMethod::sum:
            return value + point.value;
        case KSAggregationMethod::mean:
            return (value + point.value * count) / (count + 1);
        case KSAggregationMethod::last:
            return value;
    }
    return point.value;
}

bool isValue(double value) {
    return value > kKSTrendsAnalysisNoValue && value < std::numeric_limits<double>::max();
}

KSEventArray startingWithin(const KSEventArray& events, const KSDateInterval& interval) {
    KSEventArray within;
    std::ranges::copy_if(events, std::back_inserter(within), [&interval](const auto& event) {
        return event->startDate() >= interval.start && event->startDate() <= interval.end;
    });
    return within;
}

KSTrendsVerdict verdictOf(const KSAnalyticsResult& result) {
    if (!result.outlier) return KSTrendsVerdict::normal;
    return result.score > 0 ? KSTrendsVerdict::highOutlier : KSTrendsVerdict::lowOutlier;
}

}  // namespace

std::optional<KSDate> indexDate(KSDate date, KSAggregationDuration aggregationDuration,
                                KSDate referenceDate) {
    switch (aggregationDuration) {
        case KSAggregationDuration::none:
            return date;
        case KSAggregationDuration::day:
            return KSExtensions::startOfDayWithBoundaryOfADay(date,
                                                              kKSTrendsAnalysisBoundaryOfADay);
        case KSAggregationDuration::week:
            return calendar::startOfDay(
                addingDays(date, calendar::weekday(referenceDate) - calendar::weekday(date)));
    }
    return std::nullopt;
}

KSTimeSeriesArray prepareData(const KSEventArray& events, KSAggregationDuration aggregationDuration,
                              KSAggregationMethod aggregationMethod,
                              const KSTrendsAnalyzerOptions::ValueFunction& valueFunction,
                              KSDate referenceDate) {
    std::map<KSDate, KSTimeSeries> buckets;
    for (const auto& event : events) {
        const double value = valueFunction(*event);
        if (!isValue(value)) continue;
        const auto bucket = indexDate(event->startDate(), aggregationDuration, referenceDate);
        if (!bucket) continue;
        const auto found = buckets.find(*bucket);
        auto point = found == buckets.end() ? KSTimeSeries{event->startDate()} : found->second;
        point.value = aggregated(aggregationMethod, point, value);
        if (!isValue(point.value)) continue;
        ++point.count;
        buckets.insert_or_assign(*bucket, point);
    }
    KSTimeSeriesArray points;
    for (const auto& [bucket, point] : buckets) points.push_back(point);
    return points;
}

KSEventArray sourceEventsOf(const KSTrendsAnalyzerOptions& plan, const KSEventArray& events) {
    KSEventArray sources;
    std::ranges::copy_if(events, std::back_inserter(sources), [&plan](const auto& event) {
        return event->provider() != KSEventProvider::postAnalytics &&
               (plan.category == KSEventCategory::unknown || event->category() == plan.category);
    });
    return sources;
}

TrendFindings findTrend(const KSTrendsAnalyzerOptions& plan, const KSEventArray& sourceEvents,
                        KSDate now) {
    const auto series = [&](const KSDateInterval& interval) {
        return prepareData(startingWithin(sourceEvents, interval), plan.aggregationDuration,
                           plan.aggregationMethod, plan.valueFunction, now);
    };
    TrendFindings found;
    found.train = series(plan.trainDateInterval);
    found.test = series(plan.testDateInterval);
    if (found.test.empty()) found.test.push_back({plan.testDateInterval.start});
    if (found.train.size() < kFewestTrainingPoints) return found;
    if (found.model.fitData(found.train)) found.result = found.model.testData(found.test);
    found.verdict = found.result ? verdictOf(*found.result) : KSTrendsVerdict::noUsableModel;
    return found;
}

}  // namespace keepsakes
