// SPDX-License-Identifier: Apache-2.0
#include "indexer/ContentHash.h"

#include <nettle/sha2.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>

namespace keepsakes {

namespace {

bool hashRange(sha256_ctx& context, int fd, std::int64_t from, std::int64_t to) {
    std::array<std::uint8_t, 16384> block{};
    while (from < to) {
        const auto wanted = std::min<std::int64_t>(to - from, std::int64_t{block.size()});
        const auto count = ::pread(fd, block.data(), static_cast<std::size_t>(wanted), from);
        if (count < 0 && errno == EINTR) continue;
        if (count < 0) return false;
        if (count == 0) return true;  // The file shrank; its next scan sees that.
        sha256_update(&context, static_cast<std::size_t>(count), block.data());
        from += count;
    }
    return true;
}

}  // namespace

std::optional<std::string> contentHash(int fd, std::int64_t size) {
    sha256_ctx context{};
    sha256_init(&context);
    std::array<std::uint8_t, 8> length{};
    for (std::size_t i = 0; i < length.size(); ++i) {
        length[i] = static_cast<std::uint8_t>(static_cast<std::uint64_t>(size) >> (8 * i));
    }
    sha256_update(&context, length.size(), length.data());
    const auto headEnd = std::min(size, kHashedEnd);
    const auto tailStart = std::max(headEnd, size - kHashedEnd);
    if (!hashRange(context, fd, 0, headEnd) || !hashRange(context, fd, tailStart, size)) {
        return std::nullopt;
    }
    std::string hash(16, '\0');
    sha256_digest(&context, hash.size(), reinterpret_cast<std::uint8_t*>(hash.data()));
    return hash;
}

}  // namespace keepsakes
