// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <algorithm>
#include <cstring>
#include <random>
#include <string_view>

#include "Check.h"
#include "readers/FileReaders.h"
#include "readers/ReaderLimits.h"
#include "readers/XmlStream.h"

namespace keepsakes {

inline const ReaderContext kFuzzNow{KSDate{745000000}};

/// The bytes in blocks of random sizes below 65; as large as they can be for seed 0.
inline ReadBlock inBlocks(std::string_view bytes, std::size_t seed) {
    return [bytes, random = std::minstd_rand(static_cast<unsigned>(seed)),
            seed](std::span<char> into) mutable -> std::expected<std::size_t, std::string> {
        const auto most = seed == 0 ? into.size() : 1 + random() % 64;
        const auto count = std::min({most, bytes.size(), into.size()});
        std::memcpy(into.data(), bytes.data(), count);
        bytes.remove_prefix(count);
        return count;
    };
}

}  // namespace keepsakes
