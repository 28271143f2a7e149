// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "core/KSDate.h"

namespace keepsakes {

/// Reads "20240615T100000", with or without a Z, or "20240615" of RFC 5545, 3.3.4 and 3.3.5.
struct CalendarTime {
    KSDate local;  ///< What the clocks of its zone show, written as though it were UTC.
    bool isDate = false;
    bool isUtc = false;
    std::string zone;  ///< The TZID; empty for a floating time.

    friend bool operator==(const CalendarTime&, const CalendarTime&) = default;
};
std::optional<CalendarTime> parseCalendarTime(const std::string& text);

/// Reads a duration of RFC 5545, 3.3.6 ("P1DT2H"), in seconds of days of 24 hours. Negative ones
/// are none.
std::optional<double> parseCalendarDuration(const std::string& text);

/// When the rule (RFC 5545, 3.3.10) has the entry begin within the window, in the local time of the
/// entry, `start` included when it is in there. Fails with the reason for a rule that cannot be
/// read, one by the hour or more often, one that holds more than `limits::kMostOccurrences` times,
/// and one that takes more than `limits::kMostRuleSteps` steps to get there.
///
/// `localOf` tells what the entry's clocks show at an instant, for a rule that ends at one.
std::expected<std::vector<KSDate>, std::string> recurrences(
    const std::string& rule, const CalendarTime& start, KSDateInterval window,
    const std::function<KSDate(KSDate)>& localOf);

}  // namespace keepsakes
