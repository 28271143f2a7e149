// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <functional>
#include <string>

#include "readers/FileRecords.h"
#include "readers/XmlStream.h"

namespace keepsakes {

struct Town {
    GeoPoint position;
    std::string name;

    friend bool operator==(const Town&, const Town&) = default;
};

/// Reads a table of places in the format of GeoNames (geonames.org/export, "readme.txt": UTF-8, a
/// place a line, 19 columns parted by tabs) as a stream and hands on the populated places that
/// still are. Lines of other places are passed over. A file in which not one line has the columns
/// is refused, and so is one of more than `limits::kMostTowns` towns.
std::expected<void, std::string> readGazetteer(const ReadBlock& read,
                                               const std::function<void(Town&&)>& town);

}  // namespace keepsakes
