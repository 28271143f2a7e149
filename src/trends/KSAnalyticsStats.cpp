// SPDX-License-Identifier: Apache-2.0
#include "trends/KSAnalyticsStats.h"

#include <algorithm>

namespace keepsakes {

KSAnalyticsStats KSAnalyticsStats::initWithTimeSeries(const KSTimeSeriesArray& points) {
    KSAnalyticsStats stats;
    if (points.empty()) return stats;
    const auto number = static_cast<double>(points.size());
    for (const auto& point : points) {
        stats.min = std::min(stats.min, point.value);
        stats.max = std::max(stats.max, point.value);
        stats.mean += point.value;
    }
    stats.mean /= number;
    for (const auto& point : points) {
        stats.std += (point.value - stats.mean) * (point.value - stats.mean);
    }
    stats.std /= number;
    stats.count = points.size();
    return stats;
}

}  // namespace keepsakes
