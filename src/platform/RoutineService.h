// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <expected>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "core/KSDate.h"
#include "core/KSError.h"
#include "core/KSUUID.h"
#include "platform/GeoPoint.h"

namespace keepsakes {

/// Codes of `RoutineVisit::type`: what of the visit is known.
inline constexpr std::uint64_t kVisitArrival = 1;    ///< The owner is still there, or may be.
inline constexpr std::uint64_t kVisitDeparture = 2;  ///< When the owner came is not known.
inline constexpr std::uint64_t kVisitWhole = 3;

/// Codes of `PlaceInference::userType`: what the place is to the owner.
inline constexpr std::uint64_t kUserTypeUnknown = 0;
inline constexpr std::uint64_t kUserTypeHome = 1;
inline constexpr std::uint64_t kUserTypeWork = 2;

/// A place of a map.
struct MapItem {
    std::optional<std::string> name;

    friend bool operator==(const MapItem&, const MapItem&) = default;
};

/// What the service makes of the place of a visit.
struct PlaceInference {
    std::optional<std::string> preferredName;  ///< What the owner calls it.
    std::optional<MapItem> mapItem;
    std::uint64_t userType = kUserTypeUnknown;
    std::optional<KSUUID> loiIdentifier;  ///< Of the location of interest that it is.

    friend bool operator==(const PlaceInference&, const PlaceInference&) = default;
};

/// A stay at a place.
struct RoutineVisit {
    std::optional<KSDate> entry;
    std::optional<KSDate> exit;
    KSDate date;  ///< When the service recorded it.
    std::uint64_t type = kVisitWhole;
    std::optional<GeoPoint> location;
    std::optional<PlaceInference> placeInference;

    friend bool operator==(const RoutineVisit&, const RoutineVisit&) = default;
};

/// One stay at a location of interest.
struct LocationOfInterestVisit {
    std::optional<GeoPoint> location;
    std::optional<KSDate> entryDate;
    std::optional<KSDate> exitDate;

    friend bool operator==(const LocationOfInterestVisit&,
                           const LocationOfInterestVisit&) = default;
};

/// A place that the owner has been to, with the stays there, oldest first.
struct LocationOfInterest {
    KSUUID identifier;
    std::vector<LocationOfInterestVisit> visits;

    friend bool operator==(const LocationOfInterest&, const LocationOfInterest&) = default;
};

/// The routine service's levels of confidence, of 0 to 1: a visit at the high one happened.
inline constexpr double kHighConfidence = 0.5;

/// Which stored visits are asked for.
struct VisitFetchOptions {
    bool ascending = true;  ///< By the date of entry.
    double minimumConfidence = kHighConfidence;
    KSDateInterval interval;  ///< Visits that overlap it; touching counts.
    bool labelVisitsWithPlaceInferences = true;
    std::optional<std::uint64_t> limit;
};

/// The routine service: where the owner stays. Any thread may call it. Each handler is called once,
/// on a thread of the service's own; a failed question changes nothing.
class RoutineService {
  public:
    using Visits = std::expected<std::vector<RoutineVisit>, KSError>;
    using Locations = std::expected<std::vector<LocationOfInterest>, KSError>;
    using Mode = std::expected<std::uint64_t, KSError>;

    virtual ~RoutineService() = default;

    virtual void fetchStoredVisits(const VisitFetchOptions& options,
                                   std::function<void(Visits)> handler) = 0;

    /// The locations entered between the two dates, each with those of its visits.
    virtual void fetchLocationsOfInterestVisitedBetween(KSDate start, KSDate end,
                                                        std::function<void(Locations)> handler) = 0;

    /// 0 unknown, 1 local, 2 tourist.
    virtual void fetchRoutineModeFromLocation(GeoPoint location,
                                              std::function<void(Mode)> handler) = 0;
};

}  // namespace keepsakes
