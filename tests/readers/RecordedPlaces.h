// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <utility>
#include <vector>

#include "readers/LocationRecords.h"

namespace keepsakes {

/// Keeps what a reader hands on, in its order.
struct RecordedPlaces final : LocationSink {
    std::vector<TrackPoint> points;
    std::vector<StatedVisit> visits;
    std::vector<NamedPlace> places;

    void point(const TrackPoint& point) override { points.push_back(point); }
    void visit(StatedVisit visit) override { visits.push_back(std::move(visit)); }
    void place(NamedPlace place) override { places.push_back(std::move(place)); }
};

}  // namespace keepsakes
