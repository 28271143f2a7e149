// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>

#include "model/KSEvent.h"

namespace keepsakes {

/// What people call a suggested event's category: "flight", "car rental"; empty for none, and
/// for what a social event is anyway.
std::string_view suggestionWord(std::uint64_t suggestedEventCategory);

/// Where the event's calendar entry is held, or nothing.
std::string suggestionPlace(const KSEvent& event);

/// "3 parts" of a trip whose parts are filled in; otherwise nothing.
std::string tripPartsText(const KSEvent& event);

}  // namespace keepsakes
