// SPDX-License-Identifier: Apache-2.0
#include "devicedata/IndexedRoutineService.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <fmt/format.h>

#include <limits>

#include "core/Clock.h"

namespace keepsakes {

namespace {

GeoPoint pointAt(SQLite::Statement& row, int column) {
    return {.latitude = row.getColumn(column).getDouble(),
            .longitude = row.getColumn(column + 1).getDouble()};
}

std::optional<std::string> textAt(SQLite::Statement& row, int column) {
    if (row.isColumnNull(column)) return std::nullopt;
    return row.getColumn(column).getString();
}

/// A file's own word for the visit goes before what most visits there are called.
PlaceInference inferenceOf(SQLite::Statement& row, int column) {
    PlaceInference inference;
    inference.preferredName = textAt(row, column);
    auto mapName = textAt(row, column + 1);
    if (!mapName) mapName = textAt(row, column + 2);
    if (mapName) inference.mapItem = MapItem{std::move(mapName)};
    inference.userType = static_cast<std::uint64_t>(row.getColumn(column + 3).getInt64());
    if (const auto text = textAt(row, column + 4)) inference.loiIdentifier = KSUUID::parse(*text);
    return inference;
}

}  // namespace

IndexedRoutineService::IndexedRoutineService(std::filesystem::path index, const Clock& clock)
    : index_(std::move(index)), clock_(clock) {}

void IndexedRoutineService::fetchStoredVisits(const VisitFetchOptions& options,
                                              std::function<void(Visits)> handler) {
    queue_.async([this, options, handler = std::move(handler)] { handler(visits(options)); });
}

void IndexedRoutineService::fetchLocationsOfInterestVisitedBetween(
    KSDate start, KSDate end, std::function<void(Locations)> handler) {
    queue_.async(
        [this, start, end, handler = std::move(handler)] { handler(locations(start, end)); });
}

void IndexedRoutineService::fetchRoutineModeFromLocation(GeoPoint location,
                                                         std::function<void(Mode)> handler) {
    queue_.async([this, location, handler = std::move(handler)] { handler(mode(location)); });
}

RoutineService::Visits IndexedRoutineService::visits(const VisitFetchOptions& options) const {
    std::vector<RoutineVisit> found;
    const auto answered = index_.ask([this, &found, &options](SQLite::Database& index) {
        // Negative: no limit.
        const auto limit = options.limit
                               ? static_cast<std::int64_t>(std::min<std::uint64_t>(
                                     *options.limit, std::numeric_limits<std::int64_t>::max()))
                               : -1;
        SQLite::Statement query(
            index, fmt::format("SELECT visits.start, visits.end, visits.recorded, visits.isOpen,"
                               " visits.latitude, visits.longitude, places.name, visits.name,"
                               " places.mapName, places.use, places.identifier"
                               " FROM visits LEFT JOIN places ON places.id = visits.place"
                               " WHERE visits.end >= ? AND visits.start <= ?"
                               " AND visits.confidence >= ?"
                               " ORDER BY visits.start {0}, visits.end {0} LIMIT ?",
                               options.ascending ? "ASC" : "DESC"));
        query.bind(1, options.interval.start.seconds);
        query.bind(2, options.interval.end.seconds);
        query.bind(3, options.minimumConfidence);
        query.bind(4, limit);
        while (query.executeStep()) {
            auto& visit = found.emplace_back();
            visit.entry = KSDate{query.getColumn(0).getDouble()};
            const KSDate last{query.getColumn(1).getDouble()};
            const bool isOpen =
                query.getColumn(3).getInt() != 0 && clock_.now() - last <= kVisitGivenUpAfter;
            if (!isOpen) visit.exit = last;
            visit.type = isOpen ? kVisitArrival : kVisitWhole;
            visit.date = {query.getColumn(2).getDouble()};
            visit.location = pointAt(query, 4);
            if (options.labelVisitsWithPlaceInferences) {
                visit.placeInference = inferenceOf(query, 6);
            }
        }
    });
    if (!answered) return std::unexpected(answered.error());
    return found;
}

RoutineService::Locations IndexedRoutineService::locations(KSDate start, KSDate end) const {
    std::vector<LocationOfInterest> found;
    const auto answered = index_.ask([&found, start, end](SQLite::Database& index) {
        SQLite::Statement query(index,
                                "SELECT place, start, end, latitude, longitude FROM visits"
                                " WHERE place IS NOT NULL AND start BETWEEN ? AND ?"
                                " ORDER BY place, start");
        SQLite::Statement identifier(index, "SELECT identifier FROM places WHERE id = ?");
        query.bind(1, start.seconds);
        query.bind(2, end.seconds);
        std::optional<std::int64_t> place;
        while (query.executeStep()) {
            if (place != query.getColumn(0).getInt64()) {
                place = query.getColumn(0).getInt64();
                identifier.reset();
                identifier.bind(1, *place);
                const bool isThere = identifier.executeStep();
                const auto text = isThere ? identifier.getColumn(0).getString() : std::string();
                found.push_back(
                    {.identifier = KSUUID::parse(text).value_or(KSUUID()), .visits = {}});
            }
            found.back().visits.push_back({.location = pointAt(query, 3),
                                           .entryDate = KSDate{query.getColumn(1).getDouble()},
                                           .exitDate = KSDate{query.getColumn(2).getDouble()}});
        }
    });
    if (!answered) return std::unexpected(answered.error());
    return found;
}

RoutineService::Mode IndexedRoutineService::mode(GeoPoint location) const {
    constexpr std::uint64_t kUnknown = 0;
    constexpr std::uint64_t kLocal = 1;
    constexpr std::uint64_t kTourist = 2;
    auto least = std::numeric_limits<double>::infinity();
    const auto answered = index_.ask([&least, location](SQLite::Database& index) {
        // A home that the owner marks counts before he or she was ever recorded there.
        SQLite::Statement query(index,
                                "SELECT latitude, longitude FROM places WHERE use = ?1"
                                " UNION ALL SELECT latitude, longitude FROM namedPlaces"
                                " WHERE use = ?1 AND origin = 0");
        query.bind(1, static_cast<std::int64_t>(kUserTypeHome));
        while (query.executeStep()) {
            least = std::min(least, distanceBetween(location, pointAt(query, 0)));
        }
    });
    if (!answered) return std::unexpected(answered.error());
    if (least == std::numeric_limits<double>::infinity()) return kUnknown;
    return least <= kLocalRadius ? kLocal : kTourist;
}

}  // namespace keepsakes
