// SPDX-License-Identifier: Apache-2.0
#include "indexer/OccasionUpdate.h"

#include <algorithm>
#include <cmath>
#include <map>
#include <tuple>
#include <unordered_map>
#include <unordered_set>

#include "core/Json.h"
#include "indexer/OccasionRule.h"
#include "indexer/PhotoText.h"

namespace keepsakes {

namespace {

/// Beside each photo of the rule, what identifies it and what it says.
struct PhotoRow {
    std::int64_t file;
    std::int64_t number;
    std::string words;
};

struct StoredOccasion {
    std::string identifier;
    double start = 0;
    double end = 0;
    std::int64_t photos = 0;
    std::string content;

    friend bool operator==(const StoredOccasion&, const StoredOccasion&) = default;
};

TrackZones loadZones(SQLite::Database& database) {
    std::vector<ZoneSpan> spans;
    SQLite::Statement query(database, "SELECT start, end, offset FROM zones");
    while (query.executeStep()) {
        spans.push_back(
            {.span = {{query.getColumn(0).getDouble()}, {query.getColumn(1).getDouble()}},
             .offsetSeconds = query.getColumn(2).getInt()});
    }
    return TrackZones(std::move(spans));
}

/// The former occasions and the new ones, and all that is written of the difference.
class OccasionUpdate {
  public:
    explicit OccasionUpdate(SQLite::Database& database) : database_(database) {}

    void run() {
        loadPhotos();
        loadOccasions();
        const auto occasions = formOccasions(photos_);
        const auto continued = continuedOccasions(photos_, occasions);
        std::unordered_set<std::int64_t> kept;
        for (const auto& id : continued) {
            if (id) kept.insert(*id);
        }
        removeOthers(kept);
        for (std::size_t i = 0; i < occasions.size(); ++i) {
            put(occasions[i], continued[i]);
        }
    }

  private:
    void loadPhotos() {
        const auto zones = loadZones(database_);
        SQLite::Statement query(database_,
                                "SELECT taken, timeSource, localTime, latitude, longitude,"
                                " occasion, file, number, words FROM photos");
        while (query.executeStep()) {
            OccasionPhoto photo{.taken = {query.getColumn(0).getDouble()},
                                .position = std::nullopt,
                                .before = std::nullopt};
            if (static_cast<TimeSource>(query.getColumn(1).getInt()) == TimeSource::ownerZone) {
                const KSDate local{query.getColumn(2).getDouble()};
                if (const auto offset = zones.offsetAt(local)) photo.taken = local - *offset;
            }
            if (!query.isColumnNull(3) && !query.isColumnNull(4)) {
                photo.position = GeoPoint{.latitude = query.getColumn(3).getDouble(),
                                          .longitude = query.getColumn(4).getDouble()};
            }
            if (!query.isColumnNull(5)) photo.before = query.getColumn(5).getInt64();
            photos_.push_back(photo);
            rows_.push_back({.file = query.getColumn(6).getInt64(),
                             .number = query.getColumn(7).getInt64(),
                             .words = query.getColumn(8).getString()});
        }
    }

    void loadOccasions() {
        SQLite::Statement query(
            database_, "SELECT id, identifier, start, end, photos, content FROM occasions");
        while (query.executeStep()) {
            StoredOccasion occasion{.identifier = query.getColumn(1).getString(),
                                    .start = query.getColumn(2).getDouble(),
                                    .end = query.getColumn(3).getDouble(),
                                    .photos = query.getColumn(4).getInt64(),
                                    .content = query.getColumn(5).getString()};
            identifiers_.insert(occasion.identifier);
            stored_.emplace(query.getColumn(0).getInt64(), std::move(occasion));
        }
        // A former occasion that is no longer stored cannot go on.
        for (auto& photo : photos_) {
            if (photo.before && !stored_.contains(*photo.before)) photo.before.reset();
        }
    }

    void removeOthers(const std::unordered_set<std::int64_t>& kept) {
        SQLite::Statement remove(database_, "DELETE FROM occasions WHERE id = ?");
        for (const auto& [id, occasion] : stored_) {
            if (kept.contains(id)) continue;
            remove.reset();
            remove.bind(1, id);
            remove.exec();
            identifiers_.erase(occasion.identifier);
        }
    }

    void put(const OccasionMembers& members, std::optional<std::int64_t> continued) {
        auto occasion = describe(members);
        if (continued) {
            const auto& former = stored_.at(*continued);
            occasion.identifier = former.identifier;
            if (occasion != former) write(occasion, continued);
        } else {
            occasion.identifier = newIdentifier(members.front());
            identifiers_.insert(occasion.identifier);
            write(occasion, std::nullopt);
            continued = database_.getLastInsertRowid();
        }
        for (const auto member : members) {
            if (photos_[member].before == continued) continue;
            assign_.reset();
            assign_.bind(1, *continued);
            assign_.bind(2, rows_[member].file);
            assign_.bind(3, rows_[member].number);
            assign_.exec();
        }
    }

    StoredOccasion describe(const OccasionMembers& members) const {
        // The same second and place: one moment, whose words are those of all its copies.
        std::map<std::tuple<double, double, double>, OccasionWords> moments;
        for (const auto member : members) {
            const auto& photo = photos_[member];
            const auto place = photo.position.value_or(GeoPoint{.latitude = 1000, .longitude = 0});
            auto& words =
                moments[{std::floor(photo.taken.seconds), place.latitude, place.longitude}];
            if (!rows_[member].words.empty()) merge(words, parseWords(rows_[member].words));
        }
        std::vector<OccasionWords> said;
        said.reserve(moments.size());
        for (auto& [moment, words] : moments) said.push_back(std::move(words));
        return {.identifier = {},
                .start = photos_[members.front()].taken.seconds - kOccasionMargin,
                .end = photos_[members.back()].taken.seconds + kOccasionMargin,
                .photos = static_cast<std::int64_t>(moments.size()),
                .content = jsonText(KSValue(occasionContent(said))).value_or("{}")};
    }

    template <class T>
    static void mergeDistinct(std::vector<T>& into, std::vector<T> from) {
        for (auto& value : from) {
            if (std::ranges::find(into, value) == into.end()) into.push_back(std::move(value));
        }
    }

    static void merge(OccasionWords& into, OccasionWords&& from) {
        mergeDistinct(into.inferences, std::move(from.inferences));
        mergeDistinct(into.persons, std::move(from.persons));
        mergeDistinct(into.holidays, std::move(from.holidays));
        mergeDistinct(into.publicEvents, std::move(from.publicEvents));
    }

    void write(const StoredOccasion& occasion, std::optional<std::int64_t> id) {
        auto& statement = id ? change_ : insert_;
        statement.reset();
        statement.bind(1, occasion.identifier);
        statement.bind(2, occasion.start);
        statement.bind(3, occasion.end);
        statement.bind(4, occasion.photos);
        statement.bind(5, occasion.content);
        if (id) statement.bind(6, *id);
        statement.exec();
    }

    /// From the content of the first photo's file. Copies of one file may begin occasions that were
    /// parted since: where it is taken, the file's number in the index makes another.
    std::string newIdentifier(std::uint32_t first) {
        hash_.reset();
        hash_.bind(1, rows_[first].file);
        const std::string hash = hash_.executeStep() ? hash_.getColumn(0).getString() : "";
        for (int attempt = 0;; ++attempt) {
            auto identifier = identifierOf("occasion\n" + hash + "\n" +
                                           std::to_string(rows_[first].number) + "\n" +
                                           (attempt == 0 ? std::string()
                                                         : std::to_string(rows_[first].file) +
                                                               "\n" + std::to_string(attempt)))
                                  .string();
            if (!identifiers_.contains(identifier)) return identifier;
        }
    }

    SQLite::Database& database_;
    SQLite::Statement assign_{database_,
                              "UPDATE photos SET occasion = ? WHERE file = ? AND number = ?"};
    SQLite::Statement insert_{database_,
                              "INSERT INTO occasions(identifier, start, end, photos, content)"
                              " VALUES(?, ?, ?, ?, ?)"};
    SQLite::Statement change_{database_,
                              "UPDATE occasions SET identifier = ?, start = ?, end = ?,"
                              " photos = ?, content = ? WHERE id = ?"};
    SQLite::Statement hash_{database_, "SELECT hash FROM files WHERE id = ?"};
    std::vector<OccasionPhoto> photos_;
    std::vector<PhotoRow> rows_;  // Beside `photos_`.
    std::unordered_map<std::int64_t, StoredOccasion> stored_;
    std::unordered_set<std::string> identifiers_;
};

}  // namespace

void updateOccasions(IndexWriter& index) {
    OccasionUpdate(index.database()).run();
    index.setMeta(kMetaOccasionsStale, 0);
}

}  // namespace keepsakes
