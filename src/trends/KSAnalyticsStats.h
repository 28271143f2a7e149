// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <limits>

#include "trends/KSTimeSeries.h"

namespace keepsakes {

/// The summary of a list of points. A list without points leaves the initial values.
struct KSAnalyticsStats {
    double min = std::numeric_limits<double>::max();
    double max = std::numeric_limits<double>::lowest();
    double mean = 0;
    /// The population variance: no root is taken, and what is reported under this name relies on
    /// it.
    double std = 0;
    std::uint64_t count = 0;

    static KSAnalyticsStats initWithTimeSeries(const KSTimeSeriesArray& points);

    friend bool operator==(const KSAnalyticsStats&, const KSAnalyticsStats&) = default;
};

}  // namespace keepsakes
