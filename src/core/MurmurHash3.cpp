// SPDX-License-Identifier: Apache-2.0
#include "core/MurmurHash3.h"

#include <fmt/format.h>

#include <bit>

namespace keepsakes {

namespace {

constexpr std::uint32_t kIdentifierSeed = 1765656435;
constexpr std::size_t kLanes = 4;
constexpr std::size_t kBlock = 16;

struct Lane {
    std::uint32_t firstFactor;
    std::uint32_t secondFactor;
    int rotateKey;
    int rotateState;
    std::uint32_t constant;
};
constexpr std::array<Lane, kLanes> kLane{{{0x239b961b, 0xab0e9789, 15, 19, 0x561ccd1b},
                                          {0xab0e9789, 0x38b34ae5, 16, 17, 0x0bcaa747},
                                          {0x38b34ae5, 0xa1e38b93, 17, 15, 0x96cd1c35},
                                          {0xa1e38b93, 0x239b961b, 18, 13, 0x32ac3b17}}};

std::uint32_t mixedKey(std::uint32_t key, const Lane& lane) {
    return std::rotl(key * lane.firstFactor, lane.rotateKey) * lane.secondFactor;
}

std::uint32_t finalMix(std::uint32_t state) {
    state ^= state >> 16U;
    state *= 0x85ebca6b;
    state ^= state >> 13U;
    state *= 0xc2b2ae35;
    return state ^ (state >> 16U);
}

/// Up to four bytes from `at`, little-endian; bytes beyond the end are 0.
std::uint32_t wordAt(std::string_view bytes, std::size_t at) {
    std::uint32_t word = 0;
    for (std::size_t i = 0; i < 4 && at + i < bytes.size(); ++i) {
        word |= static_cast<std::uint32_t>(static_cast<unsigned char>(bytes[at + i])) << (8 * i);
    }
    return word;
}

void addOthers(std::array<std::uint32_t, kLanes>& state) {
    for (std::size_t i = 1; i < kLanes; ++i) state[0] += state[i];
    for (std::size_t i = 1; i < kLanes; ++i) state[i] += state[0];
}

}  // namespace

std::array<std::uint8_t, 16> murmurHash3(std::string_view bytes, std::uint32_t seed) {
    std::array<std::uint32_t, kLanes> state{seed, seed, seed, seed};
    const std::size_t whole = bytes.size() / kBlock * kBlock;
    for (std::size_t at = 0; at < whole; at += kBlock) {
        for (std::size_t i = 0; i < kLanes; ++i) {
            const auto& lane = kLane[i];
            state[i] ^= mixedKey(wordAt(bytes, at + 4 * i), lane);
            state[i] = std::rotl(state[i], lane.rotateState) + state[(i + 1) % kLanes];
            state[i] = state[i] * 5 + lane.constant;
        }
    }
    // A key of 0, which a word beyond the end is, mixes to 0.
    for (std::size_t i = 0; i < kLanes; ++i) {
        state[i] ^= mixedKey(wordAt(bytes, whole + 4 * i), kLane[i]);
    }
    for (auto& word : state) word ^= static_cast<std::uint32_t>(bytes.size());
    addOthers(state);
    for (auto& word : state) word = finalMix(word);
    addOthers(state);
    std::array<std::uint8_t, 16> digest{};
    for (std::size_t i = 0; i < digest.size(); ++i) {
        digest[i] = static_cast<std::uint8_t>(state[i / 4] >> (8 * (i % 4)));
    }
    return digest;
}

std::string identifierHash(std::string_view bytes) {
    std::string digits;
    for (const auto byte : murmurHash3(bytes, kIdentifierSeed)) {
        digits += fmt::format("{:02x}", byte);
    }
    return digits;
}

}  // namespace keepsakes
