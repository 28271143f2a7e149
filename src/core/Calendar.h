// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "core/KSDate.h"

namespace keepsakes {

/// Calendar arithmetic and date display in the owner's time zone and locale (TZ, LANG). Days of 23
/// and 25 hours are handled as the zone's rules say. Any thread may call these; a date that no
/// calendar holds (not finite) is answered unchanged.
namespace calendar {

KSDate startOfDay(KSDate date);

int hours(KSDate date);
int minutes(KSDate date);
/// 1 Sunday to 7 Saturday.
int weekday(KSDate date);

/// Whether it reaches from a midnight to another, or to the last second before that.
bool isWholeDays(KSDateInterval span);

/// Whole years from `from` to `to`, as birthdays are counted.
int yearsBetween(KSDate from, KSDate to);

/// Midnight of a day given by its Gregorian numbers; nothing for a day that does not exist.
std::optional<KSDate> dateOfDay(int year, int month, int day);

/// Seconds east of UTC at `date` in the owner's zone.
int offsetAt(KSDate date);

/// The instant at which clocks in the owner's zone showed `local`, which is written as though it
/// were UTC. In a repeated hour the first one; in a skipped hour the instant an hour later.
KSDate fromLocal(KSDate local);

/// "Saturday, June 15, 2024 at 10:02:03 AM GMT+2": full date style, long time style.
std::string fullDateLongTime(KSDate date);

/// "6/15/24, 10:02:03 AM GMT+2": short date style, long time style.
std::string shortDateLongTime(KSDate date);

/// By an ICU pattern, such as "EEEE HH:mm".
std::string format(KSDate date, std::string_view pattern);

}  // namespace calendar

}  // namespace keepsakes
