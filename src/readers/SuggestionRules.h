// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "readers/CalendarRecords.h"

namespace keepsakes {

/// What the rules look at of a calendar entry. Texts are UTF-8 with their escapes undone.
struct EntryText {
    std::string title{};
    std::string description{};
    std::string location{};
    std::string origin{};  ///< UID, organizer and URL: who sent the entry.
    std::vector<std::string> categories{};
    std::vector<std::string> extensions{};  ///< Values of X- properties, as they stand.
    std::size_t attendees = 0;
    KSDate localStart{};  ///< As `CalendarTime::local`.
    bool isAllDay = false;
};

/// What the entry is a suggestion of, or nothing: by the reservation that it carries as data; else
/// by who sent it, by its categories, by the words of its title and description. The tables stand
/// in SuggestionRules.cpp and ReservationData.cpp. Any thread may call it.
std::optional<Recognition> recognise(const EntryText& entry);

/// The reservation that a value holds as schema.org JSON-LD, or nothing. One that was cancelled is
/// a recognition of category none.
std::optional<Recognition> reservationIn(std::string_view value, const EntryText& entry);

/// The town in a station's, airport's or town's name or code: "Lyon" of "Lyon Part-Dieu" and of
/// "LYS". Public source of the codes: the airports' own.
std::string townIn(std::string_view place);
/// The town of a postal address of one line, or nothing.
std::string townOfAddress(std::string_view address);

}  // namespace keepsakes
