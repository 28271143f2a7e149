// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

namespace keepsakes {

/// The word of the table of activities (readers/ActivityWords.h) for a sport of the FIT profile;
/// empty for one that says nothing.
std::string_view wordOfFitSport(std::optional<std::int64_t> sport,
                                std::optional<std::int64_t> subSport);

/// The time between the legs of a triathlon has a session of its own.
inline constexpr std::int64_t kFitTransition = 3;

}  // namespace keepsakes
