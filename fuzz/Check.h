// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <string_view>

extern "C" std::size_t LLVMFuzzerMutate(std::uint8_t* data, std::size_t size, std::size_t most);

namespace keepsakes {

/// Ends the run, keeping the input, when a property does not hold.
inline void check(bool holds, const char* property) {
    if (holds) return;
    std::fprintf(stderr, "property broken: %s\n", property);
    std::abort();
}

/// For `LLVMFuzzerCustomMutator`: begins with `first`, an input of the target's own making, and has
/// the library change what is longer than nothing.
inline std::size_t beginOrMutate(std::string_view first, std::uint8_t* data, std::size_t size,
                                 std::size_t most) {
    constexpr std::size_t kNothing = 16;
    if (size >= kNothing || first.size() > most) return LLVMFuzzerMutate(data, size, most);
    std::memcpy(data, first.data(), first.size());
    return first.size();
}

/// The bytes by which an input chooses, in front of what is to be read.
inline std::string chosen(unsigned first, unsigned second, std::string_view text) {
    std::string input{static_cast<char>(first), static_cast<char>(second)};
    return input.append(text);
}

}  // namespace keepsakes
