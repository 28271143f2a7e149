// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string_view>

namespace keepsakes {

/// Seconds of a period as people write it: a whole number with its unit, "45s", "90m", "6h" or
/// "7d", or a plain "0". Nothing for anything else, or for more than ten years.
std::optional<double> parsePeriod(std::string_view text);

}  // namespace keepsakes
