// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "core/KSDate.h"
#include "platform/ProfileEventStore.h"

namespace keepsakes {

/// What the rules make of a calendar entry.
struct Recognition {
    SuggestionCategory category = SuggestionCategory::none;
    std::string title;
    std::string origin;       ///< Town that a journey leaves; empty when nobody says.
    std::string destination;  ///< Town that a journey leads to, or of a stay; likewise.
    /// The hours of an entry that itself tells days alone.
    std::optional<KSDateInterval> span;

    friend bool operator==(const Recognition&, const Recognition&) = default;
};

/// One occurrence of an entry of a calendar.
struct CalendarOccurrence {
    /// The entry's UID, and for one that recurs "/" and when the rule has it begin: the same for
    /// every copy, and when the occurrence is moved.
    std::string identifier;
    KSDate start;
    KSDate end;
    bool isAllDay = false;
    bool recurs = false;
    std::string title;
    std::string location;
    std::string calendar;
    std::vector<std::string> attendees;
    std::optional<Recognition> recognition;

    friend bool operator==(const CalendarOccurrence&, const CalendarOccurrence&) = default;
};

}  // namespace keepsakes
