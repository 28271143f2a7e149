// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>

namespace keepsakes {

/// Lower case by Unicode's rules of no language. Takes UTF-8.
std::string lowerCased(std::string_view text);

/// Whether the text is well-formed UTF-8 (RFC 3629) without U+0000.
bool isPlainUtf8(std::string_view text);

/// The text with U+FFFD in place of each ill-formed sequence and of U+0000, so that it is plain.
std::string plainUtf8(std::string_view text);

}  // namespace keepsakes
