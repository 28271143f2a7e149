// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "readers/LocationRecords.h"

namespace keepsakes {

/// Keeps what a reader tells, a line each.
class PlaceLines final : public LocationSink {
  public:
    void point(const TrackPoint& point) override;
    void visit(StatedVisit visit) override;
    void place(NamedPlace place) override;

    std::vector<std::string> lines;
};

/// What the reader of the bytes' kind tells of places, and then its records or its error.
std::string toldPlaces(std::string_view bytes);

/// Whether every beginning of the bytes tells a beginning of the places that all of them tell, and
/// whether they are read alike in small blocks. The first length for which it does not hold.
std::string brokenCut(const std::string& bytes);

}  // namespace keepsakes
