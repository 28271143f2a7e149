// SPDX-License-Identifier: Apache-2.0
#pragma once

/// How long after its making an event is kept, in seconds.
namespace keepsakes::lifetime {

inline constexpr double kWeek = 604800;
inline constexpr double kFourWeeks = 2419200;
/// Birthdays and anniversaries come round again: a year and a week.
inline constexpr double kYearAndWeek = 32140800;

}  // namespace keepsakes::lifetime
