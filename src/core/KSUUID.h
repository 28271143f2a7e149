// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <array>
#include <compare>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

namespace keepsakes {

/// A 128-bit identifier (RFC 4122). A plain value; the default one is all zero.
struct KSUUID {
    std::array<std::uint8_t, 16> bytes{};

    /// A fresh version-4 identifier from the system's random source.
    static KSUUID random();

    /// Reads 8-4-4-4-12 hexadecimal digits of either case; nothing for anything else.
    static std::optional<KSUUID> parse(std::string_view text);

    /// Lower-case 8-4-4-4-12.
    std::string string() const;

    friend auto operator<=>(const KSUUID&, const KSUUID&) = default;
};

}  // namespace keepsakes

template <>
struct std::hash<keepsakes::KSUUID> {
    std::size_t operator()(const keepsakes::KSUUID& id) const noexcept;
};
