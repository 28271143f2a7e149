// SPDX-License-Identifier: Apache-2.0
#include "config/Period.h"

#include <charconv>
#include <cstdint>

namespace keepsakes {

std::optional<double> parsePeriod(std::string_view text) {
    constexpr double kLongest = 3653 * 86400.0;
    if (text == "0") return 0;
    std::uint32_t count = 0;
    const auto* end = text.data() + text.size();
    const auto [rest, error] = std::from_chars(text.data(), end, count);
    if (error != std::errc{} || end - rest != 1) return std::nullopt;
    double unit = 0;
    switch (*rest) {
        case 's':
            unit = 1;
            break;
        case 'm':
            unit = 60;
            break;
        case 'h':
            unit = 3600;
            break;
        case 'd':
            unit = 86400;
            break;
        default:
            return std::nullopt;
    }
    const double seconds = count * unit;
    return seconds <= kLongest ? std::optional(seconds) : std::nullopt;
}

}  // namespace keepsakes
