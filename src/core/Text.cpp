// SPDX-License-Identifier: Apache-2.0
#include "core/Text.h"

#include <unicode/locid.h>
#include <unicode/unistr.h>
#include <unicode/utf8.h>

#include <cstdint>

namespace keepsakes {

std::string lowerCased(std::string_view text) {
    auto wide = icu::UnicodeString::fromUTF8({text.data(), static_cast<std::int32_t>(text.size())});
    wide.toLower(icu::Locale::getRoot());
    std::string lowered;
    wide.toUTF8String(lowered);
    return lowered;
}

std::string_view trimmed(std::string_view text, std::string_view blanks) {
    const auto first = text.find_first_not_of(blanks);
    if (first == std::string_view::npos) return {};
    return text.substr(first, text.find_last_not_of(blanks) - first + 1);
}

bool isPlainUtf8(std::string_view text) {
    // Nearly all text is ASCII, and this much of the test the compiler makes fast.
    bool ascii = true;
    for (const char byte : text) ascii &= byte > 0;
    if (ascii) return true;
    const auto* bytes = reinterpret_cast<const std::uint8_t*>(text.data());
    const auto size = static_cast<std::int64_t>(text.size());
    for (std::int64_t at = 0; at < size;) {
        UChar32 point = 0;
        U8_NEXT(bytes, at, size, point);
        if (point <= 0) return false;
    }
    return true;
}

std::string plainUtf8(std::string_view text) {
    if (isPlainUtf8(text)) return std::string(text);
    const auto* bytes = reinterpret_cast<const std::uint8_t*>(text.data());
    const auto size = static_cast<std::int64_t>(text.size());
    std::string plain;
    for (std::int64_t at = 0; at < size;) {
        const auto start = static_cast<std::size_t>(at);
        UChar32 point = 0;
        U8_NEXT(bytes, at, size, point);
        plain += point > 0 ? text.substr(start, static_cast<std::size_t>(at) - start) : "\uFFFD";
    }
    return plain;
}

}  // namespace keepsakes
