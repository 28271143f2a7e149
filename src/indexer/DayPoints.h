// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "readers/LocationRecords.h"

namespace keepsakes {

/// Points are kept in steps of so many seconds; more of them tell nothing about a stay.
inline constexpr double kPointStep = 10;

/// The UTC day of an instant, counted from 2001-01-01; only the index counts so.
std::int64_t utcDayOf(KSDate time);
KSDate startOfUtcDay(std::int64_t day);

/// The points of one UTC day, at most one in each step of time: the most accurate one, then the
/// earliest. What comes in twice, from one file or from several, counts once, and the order in
/// which it comes does not matter. Memory is bounded by the day's number of steps.
class DayPoints {
  public:
    void add(const TrackPoint& point);
    bool empty() const { return points_.empty(); }

    /// The points by time; nothing is left.
    std::vector<TrackPoint> take();

  private:
    void compact();

    std::vector<TrackPoint> points_;
};

/// Points of the day, in the order of time, in a few bytes each: the differences of time
/// (milliseconds) and position (1e-7 degrees) from the point before, and the accuracy (whole
/// metres, plus one; 0 when it is not known), as variable-length integers of 7 bits a byte.
std::string encodePoints(std::int64_t day, const std::vector<TrackPoint>& points);

/// Adds what `encodePoints` made to `points`; of damaged bytes those before the damage.
void decodePoints(std::int64_t day, std::string_view bytes, DayPoints& points);

}  // namespace keepsakes
