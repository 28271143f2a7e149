// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace keepsakes {

/// The key under which the tables of words are searched: case and accents folded away (Unicode
/// compatibility case folding, then no combining marks), and everything that is neither a letter
/// nor a digit left out. "Trail_Running", "trail running" and "TRAIL-RUNNING" share a key, as do
/// "Châteaux" and "chateaux", "Strasse" and "Straße".
std::string foldWord(std::string_view utf8);

/// The keys of words that stand apart by blanks (a blank within a word is written as a hyphen).
std::vector<std::string> foldedWords(std::string_view words);

/// The keys of the first `most` words of a text, in its order. They stand apart by whatever is in
/// ASCII and neither a letter nor a digit.
std::vector<std::string> foldedTokens(std::string_view text, std::size_t most);

/// The text as valid UTF-8 without control characters and outer blanks. Bytes that are no UTF-8 are
/// taken for windows-1252, which old cameras and editors write.
std::string cleanText(std::string_view bytes);

/// The text of that charset as valid UTF-8, otherwise unchanged. Of no charset, or one that nobody
/// knows, it is UTF-8 or else windows-1252.
std::string utf8Text(std::string_view bytes, const std::string& charset);

}  // namespace keepsakes
