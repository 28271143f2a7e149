// SPDX-License-Identifier: Apache-2.0
#include "indexer/PlaceUpdate.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <map>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "indexer/GazetteerUpdate.h"
#include "indexer/OccasionRule.h"
#include "indexer/PlaceRule.h"
#include "platform/GeoPoint.h"
#include "platform/RoutineService.h"

namespace keepsakes {

namespace {

/// Beside each visit of the rules, its row and what a file says of it.
struct VisitWords {
    std::int64_t id;
    std::string name;
    PlaceUse use;
};

/// What is written of a place beside its identifier.
struct PlaceRow {
    GeoPoint center;
    std::string name;
    std::string mapName;
    PlaceUse use = PlaceUse::unknown;

    friend bool operator==(const PlaceRow&, const PlaceRow&) = default;
};

struct StoredPlace {
    std::string identifier;
    PlaceRow row;
};

PlaceUse useOf(int number) {
    return number == static_cast<int>(PlaceUse::home)   ? PlaceUse::home
           : number == static_cast<int>(PlaceUse::work) ? PlaceUse::work
                                                        : PlaceUse::unknown;
}

/// The places with a name, found by where they are.
class NameMap {
  public:
    explicit NameMap(SQLite::Database& database) {
        SQLite::Statement query(database,
                                "SELECT latitude, longitude, name, use, origin FROM namedPlaces"
                                " ORDER BY latitude, longitude, name");
        while (query.executeStep()) {
            places_.push_back(
                {.position = {query.getColumn(0).getDouble(), query.getColumn(1).getDouble()},
                 .name = query.getColumn(2).getString(),
                 .use = useOf(query.getColumn(3).getInt()),
                 .origin = static_cast<NamedPlace::Origin>(query.getColumn(4).getInt())});
        }
    }

    /// The nearest of those that satisfy the condition.
    template <class Condition>
    const NamedPlace* nearest(const GeoPoint& center, const Condition& condition) const {
        const NamedPlace* found = nullptr;
        double least = kNameRadius;
        const double reach = kNameRadius / kMetresPerDegree * 1.01;
        const auto latitude = [](const NamedPlace& place) { return place.position.latitude; };
        auto place = std::ranges::lower_bound(places_, center.latitude - reach, {}, latitude);
        for (; place != places_.end() && latitude(*place) <= center.latitude + reach; ++place) {
            const double metres = distanceBetween(center, place->position);
            if (metres > least || (found && metres == least) || !condition(*place)) continue;
            least = metres;
            found = &*place;
        }
        return found;
    }

    bool ownerMarks(PlaceUse use) const {
        return std::ranges::any_of(places_, [use](const NamedPlace& place) {
            return place.origin == NamedPlace::Origin::owner && place.use == use;
        });
    }

  private:
    std::vector<NamedPlace> places_;
};

class PlaceUpdate {
  public:
    explicit PlaceUpdate(SQLite::Database& database) : database_(database), names_(database) {}

    void run() {
        forgetDoubtfulVisits();
        loadVisits();
        loadPlaces();
        const auto places = formPlaces(visits_);
        const auto continued = continuedPlaces(visits_, places);
        auto rows = describe(places);
        tellUses(places, rows);
        removeOthers(continued);
        for (std::size_t i = 0; i < places.size(); ++i) put(places[i], rows[i], continued[i]);
    }

  private:
    void forgetDoubtfulVisits() {
        SQLite::Statement forget(database_, "UPDATE visits SET place = NULL WHERE confidence < ?");
        forget.bind(1, kHighConfidence);
        forget.exec();
    }

    void loadVisits() {
        SQLite::Statement query(database_,
                                "SELECT id, start, end, latitude, longitude, place, name, use"
                                " FROM visits WHERE confidence >= ? ORDER BY start, end, id");
        query.bind(1, kHighConfidence);
        while (query.executeStep()) {
            visits_.push_back(
                {.stay = {{query.getColumn(1).getDouble()}, {query.getColumn(2).getDouble()}},
                 .position = {query.getColumn(3).getDouble(), query.getColumn(4).getDouble()},
                 .before = query.isColumnNull(5) ? std::nullopt
                                                 : std::optional(query.getColumn(5).getInt64())});
            words_.push_back({.id = query.getColumn(0).getInt64(),
                              .name = query.getColumn(6).getString(),
                              .use = useOf(query.getColumn(7).getInt())});
        }
    }

    void loadPlaces() {
        SQLite::Statement query(
            database_,
            "SELECT id, identifier, latitude, longitude, name, mapName, use FROM places");
        while (query.executeStep()) {
            StoredPlace place{
                .identifier = query.getColumn(1).getString(),
                .row = {.center = {query.getColumn(2).getDouble(), query.getColumn(3).getDouble()},
                        .name = query.getColumn(4).getString(),
                        .mapName = query.getColumn(5).getString(),
                        .use = useOf(query.getColumn(6).getInt())}};
            identifiers_.insert(place.identifier);
            stored_.emplace(query.getColumn(0).getInt64(), std::move(place));
        }
        for (auto& visit : visits_) {
            if (visit.before && !stored_.contains(*visit.before)) visit.before.reset();
        }
    }

    /// The owner's name, then a contact's; else what files call most of the visits, then the town.
    std::vector<PlaceRow> describe(const std::vector<Place>& places) {
        std::vector<PlaceRow> rows;
        rows.reserve(places.size());
        TownFinder towns(database_);
        for (const auto& place : places) {
            auto& row = rows.emplace_back();
            row.center = place.center;
            for (const auto origin : {NamedPlace::Origin::owner, NamedPlace::Origin::contact}) {
                const auto* named = names_.nearest(
                    place.center, [origin](const auto& name) { return name.origin == origin; });
                if (named && row.name.empty()) row.name = named->name;
            }
            std::map<std::string, int> stated;
            for (const auto member : place.members) {
                if (!words_[member].name.empty()) ++stated[words_[member].name];
            }
            const auto usual = std::ranges::max_element(
                stated, {}, [](const auto& entry) { return entry.second; });
            if (usual != stated.end()) {
                row.mapName = usual->first;
            } else if (row.name.empty()) {
                row.mapName = towns.nearest(place.center, kTownRadius);
            }
        }
        return rows;
    }

    void tellUses(const std::vector<Place>& places, std::vector<PlaceRow>& rows) {
        const auto evidence = usedPlaces(visits_, places);
        tellUse(PlaceUse::home, evidence.home, places, rows);
        tellUse(PlaceUse::work, evidence.work, places, rows);
    }

    /// As the owner marks it; else as files label visits; else by the evidence.
    void tellUse(PlaceUse use, std::optional<std::uint32_t> evident,
                 const std::vector<Place>& places, std::vector<PlaceRow>& rows) {
        if (names_.ownerMarks(use)) {
            for (auto& row : rows) {
                const auto* mark = names_.nearest(row.center, [](const NamedPlace& name) {
                    return name.origin == NamedPlace::Origin::owner &&
                           name.use != PlaceUse::unknown;
                });
                if (mark && mark->use == use) row.use = use;
            }
            return;
        }
        bool isLabelled = false;
        for (std::size_t i = 0; i < places.size(); ++i) {
            const auto labels = std::ranges::count_if(
                places[i].members, [this, use](auto member) { return words_[member].use == use; });
            if (2 * static_cast<std::size_t>(labels) <= places[i].members.size()) continue;
            isLabelled = true;
            if (rows[i].use == PlaceUse::unknown) rows[i].use = use;
        }
        if (!isLabelled && evident && rows[*evident].use == PlaceUse::unknown) {
            rows[*evident].use = use;
        }
    }

    void removeOthers(const std::vector<std::optional<std::int64_t>>& continued) {
        const std::unordered_set<std::optional<std::int64_t>> kept(continued.begin(),
                                                                   continued.end());
        SQLite::Statement remove(database_, "DELETE FROM places WHERE id = ?");
        for (const auto& [id, place] : stored_) {
            if (kept.contains(id)) continue;
            remove.reset();
            remove.bind(1, id);
            remove.exec();
            identifiers_.erase(place.identifier);
        }
    }

    void put(const Place& place, const PlaceRow& row, std::optional<std::int64_t> continued) {
        if (continued) {
            const auto& former = stored_.at(*continued);
            if (former.row != row) write(change_, former.identifier, row, continued);
        } else {
            const auto identifier = newIdentifier(visits_[place.members.front()]);
            identifiers_.insert(identifier);
            write(insert_, identifier, row, std::nullopt);
            continued = database_.getLastInsertRowid();
        }
        for (const auto member : place.members) {
            if (visits_[member].before == continued) continue;
            assign_.reset();
            assign_.bind(1, *continued);
            assign_.bind(2, words_[member].id);
            assign_.exec();
        }
    }

    static void write(SQLite::Statement& statement, const std::string& identifier,
                      const PlaceRow& row, std::optional<std::int64_t> id) {
        statement.reset();
        statement.clearBindings();
        statement.bind(1, identifier);
        statement.bind(2, row.center.latitude);
        statement.bind(3, row.center.longitude);
        if (!row.name.empty()) statement.bind(4, row.name);
        if (!row.mapName.empty()) statement.bind(5, row.mapName);
        statement.bind(6, static_cast<int>(row.use));
        if (id) statement.bind(7, *id);
        statement.exec();
    }

    std::string newIdentifier(const PlaceVisit& first) const {
        const auto moment = std::llround(first.stay.start.seconds * 1e3);
        for (int attempt = 0;; ++attempt) {
            auto identifier =
                identifierOf("place\n" + std::to_string(moment) + "\n" + std::to_string(attempt))
                    .string();
            if (!identifiers_.contains(identifier)) return identifier;
        }
    }

    SQLite::Database& database_;
    const NameMap names_;
    SQLite::Statement assign_{database_, "UPDATE visits SET place = ? WHERE id = ?"};
    SQLite::Statement insert_{database_,
                              "INSERT INTO places(identifier, latitude, longitude, name, mapName,"
                              " use) VALUES(?, ?, ?, ?, ?, ?)"};
    SQLite::Statement change_{database_,
                              "UPDATE places SET identifier = ?, latitude = ?, longitude = ?,"
                              " name = ?, mapName = ?, use = ? WHERE id = ?"};
    std::vector<PlaceVisit> visits_;  // By start.
    std::vector<VisitWords> words_;   // Beside `visits_`.
    std::unordered_map<std::int64_t, StoredPlace> stored_;
    std::unordered_set<std::string> identifiers_;
};

}  // namespace

bool updatePlaces(IndexWriter& index) {
    if (index.meta(kMetaPlacesStale, 0) == 0) return false;
    index.setMeta(kMetaPlacesStale, 0);
    PlaceUpdate(index.database()).run();
    return true;
}

}  // namespace keepsakes
