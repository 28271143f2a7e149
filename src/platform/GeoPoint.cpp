// SPDX-License-Identifier: Apache-2.0
#include "platform/GeoPoint.h"

#include <algorithm>
#include <cmath>
#include <numbers>

namespace keepsakes {

double distanceBetween(const GeoPoint& a, const GeoPoint& b) {
    constexpr double kEarthRadius = 6371008.8;
    constexpr double kRadians = std::numbers::pi / 180;
    const double sinLatitude = std::sin((b.latitude - a.latitude) * kRadians / 2);
    const double sinLongitude = std::sin((b.longitude - a.longitude) * kRadians / 2);
    const double h = sinLatitude * sinLatitude + std::cos(a.latitude * kRadians) *
                                                     std::cos(b.latitude * kRadians) *
                                                     sinLongitude * sinLongitude;
    return 2 * kEarthRadius * std::asin(std::min(1.0, std::sqrt(h)));
}

}  // namespace keepsakes
