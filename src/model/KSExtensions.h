// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>

#include "core/KSDate.h"
#include "model/KSEvent.h"

namespace keepsakes {

/// Helpers on arrays of events and on dates. Any thread may call them.
namespace KSExtensions {

/// A new array, stably sorted by start, or end, ascending.
KSEventArray sortKSEventArrayByStartDate(KSEventArray events);
KSEventArray sortKSEventArrayByEndDate(KSEventArray events);

/// The envelope of all spans; nothing for no events.
std::optional<KSDateInterval> getDurationOfKSEventArray(const KSEventArray& events);

/// "%f (%@)": the seconds with six decimals, then short date and long time.
std::string stringFromDate(KSDate date);

/// Whether the date lies in the closed range between two bounds given in either order; false when
/// a bound is missing.
bool betweenDate(KSDate date, std::optional<KSDate> bound, std::optional<KSDate> otherBound);

bool isBeforeDate(KSDate date, KSDate other);
bool isOnOrBefore(KSDate date, KSDate other);
bool isAfterDate(KSDate date, KSDate other);
bool isOnOrAfter(KSDate date, KSDate other);

/// Midnight of the date's day in the owner's calendar.
KSDate startOfDay(KSDate date);
/// The same where days begin `boundarySeconds` after midnight.
KSDate startOfDayWithBoundaryOfADay(KSDate date, double boundarySeconds);

int hours(KSDate date);
int minutes(KSDate date);

}  // namespace KSExtensions

}  // namespace keepsakes
