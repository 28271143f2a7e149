// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <fmt/format.h>
#include <fmt/ranges.h>

#include <string>

#include "PeopleText.h"
#include "readers/CalendarReader.h"

namespace keepsakes {

/// The lines of an entry as a calendar of one.
inline std::string calendarOf(const std::string& lines) {
    return "BEGIN:VCALENDAR\r\nVERSION:2.0\r\n" + lines + "END:VCALENDAR\r\n";
}
inline std::string entryOf(const std::string& lines) {
    return "BEGIN:VEVENT\r\nUID:u\r\n" + lines + "END:VEVENT\r\n";
}

/// Noon of 2024-06-15.
inline const ReaderContext kCalendarContext{.now = parseISO8601("2024-06-15T12:00:00Z")->date,
                                            .path = "/home/o/.calendars/private/a.ics"};

/// What the bytes tell, a line an occurrence:
///     <identifier> <start>..<end> [day] <title>
/// then a line "! <remark>" for what was left out; or "error: <reason>".
inline std::string occurrencesIn(const std::string& bytes,
                                 const ReaderContext& context = kCalendarContext) {
    const auto read = readCalendar(inPieces(bytes, 4096), context);
    if (!read) return "error: " + read.error();
    std::string text;
    for (const auto& one : read->occurrences) {
        text += fmt::format("{} {}..{}{} {}\n", one.identifier, formatISO8601(one.start),
                            formatISO8601(one.end), one.isAllDay ? " day" : "", one.title);
    }
    for (const auto& remark : read->remarks) text += "! " + remark + "\n";
    return text;
}

}  // namespace keepsakes
