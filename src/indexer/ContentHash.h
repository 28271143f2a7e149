// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <optional>
#include <string>

namespace keepsakes {

/// So many bytes at a file's start and at its end go into its hash; a file of twice as many, or
/// fewer, goes into it whole.
inline constexpr std::int64_t kHashedEnd = std::int64_t{64} * 1024;

/// 16 bytes that tell a file's content from another's, cheaply: the first half of the SHA-256 of
/// its size (8 bytes, little-endian), its first and its last 64 KiB. It tells a moved file from a
/// new one of the same size; a file whose stamp changed is read again whatever its hash says.
/// Nothing when the file cannot be read. Leaves the descriptor's position alone.
std::optional<std::string> contentHash(int fd, std::int64_t size);

}  // namespace keepsakes
