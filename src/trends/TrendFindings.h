// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>

#include "trends/KSTrendsAnalyzerOptions.h"
#include "trends/KSTukeyOutlierDetector.h"

namespace keepsakes {

/// What an analysis comes to; recorded events and replies hold the number.
enum class KSTrendsVerdict : std::int64_t {
    notEnoughData = 1,
    noUsableModel = 3,
    lowOutlier = 4,
    normal = 5,
    highOutlier = 6,
    longAbsence = 8,
};

/// The bucket that a date falls into; nothing for a duration that has no buckets. A day starts at
/// 03:00, a week ends on the reference date's weekday.
std::optional<KSDate> indexDate(KSDate date, KSAggregationDuration aggregationDuration,
                                KSDate referenceDate);

/// The series of the events, a point for each bucket in which one has a value, by bucket. A value
/// that is not finite, or would take the bucket's out of range, is passed over.
KSTimeSeriesArray prepareData(const KSEventArray& events, KSAggregationDuration aggregationDuration,
                              KSAggregationMethod aggregationMethod,
                              const KSTrendsAnalyzerOptions::ValueFunction& valueFunction,
                              KSDate referenceDate);

/// The events that the plan looks at, in their order: of its category, and not themselves made by
/// an analysis.
KSEventArray sourceEventsOf(const KSTrendsAnalyzerOptions& plan, const KSEventArray& events);

/// One plan carried out on its source events.
struct TrendFindings {
    KSTimeSeriesArray train;
    KSTimeSeriesArray test;  ///< A single zero point when nothing happened.
    KSTukeyOutlierDetector model;
    /// Present with the verdicts low, normal and high.
    std::optional<KSAnalyticsResult> result;
    KSTrendsVerdict verdict = KSTrendsVerdict::notEnoughData;
};

/// More than two training points are needed for a verdict, and quartiles that differ.
TrendFindings findTrend(const KSTrendsAnalyzerOptions& plan, const KSEventArray& sourceEvents,
                        KSDate now);

}  // namespace keepsakes
