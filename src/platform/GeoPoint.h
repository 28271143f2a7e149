// SPDX-License-Identifier: Apache-2.0
#pragma once

namespace keepsakes {

struct GeoPoint {
    double latitude = 0;   ///< Degrees north.
    double longitude = 0;  ///< Degrees east.

    friend bool operator==(const GeoPoint&, const GeoPoint&) = default;
};

/// Great-circle distance in metres on a sphere of the mean earth radius (haversine formula).
double distanceBetween(const GeoPoint& a, const GeoPoint& b);

/// Of latitude, on the same sphere.
inline constexpr double kMetresPerDegree = 111195;

}  // namespace keepsakes
