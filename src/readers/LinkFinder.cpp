// SPDX-License-Identifier: Apache-2.0
#include "readers/LinkFinder.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <utility>

#include "core/Text.h"
#include "readers/ReaderLimits.h"

namespace keepsakes {

namespace {

bool isAlphanumeric(char c) {
    return isDigit(c) || (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z');
}

/// ASCII that stands in no URL as it is (RFC 3986, 2).
bool isForeign(char c) {
    const auto byte = static_cast<unsigned char>(c);
    return byte <= ' ' || byte >= 0x7f || std::string_view("\"<>\\^`{|}").contains(c);
}

/// The length of "http://" or "https://" at the start of the text, or 0.
std::size_t schemeLength(std::string_view text) {
    for (const std::string_view scheme : {"http://", "https://"}) {
        if (std::ranges::equal(text.substr(0, scheme.size()), scheme, {}, lowerAscii)) {
            return scheme.size();
        }
    }
    return 0;
}

/// The URL in the form that `FoundLink` promises; empty when it is none.
std::string plainUrl(std::string_view text) {
    const auto length = schemeLength(text);
    if (length == 0 || text.size() > limits::kLongestUrl) return {};
    const auto authority =
        text.substr(length, std::min(text.find_first_of("/?#", length), text.size()) - length);
    if (authority.empty() || authority.contains('@')) return {};
    const char first = authority.front();
    const bool isAscii = static_cast<unsigned char>(first) < 0x80;
    if (isAscii && !isAlphanumeric(first) && first != '[' && first != '%') return {};
    std::string url;
    std::size_t escaped = 0;  // So many digits of an escape are left, in a case of their own.
    for (std::size_t i = 0; i < text.size() && url.size() <= limits::kLongestUrl; ++i) {
        if (isForeign(text[i])) {
            url += fmt::format("%{:02X}", static_cast<unsigned char>(text[i]));
            escaped = 0;
            continue;
        }
        const bool hasNoCase = i < length + authority.size() && escaped == 0;
        url += hasNoCase ? lowerAscii(text[i]) : text[i];
        escaped = text[i] == '%' ? 2 : escaped - std::min<std::size_t>(escaped, 1);
    }
    return url.size() > limits::kLongestUrl ? std::string() : url;
}

/// Blanks, quotes and the like beyond ASCII: U+00A0, U+00AB, U+00BB, and the blocks of general and
/// of East Asian punctuation.
bool isWidePunctuation(std::string_view text) {
    static constexpr auto kStarts = std::to_array<std::string_view>(
        {"\xC2\xA0", "\xC2\xAB", "\xC2\xBB", "\xE2\x80", "\xE3\x80", "\xEF\xBC"});
    return std::ranges::any_of(kStarts, [text](auto start) { return text.starts_with(start); });
}

/// How far a link reaches that begins at the text's start.
std::size_t linkLength(std::string_view text) {
    std::size_t end = 0;
    while (end < text.size()) {
        const bool isAscii = static_cast<unsigned char>(text[end]) < 0x80;
        if (isAscii ? isForeign(text[end]) : isWidePunctuation(text.substr(end))) break;
        ++end;
    }
    return end;
}

/// Without the number of a footnote, "[12]", that stands at the end of a path.
std::string_view withoutFootnote(std::string_view link) {
    const auto open = link.rfind('[');
    if (open == std::string_view::npos || !link.ends_with(']')) return link;
    const auto number = link.substr(open + 1, link.size() - open - 2);
    const bool isFootnote = !number.empty() && std::ranges::all_of(number, isDigit) &&
                            !link.substr(0, open).contains('?');
    return isFootnote ? link.substr(0, open) : link;
}

std::string_view withoutPunctuation(std::string_view link) {
    struct Bracket {
        char close;
        std::ptrdiff_t unopened;
    };
    std::array<Bracket, 2> brackets{
        Bracket{')', std::ranges::count(link, ')') - std::ranges::count(link, '(')},
        Bracket{']', std::ranges::count(link, ']') - std::ranges::count(link, '[')}};
    while (!link.empty()) {
        auto* const bracket = std::ranges::find(brackets, link.back(), &Bracket::close);
        const bool isUnopened = bracket != brackets.end() && bracket->unopened-- > 0;
        if (!isUnopened && !std::string_view(".,;:!?'*~").contains(link.back())) break;
        link.remove_suffix(1);
    }
    return withoutFootnote(link);
}

}  // namespace

void LinkList::add(FoundLink link) {
    link.url = plainUrl(link.url);
    if (link.url.empty()) return;
    const auto known = std::ranges::find(links_, link.url, &FoundLink::url);
    if (known == links_.end()) {
        if (!isFull()) links_.push_back(std::move(link));
        return;
    }
    if (known->title.empty()) known->title = std::move(link.title);
    if (known->description.empty()) known->description = std::move(link.description);
}

bool LinkList::isFull() const { return links_.size() >= limits::kMostLinks; }

void findLinks(std::string_view text, LinkList& links) {
    constexpr std::size_t kLongestScheme = 5;
    std::size_t done = 0;
    for (auto at = text.find("://"); at != std::string_view::npos && !links.isFull();
         at = text.find("://", std::max(done, at + 1))) {
        auto begin = at;
        while (begin > done && at - begin <= kLongestScheme && isAlphanumeric(text[begin - 1])) {
            --begin;
        }
        const auto rest = text.substr(begin);
        if (schemeLength(rest) != at - begin + 3) continue;
        const auto length = linkLength(rest);
        done = begin + length;
        if (length > limits::kLongestUrl) continue;
        links.add({.url = std::string(withoutPunctuation(rest.substr(0, length))),
                   .title = {},
                   .description = {}});
    }
}

}  // namespace keepsakes
