// SPDX-License-Identifier: Apache-2.0
#include "devicedata/IndexedCalendarService.h"

#include <SQLiteCpp/SQLiteCpp.h>

#include <sstream>

namespace keepsakes {

namespace {

class IndexedCalendarStore final : public CalendarStore {
  public:
    explicit IndexedCalendarStore(IndexFile index) : index_(std::move(index)) {}

    Event eventWithIdentifier(const std::string& identifier) override {
        std::optional<CalendarEvent> found;
        const auto answered = index_.ask([&found, &identifier](SQLite::Database& index) {
            SQLite::Statement query(index,
                                    "SELECT title, start, end, allDay, location, attendees,"
                                    " calendar FROM calendarEvents WHERE identifier = ?"
                                    " ORDER BY file LIMIT 1");
            query.bind(1, identifier);
            if (!query.executeStep()) return;
            auto& event = found.emplace();
            event.eventIdentifier = identifier;
            event.title = query.getColumn(0).getString();
            event.startDate = {query.getColumn(1).getDouble()};
            event.endDate = {query.getColumn(2).getDouble()};
            event.isAllDay = query.getColumn(3).getInt() != 0;
            event.location = query.getColumn(4).getString();
            std::istringstream names(query.getColumn(5).getString());
            for (std::string name; std::getline(names, name);) event.attendees.push_back(name);
            event.calendar = query.getColumn(6).getString();
        });
        if (!answered) return std::unexpected(answered.error());
        return found;
    }

  private:
    const IndexFile index_;
};

}  // namespace

std::unique_ptr<CalendarStore> IndexedCalendarService::openStore(std::uint64_t) {
    return std::make_unique<IndexedCalendarStore>(index_);
}

}  // namespace keepsakes
