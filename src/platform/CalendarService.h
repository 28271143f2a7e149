// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <expected>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "core/KSDate.h"
#include "core/KSError.h"

namespace keepsakes {

/// One occurrence of an entry of the owner's calendars.
struct CalendarEvent {
    std::string eventIdentifier;
    std::string title;
    KSDate startDate;
    KSDate endDate;
    bool isAllDay = false;
    std::string location{};                ///< Empty when the entry has none.
    std::vector<std::string> attendees{};  ///< Names, or addresses where there are none.
    std::string calendar{};                ///< The name of the calendar that holds it.

    friend bool operator==(const CalendarEvent&, const CalendarEvent&) = default;
};

/// The owner's calendars. Any thread may call it; it blocks the caller and changes nothing.
class CalendarStore {
  public:
    using Event = std::expected<std::optional<CalendarEvent>, KSError>;

    virtual ~CalendarStore() = default;

    /// Nothing when no calendar holds the event (any more).
    virtual Event eventWithIdentifier(const std::string& identifier) = 0;
};

/// For an application that only looks events up by identifier.
inline constexpr std::uint64_t kCalendarStoreLookUpOnly = 128;

/// Opens the owner's calendars.
class CalendarService {
  public:
    virtual ~CalendarService() = default;
    /// `options` are bits such as `kCalendarStoreLookUpOnly`.
    virtual std::unique_ptr<CalendarStore> openStore(std::uint64_t options) = 0;
};

}  // namespace keepsakes
