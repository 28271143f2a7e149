// SPDX-License-Identifier: Apache-2.0
#include "indexer/TripUpdate.h"

#include <algorithm>

#include "core/Json.h"
#include "indexer/TripRule.h"

namespace keepsakes {

namespace {

/// An entry of days begins at midnight, a stay in the afternoon of that day: after the way there.
constexpr double kCheckIn = 14 * 3600.0;

std::vector<JourneyLeg> loadLegs(SQLite::Database& database) {
    std::vector<JourneyLeg> legs;
    // Travel is 1, 3 to 7; lodging 10.
    SQLite::Statement query(database,
                            "SELECT identifier, start, end, category, origin, destination,"
                            " allDay, min(file) FROM calendarEvents"
                            " WHERE category IN (1, 3, 4, 5, 6, 7, 10) AND recurs = 0"
                            " GROUP BY identifier, start");
    while (query.executeStep()) {
        legs.push_back(
            {.identifier = query.getColumn(0).getString(),
             .span = {{query.getColumn(1).getDouble()}, {query.getColumn(2).getDouble()}},
             .category = static_cast<SuggestionCategory>(query.getColumn(3).getInt()),
             .origin = query.getColumn(4).getString(),
             .destination = query.getColumn(5).getString()});
        auto& leg = legs.back();
        const bool isAllDay = query.getColumn(6).getInt() != 0;
        if (isAllDay && leg.category == SuggestionCategory::lodging) {
            leg.span.start = std::min(leg.span.start + kCheckIn, leg.span.end);
        }
    }
    return legs;
}

std::string textOf(const std::vector<TripPart>& parts) {
    KSArray list;
    for (const auto& part : parts) {
        const auto& identifiers = part.eventIdentifiers;
        KSDictionary entry{{"events", KSArray(identifiers.begin(), identifiers.end())}};
        if (part.placemark) entry.emplace("place", *part.placemark);
        list.emplace_back(std::move(entry));
    }
    return jsonText(KSValue(std::move(list))).value_or("[]");
}

}  // namespace

bool updateTrips(IndexWriter& index) {
    if (index.meta(kMetaTripsStale, 0) == 0) return false;
    index.setMeta(kMetaTripsStale, 0);
    auto& database = index.database();
    database.exec("DELETE FROM trips");
    SQLite::Statement put(database,
                          "INSERT INTO trips(start, end, title, parts) VALUES(?, ?, ?, ?)");
    for (const auto& trip : tripsOf(loadLegs(database))) {
        put.bind(1, trip.startDate.seconds);
        put.bind(2, trip.endDate.seconds);
        put.bind(3, trip.title.value_or(""));
        put.bind(4, textOf(trip.tripParts));
        runOnce(put);
    }
    return true;
}

}  // namespace keepsakes
