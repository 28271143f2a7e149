// SPDX-License-Identifier: Apache-2.0
#include "core/MurmurHash3.h"

#include <gtest/gtest.h>

namespace keepsakes {
namespace {

std::string bytesOf(const std::array<std::uint8_t, 16>& digest) {
    return {digest.begin(), digest.end()};
}

TEST(MurmurHash3, HasTheVerificationValueOfItsTestSuite) {
    // SMHasher's check: keys {}, {0}, {0, 1}, … under the seeds 256, 255, …; the digests hashed
    // once more. The published value of MurmurHash3_x86_128 is 0xB3ECE62A.
    std::string key;
    std::string digests;
    for (std::uint32_t length = 0; length < 256; ++length) {
        digests += bytesOf(murmurHash3(key, 256 - length));
        key += static_cast<char>(length);
    }
    EXPECT_EQ(bytesOf(murmurHash3(digests, 0)).substr(0, 4), "\x2A\xE6\xEC\xB3");
}

TEST(MurmurHash3, IdentifiersAreItsBytesInOrder) {
    const auto digest = murmurHash3("a|b", 1765656435);
    const auto digits = identifierHash("a|b");
    ASSERT_EQ(digits.size(), 32u);
    for (std::size_t i = 0; i < digest.size(); ++i) {
        EXPECT_EQ(std::stoi(digits.substr(2 * i, 2), nullptr, 16), digest[i]) << i;
    }
}

}  // namespace
}  // namespace keepsakes
