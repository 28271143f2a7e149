// SPDX-License-Identifier: Apache-2.0
#include "indexer/PlaceRule.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <map>
#include <numbers>
#include <unordered_map>
#include <utility>

#include "core/Calendar.h"
#include "platform/GeoPoint.h"

namespace keepsakes {

namespace {

constexpr std::int64_t kDaysPerWeek = 7;
constexpr std::int64_t kWorkingDays = 5;

/// Finds places by their neighbourhood: cells a radius high, and at least as wide.
class PlaceGrid {
  public:
    void insert(const GeoPoint& center, std::uint32_t place) {
        cells_[cellOf(rowOf(center.latitude), center.longitude)].push_back(place);
    }

    void move(const GeoPoint& from, const GeoPoint& to, std::uint32_t place) {
        const auto before = cellOf(rowOf(from.latitude), from.longitude);
        const auto after = cellOf(rowOf(to.latitude), to.longitude);
        if (before == after) return;
        std::erase(cells_[before], place);
        cells_[after].push_back(place);
    }

    template <class Visit>
    void forEachNear(const GeoPoint& point, const Visit& visit) const {
        const auto row = rowOf(point.latitude);
        for (auto near = row - 1; near <= row + 1; ++near) {
            const auto middle = cellOf(near, point.longitude);
            for (auto column = middle.second - 1; column <= middle.second + 1; ++column) {
                const auto cell = cells_.find({near, column});
                if (cell == cells_.end()) continue;
                for (const auto place : cell->second) visit(place);
            }
        }
    }

  private:
    using Cell = std::pair<std::int64_t, std::int64_t>;
    static constexpr double kHeight = kPlaceRadius / kMetresPerDegree;  // degrees

    static std::int64_t rowOf(double latitude) {
        return static_cast<std::int64_t>(std::floor(latitude / kHeight));
    }
    static Cell cellOf(std::int64_t row, double longitude) {
        // The row's edge nearer to the pole decides: there a degree is shorter.
        const double edge = static_cast<double>(row < 0 ? row : row + 1) * kHeight;
        const double narrowing =
            std::max(1e-3, std::cos(std::min(std::abs(edge), 90.0) * std::numbers::pi / 180));
        return {row, static_cast<std::int64_t>(std::floor(longitude * narrowing / kHeight))};
    }

    std::map<Cell, std::vector<std::uint32_t>> cells_;
};

/// Days by the owner's clock, counted from Monday 2001-01-01.
std::int64_t localDayOf(KSDate time) {
    return static_cast<std::int64_t>(std::floor((time + calendar::offsetAt(time)).seconds / 86400));
}

KSDate localTime(std::int64_t day, int hour) {
    return calendar::fromLocal({static_cast<double>(day) * 86400 + hour * 3600.0});
}

double shared(const KSDateInterval& a, const KSDateInterval& b) {
    return std::min(a.end, b.end) - std::max(a.start, b.start);
}

/// Seconds at each place by day, within the hours of the day.
class DaysAtPlaces {
  public:
    DaysAtPlaces(int fromHour, int toHour) : fromHour_(fromHour), toHour_(toHour) {}

    void add(std::int64_t day, const KSDateInterval& stay, std::uint32_t place) {
        const double seconds = shared(stay, {localTime(day, fromHour_), localTime(day, toHour_)});
        if (seconds > 0) seconds_[{day, place}] += seconds;
    }

    /// The place that has enough days, and more than half of all, leaving one place out.
    std::optional<std::uint32_t> mostUsed(std::optional<std::uint32_t> except) const {
        std::map<std::uint32_t, int> days;
        int all = 0;
        for (const auto& [key, seconds] : seconds_) {
            if (seconds < kEnoughOfDay || key.second == except) continue;
            ++days[key.second];
            ++all;
        }
        const auto most =
            std::ranges::max_element(days, {}, [](const auto& entry) { return entry.second; });
        if (most == days.end() || most->second < kEnoughDays || 2 * most->second <= all) {
            return std::nullopt;
        }
        return most->first;
    }

  private:
    const int fromHour_;
    const int toHour_;
    std::map<std::pair<std::int64_t, std::uint32_t>, double> seconds_;
};

}  // namespace

std::vector<Place> formPlaces(std::span<const PlaceVisit> visits) {
    std::vector<Place> places;
    PlaceGrid grid;
    for (std::uint32_t i = 0; i < visits.size(); ++i) {
        const auto& position = visits[i].position;
        std::optional<std::uint32_t> nearest;
        double least = kPlaceRadius;
        grid.forEachNear(position, [&](std::uint32_t place) {
            const double metres = distanceBetween(position, places[place].center);
            if (metres < least || (metres == least && (!nearest || place < *nearest))) {
                least = metres;
                nearest = place;
            }
        });
        if (!nearest) {
            grid.insert(position, static_cast<std::uint32_t>(places.size()));
            places.push_back({.center = position, .members = {i}});
            continue;
        }
        auto& place = places[*nearest];
        place.members.push_back(i);
        const auto count = static_cast<double>(place.members.size());
        const auto before = place.center;
        place.center.latitude += (position.latitude - before.latitude) / count;
        place.center.longitude += (position.longitude - before.longitude) / count;
        grid.move(before, place.center, *nearest);
    }
    return places;
}

std::vector<std::optional<std::int64_t>> continuedPlaces(std::span<const PlaceVisit> visits,
                                                         std::span<const Place> places) {
    // By former place, the visits that each place has of it.
    std::map<std::int64_t, std::map<std::size_t, std::size_t>> shares;
    for (std::size_t i = 0; i < places.size(); ++i) {
        for (const auto member : places[i].members) {
            if (visits[member].before) ++shares[*visits[member].before][i];
        }
    }
    std::vector<std::optional<std::int64_t>> continued(places.size());
    std::vector<std::size_t> visitsTaken(places.size());
    for (const auto& [former, counts] : shares) {
        const auto heir =
            std::ranges::max_element(counts, {}, [](const auto& entry) { return entry.second; });
        if (heir->second <= visitsTaken[heir->first]) continue;
        visitsTaken[heir->first] = heir->second;
        continued[heir->first] = former;
    }
    return continued;
}

UsedPlaces usedPlaces(std::span<const PlaceVisit> visits, std::span<const Place> places) {
    auto newest = KSDate::distantPast();
    for (const auto& visit : visits) newest = std::max(newest, visit.stay.end);
    DaysAtPlaces nights(kNightStart, kNightEnd);
    DaysAtPlaces workingDays(kWorkStart, kWorkEnd);
    for (std::uint32_t place = 0; place < places.size(); ++place) {
        for (const auto member : places[place].members) {
            const auto& stay = visits[member].stay;
            if (stay.start < newest - kEvidenceSpan) continue;
            const auto last = localDayOf(stay.end);
            for (auto day = localDayOf(stay.start); day <= last; ++day) {
                nights.add(day, stay, place);
                const bool isWorkingDay = day % kDaysPerWeek < kWorkingDays;
                if (isWorkingDay) workingDays.add(day, stay, place);
            }
        }
    }
    UsedPlaces used;
    used.home = nights.mostUsed(std::nullopt);
    used.work = workingDays.mostUsed(used.home);
    return used;
}

}  // namespace keepsakes
