// SPDX-License-Identifier: Apache-2.0
#include "devicedata/IndexedProfileEventStore.h"

#include <SQLiteCpp/SQLiteCpp.h>

#include "core/Json.h"

namespace keepsakes {

namespace {

std::vector<TripPart> partsIn(const std::string& text) {
    std::vector<TripPart> parts;
    const auto json = parseJson(text);
    const auto* list = json ? json->asArray() : nullptr;
    if (!list) return parts;
    for (const auto& entry : *list) {
        const auto* dictionary = entry.asDictionary();
        if (!dictionary) continue;
        auto& part = parts.emplace_back();
        if (const auto* events = valueForKey(*dictionary, "events").asArray()) {
            for (const auto& event : *events) {
                if (const auto* identifier = event.asString()) {
                    part.eventIdentifiers.push_back(*identifier);
                }
            }
        }
        const auto* place = valueForKey(*dictionary, "place").asString();
        if (place) part.placemark = *place;
    }
    return parts;
}

}  // namespace

OptionalError IndexedProfileEventStore::iterateScoredEvents(const TripEventQuery& asked,
                                                            const Each<Trip>& each) {
    const auto answered = index_.ask([&asked, &each](SQLite::Database& index) {
        SQLite::Statement query(index,
                                "SELECT start, end, title, parts FROM trips"
                                " WHERE end >= ? AND start <= ? ORDER BY start, id");
        query.bind(1, asked.fromDate.seconds);
        query.bind(2, asked.toDate.seconds);
        while (query.executeStep()) {
            Trip trip{.startDate = {query.getColumn(0).getDouble()},
                      .endDate = {query.getColumn(1).getDouble()},
                      .title = std::nullopt,
                      .tripParts = partsIn(query.getColumn(3).getString())};
            auto title = query.getColumn(2).getString();
            if (!title.empty()) trip.title = std::move(title);
            if (!each(trip)) return;
        }
    });
    return answered ? std::nullopt : OptionalError(answered.error());
}

OptionalError IndexedProfileEventStore::iterateScoredEvents(const SuggestedEventQuery& asked,
                                                            const Each<SuggestedEvent>& each) {
    const auto answered = index_.ask([&asked, &each](SQLite::Database& index) {
        SQLite::Statement query(index,
                                "SELECT identifier, start, end, category, suggestion, min(file)"
                                " FROM calendarEvents WHERE category IS NOT NULL"
                                " AND end >= ? AND start <= ?"
                                " GROUP BY identifier, start ORDER BY start, identifier");
        query.bind(1, asked.fromDate.seconds);
        query.bind(2, asked.toDate.seconds);
        while (query.executeStep()) {
            SuggestedEvent suggested{
                .eventIdentifier = query.getColumn(0).getString(),
                .startDate = {query.getColumn(1).getDouble()},
                .endDate = {query.getColumn(2).getDouble()},
                .category = static_cast<SuggestionCategory>(query.getColumn(3).getInt()),
                .title = std::nullopt};
            auto title = query.getColumn(4).getString();
            if (!title.empty()) suggested.title = std::move(title);
            if (!each(suggested)) return;
        }
    });
    return answered ? std::nullopt : OptionalError(answered.error());
}

}  // namespace keepsakes
