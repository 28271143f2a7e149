// SPDX-License-Identifier: Apache-2.0
#include "indexer/TripRule.h"

#include <fmt/format.h>

#include <algorithm>
#include <tuple>

#include "core/Calendar.h"
#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

constexpr std::size_t kMostTowns = 3;

bool isStay(const JourneyLeg& leg) { return leg.category == SuggestionCategory::lodging; }

bool isWay(const JourneyLeg& leg) {
    using enum SuggestionCategory;
    return leg.category == flight || leg.category == train || leg.category == bus ||
           leg.category == boat;
}

bool isSameTown(const std::string& one, const std::string& other) {
    return !one.empty() && foldWord(one) == foldWord(other);
}

/// Legs that may become a trip, in order.
class Journey {
  public:
    explicit Journey(JourneyLeg first) { add(std::move(first)); }

    bool takes(const JourneyLeg& leg) const {
        if (isHome_) return false;
        const double pause = leg.span.start - end_;
        if (pause <= kLongestPause) return true;
        if (pause > kLongestStayAway || !isWay(leg)) return false;
        return isSameTown(leg.origin, place_) || isSameTown(leg.destination, origin());
    }

    void add(JourneyLeg leg) {
        if (legs_.empty() || leg.span.end > end_) end_ = leg.span.end;
        if (isWay(leg)) {
            // A way that begins away from home leads on; one that leads there ends the journey.
            isHome_ = !legs_.empty() && isSameTown(leg.destination, origin());
            place_ = leg.destination;
        }
        legs_.push_back(std::move(leg));
    }

    bool isTrip() const {
        if (legs_.size() < 2) return false;
        const auto start = legs_.front().span.start;
        return std::ranges::any_of(legs_, isStay) || isHome_ ||
               calendar::startOfDay(start) != calendar::startOfDay(legs_.back().span.start);
    }

    Trip trip() const {
        Trip trip{.startDate = legs_.front().span.start,
                  .endDate = end_,
                  .title = std::nullopt,
                  .tripParts = {}};
        const JourneyLeg* last = nullptr;
        for (const auto& leg : legs_) {
            const bool goesOn = last && isWay(*last) && isWay(leg) &&
                                leg.span.start - last->span.end <= kLongestChange &&
                                !isSameTown(leg.destination, origin());
            if (!goesOn) trip.tripParts.emplace_back();
            auto& part = trip.tripParts.back();
            part.eventIdentifiers.push_back(leg.identifier);
            if (!leg.destination.empty()) part.placemark = leg.destination;
            last = &leg;
        }
        trip.title = title(trip);
        return trip;
    }

  private:
    const std::string& origin() const { return legs_.front().origin; }

    void addTown(std::vector<std::string>& towns, const std::string& town) const {
        const bool isKnown = town.empty() || isSameTown(town, origin()) ||
                             std::ranges::any_of(towns, [&town](const auto& other) {
                                 return isSameTown(town, other);
                             });
        if (!isKnown) towns.push_back(town);
    }

    std::string title(const Trip& trip) const {
        std::vector<std::string> places;
        for (const auto& leg : legs_) {
            if (isStay(leg)) addTown(places, leg.destination);
        }
        // Where a part leads, not where one changed on the way.
        if (places.empty()) {
            for (const auto& part : trip.tripParts) addTown(places, part.placemark.value_or(""));
        }
        std::string text;
        const auto named = std::min(places.size(), kMostTowns);
        for (std::size_t i = 0; i < named; ++i) {
            const bool isLast = i + 1 == places.size();
            text += (i == 0 ? "" : isLast ? " and " : ", ") + places[i];
        }
        if (places.size() > named) text += " and elsewhere";
        return (text.empty() ? "Away" : text) + ", " + days(trip);
    }

    /// "3 May", "3 to 7 May", "28 April to 2 May", "30 December 2023 to 2 January 2024".
    static std::string days(const Trip& trip) {
        // A stay of whole days ends at the midnight after them.
        const auto end = trip.endDate > trip.startDate ? trip.endDate - 1 : trip.endDate;
        const auto of = [](KSDate date, std::string_view pattern) {
            return calendar::format(date, pattern);
        };
        auto last = of(end, "d MMMM");
        if (of(trip.startDate, "yyyy") != of(end, "yyyy")) {
            return of(trip.startDate, "d MMMM yyyy") + " to " + of(end, "d MMMM yyyy");
        }
        if (of(trip.startDate, "d MMMM") == last) return last;
        const bool isSameMonth = of(trip.startDate, "MMMM") == of(end, "MMMM");
        return of(trip.startDate, isSameMonth ? "d" : "d MMMM") + " to " + last;
    }

    std::vector<JourneyLeg> legs_;
    KSDate end_;
    std::string place_;  ///< Where the last way led.
    bool isHome_ = false;
};

}  // namespace

std::vector<Trip> tripsOf(std::vector<JourneyLeg> legs) {
    std::ranges::sort(legs, [](const JourneyLeg& a, const JourneyLeg& b) {
        return std::tie(a.span.start, a.span.end, a.identifier) <
               std::tie(b.span.start, b.span.end, b.identifier);
    });
    std::vector<Trip> trips;
    std::optional<Journey> journey;
    const auto finish = [&trips, &journey] {
        if (journey && journey->isTrip()) trips.push_back(journey->trip());
        journey.reset();
    };
    for (auto& leg : legs) {
        if (journey && journey->takes(leg)) {
            journey->add(std::move(leg));
            continue;
        }
        finish();
        journey.emplace(std::move(leg));
    }
    finish();
    return trips;
}

}  // namespace keepsakes
