// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string_view>

#include "readers/LocationRecords.h"

namespace keepsakes {

/// What the owner uses a place for that he or she calls by this name: "Home" and "Work" in six
/// languages, whatever their case, accents and separators; unknown for every other name.
PlaceUse useOfPlaceName(std::string_view name);

}  // namespace keepsakes
