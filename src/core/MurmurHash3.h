// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <string_view>

namespace keepsakes {

/// MurmurHash3's x86 128-bit form, for identifiers that are made of content. Not for secrets.
/// Public source: the SMHasher test suite (Austin Appleby, public domain).
std::array<std::uint8_t, 16> murmurHash3(std::string_view bytes, std::uint32_t seed);

/// The hash that identifiers from providers are made of, as 32 lower-case hexadecimal digits.
std::string identifierHash(std::string_view bytes);

}  // namespace keepsakes
