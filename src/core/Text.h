// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>

namespace keepsakes {

/// Lower case by Unicode's rules of no language. Takes UTF-8.
std::string lowerCased(std::string_view text);

/// Lower case of an ASCII letter; any other byte as it is.
constexpr char lowerAscii(char c) {
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

constexpr bool isDigit(char c) { return c >= '0' && c <= '9'; }

/// The value of a hexadecimal digit of either case; -1 for what is none.
constexpr int hexDigit(char c) {
    if (isDigit(c)) return c - '0';
    const char low = lowerAscii(c);
    return low >= 'a' && low <= 'f' ? low - 'a' + 10 : -1;
}

/// Without the blanks at both ends.
std::string_view trimmed(std::string_view text, std::string_view blanks = " \t\r\n");

/// Whether the text is well-formed UTF-8 (RFC 3629) without U+0000.
bool isPlainUtf8(std::string_view text);

/// The text with U+FFFD in place of each ill-formed sequence and of U+0000, so that it is plain.
std::string plainUtf8(std::string_view text);

}  // namespace keepsakes
