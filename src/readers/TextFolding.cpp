// SPDX-License-Identifier: Apache-2.0
#include "folding/TextFolding.h"

#include <unicode/normalizer2.h>
#include <unicode/uchar.h>
#include <unicode/unistr.h>
#include <unicode/ustring.h>

#include <algorithm>
#include <cstdint>

namespace keepsakes {

namespace {

bool isUtf8(std::string_view text) {
    UErrorCode status = U_ZERO_ERROR;
    u_strFromUTF8(nullptr, 0, nullptr, text.data(), static_cast<std::int32_t>(text.size()),
                  &status);
    return status != U_INVALID_CHAR_FOUND;
}

icu::UnicodeString decode(std::string_view bytes) {
    const auto length = static_cast<std::int32_t>(bytes.size());
    const char* const start = bytes.data();
    if (isUtf8(bytes)) return icu::UnicodeString::fromUTF8({start, length});
    return icu::UnicodeString(start, length, "windows-1252");
}

bool isAsciiWord(std::string_view text, std::string& folded) {
    for (char c : text) {
        if ((static_cast<unsigned char>(c) & 0x80U) != 0) return false;
        if (c >= 'A' && c <= 'Z') {
            folded += static_cast<char>(c - 'A' + 'a');
        } else if ((c >= 'a' && c <= 'z') || (c >= '0' && c <= '9')) {
            folded += c;
        }
    }
    return true;
}

}  // namespace

std::string foldWord(std::string_view utf8) {
    std::string folded;
    if (isAsciiWord(utf8, folded)) return folded;
    folded.clear();
    UErrorCode status = U_ZERO_ERROR;
    const auto* casefold = icu::Normalizer2::getNFKCCasefoldInstance(status);
    const auto* decompose = icu::Normalizer2::getNFDInstance(status);
    if (U_FAILURE(status)) return folded;
    const auto text = decompose->normalize(casefold->normalize(decode(utf8), status), status);
    if (U_FAILURE(status)) return folded;
    icu::UnicodeString kept;
    for (std::int32_t i = 0; i < text.length(); i = text.moveIndex32(i, 1)) {
        const auto c = text.char32At(i);
        if (u_isalnum(c)) kept.append(c);
    }
    kept.toUTF8String(folded);
    return folded;
}

std::vector<std::string> foldedWords(std::string_view words) {
    std::vector<std::string> folded;
    while (!words.empty()) {
        const auto end = std::min(words.find(' '), words.size());
        if (end > 0) folded.push_back(foldWord(words.substr(0, end)));
        words.remove_prefix(std::min(end + 1, words.size()));
    }
    return folded;
}

std::string utf8Text(std::string_view bytes, const std::string& charset) {
    auto text = decode(bytes);
    if (!charset.empty()) {
        const icu::UnicodeString other(bytes.data(), static_cast<std::int32_t>(bytes.size()),
                                       charset.c_str());
        // ICU answers an empty text for a charset that it does not know.
        if (!other.isBogus() && !other.isEmpty()) text = other;
    }
    std::string utf8;
    text.toUTF8String(utf8);
    return utf8;
}

std::vector<std::string> foldedTokens(std::string_view text, std::size_t most) {
    const auto isOfWord = [](char c) {
        return (static_cast<unsigned char>(c) & 0x80U) != 0 || (c >= '0' && c <= '9') ||
               (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
    };
    std::vector<std::string> tokens;
    while (!text.empty() && tokens.size() < most) {
        const auto* const end = std::ranges::find_if_not(text, isOfWord);
        const auto length = static_cast<std::size_t>(end - text.begin());
        auto key = foldWord(text.substr(0, length));
        if (!key.empty()) tokens.push_back(std::move(key));
        text.remove_prefix(std::min(length + 1, text.size()));
    }
    return tokens;
}

std::string cleanText(std::string_view bytes) {
    auto text = decode(bytes);
    icu::UnicodeString kept;
    for (std::int32_t i = 0; i < text.length(); i = text.moveIndex32(i, 1)) {
        const auto c = text.char32At(i);
        if (u_iscntrl(c) || c == 0xFFFD) continue;
        kept.append(c);
    }
    kept.trim();
    std::string utf8;
    kept.toUTF8String(utf8);
    return utf8;
}

}  // namespace keepsakes
