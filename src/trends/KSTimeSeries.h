// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <vector>

#include "core/KSDate.h"

namespace keepsakes {

/// One point of a series: what the events of one bucket (as a rule a day) come to.
struct KSTimeSeries {
    KSDate date;              ///< The start of the bucket's first event.
    double value = 0;         ///< Finite.
    std::uint64_t count = 0;  ///< How many events went into the value.

    friend bool operator==(const KSTimeSeries&, const KSTimeSeries&) = default;
};

using KSTimeSeriesArray = std::vector<KSTimeSeries>;

}  // namespace keepsakes
