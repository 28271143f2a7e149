// SPDX-License-Identifier: Apache-2.0
#include "core/KSUUID.h"

#include <sys/random.h>

#include <cstring>
#include <system_error>

#include "core/Text.h"

namespace keepsakes {

namespace {

constexpr bool hyphenBefore(std::size_t byte) {
    return byte == 4 || byte == 6 || byte == 8 || byte == 10;
}

}  // namespace

KSUUID KSUUID::random() {
    KSUUID id;
    if (getrandom(id.bytes.data(), id.bytes.size(), 0) != static_cast<ssize_t>(id.bytes.size())) {
        throw std::system_error(errno, std::generic_category(), "getrandom");
    }
    id.bytes[6] = static_cast<std::uint8_t>((id.bytes[6] & 0x0f) | 0x40);
    id.bytes[8] = static_cast<std::uint8_t>((id.bytes[8] & 0x3f) | 0x80);
    return id;
}

std::optional<KSUUID> KSUUID::parse(std::string_view text) {
    if (text.size() != 36) return std::nullopt;
    KSUUID id;
    std::size_t at = 0;
    for (std::size_t byte = 0; byte < id.bytes.size(); ++byte) {
        if (hyphenBefore(byte) && text[at++] != '-') return std::nullopt;
        const int high = hexDigit(text[at]);
        const int low = hexDigit(text[at + 1]);
        if (high < 0 || low < 0) return std::nullopt;
        id.bytes[byte] = static_cast<std::uint8_t>(high * 16 + low);
        at += 2;
    }
    return id;
}

std::string KSUUID::string() const {
    constexpr char kDigits[] = "0123456789abcdef";
    std::string text;
    text.reserve(36);
    for (std::size_t byte = 0; byte < bytes.size(); ++byte) {
        if (hyphenBefore(byte)) text += '-';
        text += kDigits[bytes[byte] >> 4];
        text += kDigits[bytes[byte] & 15];
    }
    return text;
}

}  // namespace keepsakes

std::size_t std::hash<keepsakes::KSUUID>::operator()(const keepsakes::KSUUID& id) const noexcept {
    // Clients choose identifiers, so not every byte of one need be random: both halves count.
    std::uint64_t halves[2];
    std::memcpy(halves, id.bytes.data(), sizeof halves);
    return static_cast<std::size_t>((halves[0] * 0x9e3779b97f4a7c15ULL) ^ halves[1]);
}
