// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>

#include "trends/KSTrendsAnalyzerOptions.h"

namespace keepsakes {

/// A day of the analysis starts at 03:00, so that an evening belongs to the day it began on.
inline constexpr double kKSTrendsAnalysisBoundaryOfADay = 10800;
/// What yesterday is compared with reaches this far back: 28 days.
inline constexpr double kKSTrendsAnalysisTimeRange = 2419200;
/// No event for longer than this is a long absence: 21 days.
inline constexpr double kKSTrendsAnalysisLongInterval = 1814400;

/// The daily plans at `now`: yesterday against the 27 days before it. Stored results are matched on
/// their keywords, odd spellings included.
KSTrendsAnalyzerPlans analyticsPlansAt(KSDate now);
/// The same for the day that starts at `today`.
KSTrendsAnalyzerPlans analyticsPlansOfDay(KSDate today);

/// A time of day as clocks show it.
struct ClockTime {
    int hours = 0;
    int minutes = 0;
};
/// Minutes since midnight; -1 for none.
double timeOfDay(std::optional<ClockTime> time);

}  // namespace keepsakes
