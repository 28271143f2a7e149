// SPDX-License-Identifier: Apache-2.0
#include "indexer/VisitUpdate.h"

#include <algorithm>
#include <map>
#include <set>
#include <string>
#include <tuple>
#include <vector>

#include "indexer/DayPoints.h"
#include "indexer/StayRule.h"
#include "platform/RoutineService.h"

namespace keepsakes {

namespace {

/// What the day before a changed one may still depend on: points of a stay that is not one yet, and
/// the neighbours by which jumps are told.
constexpr double kSafetyMargin = 3600;

/// How long before a visit one may have begun that it is compared with, in seconds.
constexpr double kLookBack = 7 * kDay;

struct VisitRow {
    KSDateInterval stay;
    GeoPoint position;
    double confidence = 0;
    bool isOpen = false;
    std::string name;
    int use = 0;

    friend bool operator==(const VisitRow&, const VisitRow&) = default;
};

VisitRow rowOf(const Stay& stay) {
    return {.stay = stay.span,
            .position = stay.center,
            .confidence = stay.confidence(),
            .isOpen = stay.isOpen,
            .name = {},
            .use = 0};
}

/// Of visits by their start: of two that share more than half of the shorter one (the same history
/// exported twice), the surer one is left, then the longer one.
std::vector<VisitRow> withoutRepetitions(const std::vector<VisitRow>& visits) {
    std::vector<VisitRow> kept;
    for (const auto& visit : visits) {
        if (!kept.empty()) {
            auto& last = kept.back();
            const double shared = std::min(last.stay.end, visit.stay.end) - visit.stay.start;
            const double shorter = std::min(last.stay.duration(), visit.stay.duration());
            if (shared > shorter / 2) {
                const auto rank = [](const VisitRow& row) {
                    return std::tuple(row.confidence, row.stay.duration());
                };
                if (rank(visit) > rank(last)) last = visit;
                continue;
            }
        }
        kept.push_back(visit);
    }
    return kept;
}

class VisitUpdate {
  public:
    VisitUpdate(IndexWriter& index, KSDate now, const std::function<void()>& alive)
        : index_(index), database_(index.database()), now_(now), alive_(alive) {}

    bool run() {
        loadStaleDays();
        if (stale_.empty()) return false;
        index_.setMeta(kMetaPlacesStale, 1);
        takeStatedVisits();
        while (next_ < stale_.size()) findStays();
        database_.exec("DELETE FROM staleDays");
        return true;
    }

  private:
    void loadStaleDays() {
        SQLite::Statement query(database_, "SELECT day FROM staleDays ORDER BY day");
        while (query.executeStep()) stale_.push_back(query.getColumn(0).getInt64());
    }

    void takeStatedVisits() {
        std::vector<VisitRow> stated;
        SQLite::Statement query(database_,
                                "SELECT start, end, latitude, longitude, confidence, name, use"
                                " FROM statedVisits ORDER BY start, end, confidence DESC, name");
        while (query.executeStep()) {
            stated.push_back(
                {.stay = {{query.getColumn(0).getDouble()}, {query.getColumn(1).getDouble()}},
                 .position = {query.getColumn(2).getDouble(), query.getColumn(3).getDouble()},
                 .confidence = query.getColumn(4).getDouble(),
                 .isOpen = false,
                 .name = query.getColumn(5).getString(),
                 .use = query.getColumn(6).getInt()});
        }
        const auto visits = withoutRepetitions(stated);
        for (const auto& visit : visits) {
            if (visit.confidence >= kHighConfidence) statedSpans_.push_back(visit.stay);
        }
        write(visits, true, {KSDate::distantPast(), KSDate::distantFuture()});
    }

    /// The stays of the next stale day and of what follows from it.
    void findStays() {
        auto last = stale_[next_++];
        const auto begin = beginBefore(startOfUtcDay(last));
        auto end = KSDate::distantFuture();
        bool isKnownOnwards = false;
        std::vector<VisitRow> found;
        StayDetector detector([&](const Stay& stay) {
            if (isKnownOnwards) return;
            const auto row = rowOf(stay);
            if (stay.span.start > startOfUtcDay(last + 1) + kSafetyMargin && isStored(row)) {
                isKnownOnwards = true;
                end = stay.span.start;
            } else {
                found.push_back(row);
            }
        });
        auto span = std::ranges::lower_bound(statedSpans_, begin, {}, &KSDateInterval::end);
        SQLite::Statement days(database_,
                               "SELECT DISTINCT day FROM points WHERE day >= ? ORDER BY day");
        days.bind(1, utcDayOf(begin));
        while (!isKnownOnwards && days.executeStep()) {
            const auto day = days.getColumn(0).getInt64();
            for (; next_ < stale_.size() && stale_[next_] <= day; ++next_) last = stale_[next_];
            alive_();
            for (const auto& point : pointsOf(day)) {
                if (point.time < begin) continue;
                for (; span != statedSpans_.end() && span->end < point.time; ++span) {
                    detector.interrupt();
                }
                const bool isStated = span != statedSpans_.end() && span->start <= point.time;
                if (!isStated) detector.add(point);
            }
        }
        if (!isKnownOnwards) {
            // Days without points are left.
            next_ = stale_.size();
            detector.finish();
        }
        write(found, false, {begin, end});
    }

    /// Where the stays of a changed day begin to be looked for.
    KSDate beginBefore(KSDate changed) {
        const auto latest = changed - kSafetyMargin;
        const auto earliest = latest - kLongestSilence;
        SQLite::Statement query(database_,
                                "SELECT start, end FROM visits WHERE NOT isStated AND start < ?"
                                " ORDER BY start DESC LIMIT 1");
        query.bind(1, latest.seconds);
        if (!query.executeStep() || query.getColumn(1).getDouble() < earliest.seconds) {
            return earliest;
        }
        return {query.getColumn(0).getDouble()};
    }

    std::vector<TrackPoint> pointsOf(std::int64_t day) {
        DayPoints points;
        points_.reset();
        points_.bind(1, day);
        while (points_.executeStep()) {
            const auto data = points_.getColumn(0);
            decodePoints(day,
                         {static_cast<const char*>(data.getBlob()),
                          static_cast<std::size_t>(data.getBytes())},
                         points);
        }
        return points.take();
    }

    struct Stored {
        std::int64_t id;
        VisitRow row;
        std::optional<std::int64_t> place;
    };

    std::vector<Stored> stored(bool isStated, KSDateInterval starts) {
        std::vector<Stored> rows;
        SQLite::Statement query(database_,
                                "SELECT id, start, end, latitude, longitude, confidence, isOpen,"
                                " name, use, place FROM visits"
                                " WHERE isStated = ? AND start >= ? AND start < ?");
        query.bind(1, isStated ? 1 : 0);
        query.bind(2, starts.start.seconds);
        query.bind(3, starts.end.seconds);
        while (query.executeStep()) {
            rows.push_back({.id = query.getColumn(0).getInt64(),
                            .row = {.stay = {{query.getColumn(1).getDouble()},
                                             {query.getColumn(2).getDouble()}},
                                    .position = {query.getColumn(3).getDouble(),
                                                 query.getColumn(4).getDouble()},
                                    .confidence = query.getColumn(5).getDouble(),
                                    .isOpen = query.getColumn(6).getInt() != 0,
                                    .name = query.getColumn(7).getString(),
                                    .use = query.getColumn(8).getInt()},
                            .place = query.isColumnNull(9)
                                         ? std::nullopt
                                         : std::optional(query.getColumn(9).getInt64())});
        }
        return rows;
    }

    bool isStored(const VisitRow& row) {
        const auto same = stored(false, {row.stay.start, row.stay.start + 1e-3});
        return std::ranges::any_of(same, [&row](const Stored& known) { return known.row == row; });
    }

    /// Replaces the rows that start in the span by `visits`.
    void write(const std::vector<VisitRow>& visits, bool isStated, KSDateInterval starts) {
        std::multimap<double, Stored> former;
        for (auto& row : stored(isStated, starts)) {
            former.emplace(row.row.stay.start.seconds, std::move(row));
        }
        std::vector<std::pair<const VisitRow*, std::optional<std::int64_t>>> fresh;
        for (const auto& visit : visits) {
            const auto [first, last] = former.equal_range(visit.stay.start.seconds);
            const auto same = std::find_if(
                first, last, [&visit](const auto& entry) { return entry.second.row == visit; });
            if (same != last) {
                former.erase(same);
            } else {
                fresh.emplace_back(&visit, std::nullopt);
            }
        }
        for (auto& [visit, place] : fresh) {
            // What shares time and place with a former visit is that one, longer or shorter.
            const auto end = former.upper_bound(visit->stay.end.seconds);
            auto row = former.lower_bound(visit->stay.start.seconds - kLookBack);
            for (; row != end && !place; ++row) {
                const auto& [known, knownPlace] = std::tie(row->second.row, row->second.place);
                const bool isSame = visit->stay.start <= known.stay.end &&
                                    distanceBetween(known.position, visit->position) <= kStayRadius;
                if (isSame) place = knownPlace;
            }
        }
        for (const auto& [start, row] : former) remove(row.id);
        for (const auto& [visit, place] : fresh) insert(*visit, isStated, place);
    }

    void remove(std::int64_t id) {
        remove_.reset();
        remove_.bind(1, id);
        remove_.exec();
    }

    void insert(const VisitRow& visit, bool isStated, std::optional<std::int64_t> place) {
        insert_.reset();
        insert_.clearBindings();
        insert_.bind(1, visit.stay.start.seconds);
        insert_.bind(2, visit.stay.end.seconds);
        insert_.bind(3, visit.position.latitude);
        insert_.bind(4, visit.position.longitude);
        insert_.bind(5, visit.confidence);
        insert_.bind(6, visit.isOpen ? 1 : 0);
        insert_.bind(7, isStated ? 1 : 0);
        if (!visit.name.empty()) insert_.bind(8, visit.name);
        insert_.bind(9, visit.use);
        insert_.bind(10, now_.seconds);
        if (place) insert_.bind(11, *place);
        insert_.exec();
    }

    IndexWriter& index_;
    SQLite::Database& database_;
    const KSDate now_;
    const std::function<void()>& alive_;
    SQLite::Statement points_{database_, "SELECT data FROM points WHERE day = ?"};
    SQLite::Statement remove_{database_, "DELETE FROM visits WHERE id = ?"};
    SQLite::Statement insert_{database_,
                              "INSERT INTO visits(start, end, latitude, longitude, confidence,"
                              " isOpen, isStated, name, use, recorded, place)"
                              " VALUES(?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)"};
    std::vector<std::int64_t> stale_;
    std::size_t next_ = 0;                     // Into `stale_`: the first day not yet looked at.
    std::vector<KSDateInterval> statedSpans_;  // By time; points in them find nothing.
};

}  // namespace

bool updateVisits(IndexWriter& index, KSDate now, const std::function<void()>& alive) {
    return VisitUpdate(index, now, alive).run();
}

}  // namespace keepsakes
