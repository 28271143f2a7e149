// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <compare>
#include <optional>
#include <string>
#include <string_view>

namespace keepsakes {

/// In seconds; a day of the calendar may be longer or shorter.
inline constexpr double kHour = 3600;
inline constexpr double kDay = 24 * kHour;

/// An instant: seconds since 2001-01-01 00:00:00 UTC, fractions allowed. A plain value.
struct KSDate {
    double seconds = 0;

    /// Bounds that lie outside every recorded life: the years 4001 and 1.
    static constexpr double kDistantFuture = 63113904000.0;
    static constexpr double kDistantPast = -63114076800.0;
    static constexpr KSDate distantFuture() { return {kDistantFuture}; }
    static constexpr KSDate distantPast() { return {kDistantPast}; }

    /// Seconds between 1970-01-01 and 2001-01-01.
    static constexpr double kUnixEpochOffset = 978307200.0;
    static constexpr KSDate fromUnix(double unixSeconds) {
        return {unixSeconds - kUnixEpochOffset};
    }
    constexpr double unixSeconds() const { return seconds + kUnixEpochOffset; }

    friend constexpr auto operator<=>(KSDate, KSDate) = default;
    friend constexpr KSDate operator+(KSDate date, double delta) { return {date.seconds + delta}; }
    friend constexpr KSDate operator-(KSDate date, double delta) { return {date.seconds - delta}; }
    friend constexpr double operator-(KSDate a, KSDate b) { return a.seconds - b.seconds; }
};

/// A span of time. Nothing requires the start to precede the end.
struct KSDateInterval {
    KSDate start;
    KSDate end;

    constexpr double duration() const { return end - start; }
    friend constexpr bool operator==(const KSDateInterval&, const KSDateInterval&) = default;
};

/// What `parseISO8601` found: the instant (taken as UTC when the text has no zone) and the zone.
struct ParsedDate {
    KSDate date;
    std::optional<int> offsetSeconds;  ///< East of UTC; absent when the text names no zone.
};

/// Reads "2024-06-15T10:02:03.25+02:00" and its usual shortenings: a blank or lower-case letters
/// for T and Z, no seconds, no time (midnight), an offset as +02:00, +0200 or +02.
/// Answers nothing for anything else, impossible dates included.
std::optional<ParsedDate> parseISO8601(std::string_view text);

/// "2024-06-15T10:02:03Z", with milliseconds when there are any. UTC.
/// "invalid" for what is not a number or lies outside the years 1 to 9999.
std::string formatISO8601(KSDate date);

}  // namespace keepsakes
