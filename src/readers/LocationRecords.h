// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <limits>
#include <optional>
#include <string>

#include "core/KSDate.h"
#include "readers/FileRecords.h"

namespace keepsakes {

/// One moment of a location history.
struct TrackPoint {
    KSDate time;
    GeoPoint position;
    /// Radius that holds the true position, in metres; NaN when the file does not say.
    float accuracyMeters = std::numeric_limits<float>::quiet_NaN();

    friend bool operator==(const TrackPoint&, const TrackPoint&) = default;
};

/// What the owner uses a place for.
enum class PlaceUse : std::uint8_t { unknown, home, work };

/// A stay that a file states itself.
struct StatedVisit {
    KSDateInterval stay;
    GeoPoint position;
    std::string name;                  ///< Empty when the file has none.
    PlaceUse use = PlaceUse::unknown;  ///< As the file labels it.
    double confidence = 1;             ///< 0 to 1.

    friend bool operator==(const StatedVisit&, const StatedVisit&) = default;
};

/// A place that the owner named: a waypoint, a point of a GeoJSON file, a contact's address.
struct NamedPlace {
    /// Best first, when several are near.
    enum class Origin : std::uint8_t { owner, contact };

    GeoPoint position;
    std::string name;
    PlaceUse use = PlaceUse::unknown;
    Origin origin = Origin::owner;

    friend bool operator==(const NamedPlace&, const NamedPlace&) = default;
};

/// Takes what a file holds about places while it is read, in the file's order, so that a history of
/// millions of points never stands in memory. Points may come twice, out of order or far off; the
/// sink is made for that.
class LocationSink {
  public:
    virtual ~LocationSink() = default;
    virtual void point(const TrackPoint& point) = 0;
    virtual void visit(StatedVisit visit) = 0;
    virtual void place(NamedPlace place) = 0;
};

}  // namespace keepsakes
