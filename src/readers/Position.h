// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cmath>
#include <optional>

#include "readers/FileRecords.h"

namespace keepsakes {

/// The position of degrees that a file states, when both are there and on earth. 0, 0 is what
/// receivers without a fix write: none.
inline std::optional<GeoPoint> geoPoint(std::optional<double> latitude,
                                        std::optional<double> longitude) {
    if (!latitude || !longitude) return std::nullopt;
    // Put so that a number that is none is refused as well.
    if (!(std::abs(*latitude) <= 90 && std::abs(*longitude) <= 180)) return std::nullopt;
    if (*latitude == 0 && *longitude == 0) return std::nullopt;
    return GeoPoint{*latitude, *longitude};
}

}  // namespace keepsakes
