// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "readers/CalendarRecords.h"
#include "readers/CardLine.h"
#include "readers/Recurrence.h"
#include "readers/SuggestionRules.h"

namespace keepsakes {

/// A date of an RDATE, with the length of its own that a period has.
struct ExtraDate {
    CalendarTime time;
    std::optional<double> seconds;
};

/// One VEVENT as its file says it (RFC 5545, 3.6.1). A plain value.
struct CalendarEntry {
    std::string uid;
    std::string title;
    std::string location;
    std::vector<std::string> attendees;
    std::optional<CalendarTime> start;
    std::optional<CalendarTime> end;
    std::optional<double> duration;  ///< Seconds.
    std::vector<std::string> rules;
    std::vector<ExtraDate> extraDates;
    std::vector<CalendarTime> exceptions;
    /// Of an override: which occurrence it stands for, and whether for all later ones too.
    std::optional<CalendarTime> recurrenceId;
    bool andFuture = false;
    bool isCancelled = false;
    int sequence = 0;
    std::optional<Recognition> recognition;
};

/// A text of the file, clean and of at most `limits::kLongestName` bytes.
std::string boundedText(std::string_view text);

/// Makes an entry of its lines. What a line says that cannot be read counts as not said.
class EntryBuilder {
  public:
    void line(const CardLine& line);
    CalendarEntry finish();

  private:
    void time(const CardLine& line, std::optional<CalendarTime>& into);
    void dates(const CardLine& line);
    void attendee(const CardLine& line);
    void extension(const CardLine& line);

    CalendarEntry entry_;
    EntryText text_;
};

}  // namespace keepsakes
