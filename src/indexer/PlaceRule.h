// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "readers/LocationRecords.h"

namespace keepsakes {

// Which visits are at one place, and what the owner uses it for. Pure functions of the visits, but
// for the owner's zone, which says when night is.

/// Visits to a place lie within so many metres of the mean of those before.
inline constexpr double kPlaceRadius = 100;

// Home and work are told from the newest weeks, by days in the owner's zone: a day counts for the
// place where the owner spent enough of its night, or of its working hours. There must be enough
// such days, and more of them than of all other places together (for work: than home).
inline constexpr double kEvidenceSpan = 56 * 86400.0;
inline constexpr int kNightStart = 0;  ///< Hours of the day.
inline constexpr int kNightEnd = 6;
inline constexpr int kWorkStart = 9;  ///< Monday to Friday.
inline constexpr int kWorkEnd = 17;
inline constexpr double kEnoughOfDay = 3 * 3600.0;
inline constexpr int kEnoughDays = 5;

/// What the rules look at of a visit.
struct PlaceVisit {
    KSDateInterval stay;
    GeoPoint position;
    /// The place that it was part of until now; a smaller number is an older place.
    std::optional<std::int64_t> before;
};

struct Place {
    GeoPoint center;                     ///< The mean of its visits.
    std::vector<std::uint32_t> members;  ///< Indexes into the visits, by time, at least one.
};

/// The places, by their first visit, of visits by their start. Each visit joins the nearest place
/// within reach, or begins one.
std::vector<Place> formPlaces(std::span<const PlaceVisit> visits);

/// For each place the former one that it continues, if any. A former place goes on where most of
/// its visits are now; where several go on in one, the one with most visits gives the name.
std::vector<std::optional<std::int64_t>> continuedPlaces(std::span<const PlaceVisit> visits,
                                                         std::span<const Place> places);

struct UsedPlaces {
    std::optional<std::uint32_t> home;  ///< Index into the places.
    std::optional<std::uint32_t> work;
};

/// Nothing where the evidence is not enough.
UsedPlaces usedPlaces(std::span<const PlaceVisit> visits, std::span<const Place> places);

}  // namespace keepsakes
