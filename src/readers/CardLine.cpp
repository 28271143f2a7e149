// SPDX-License-Identifier: Apache-2.0
#include "readers/CardLine.h"

#include <algorithm>
#include <optional>
#include <utility>

#include "core/Text.h"
#include "readers/ReaderLimits.h"
#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

char raised(char c) { return c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c; }

std::string upperCase(std::string_view text) {
    std::string upper(text);
    std::ranges::transform(upper, upper.begin(), raised);
    return upper;
}

/// Where the first of these characters stands outside double quotes.
std::size_t findUnquoted(std::string_view text, std::string_view wanted) {
    bool isQuoted = false;
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] == '"') isQuoted = !isQuoted;
        if (!isQuoted && wanted.find(text[i]) != std::string_view::npos) return i;
    }
    return std::string_view::npos;
}

/// RFC 2045, 6.7; what is no escape stands for itself.
std::string decodeQuotedPrintable(std::string_view text) {
    std::string bytes;
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] == '=' && i + 2 < text.size()) {
            const int high = hexDigit(text[i + 1]);
            const int low = hexDigit(text[i + 2]);
            if (high >= 0 && low >= 0) {
                bytes += static_cast<char>(high * 16 + low);
                i += 2;
                continue;
            }
        }
        bytes += text[i];
    }
    return bytes;
}

bool isQuotedPrintable(std::string_view head) {
    return upperCase(head).find("QUOTED-PRINTABLE") != std::string::npos;
}

void append(std::string& line, std::string_view more) {
    line += more.substr(0, limits::kLongestField - std::min(limits::kLongestField, line.size()));
}

}  // namespace

std::string CardLine::parameter(std::string_view wanted) const {
    for (std::string_view rest = parameters; !rest.empty();) {
        const auto end = std::min(findUnquoted(rest, ";"), rest.size());
        const auto one = rest.substr(0, end);
        rest.remove_prefix(std::min(end + 1, rest.size()));
        const auto equals = one.find('=');
        if (equals == std::string_view::npos || upperCase(one.substr(0, equals)) != wanted)
            continue;
        auto value = one.substr(equals + 1);
        if (value.size() > 1 && value.starts_with('"') && value.ends_with('"')) {
            value = value.substr(1, value.size() - 2);
        }
        return std::string(value);
    }
    return {};
}

bool parseCardLine(std::string_view line, CardLine& parsed) {
    const auto colon = findUnquoted(line, ":");
    if (colon == std::string_view::npos) return false;
    const auto head = line.substr(0, colon);
    const auto text = line.substr(colon + 1);
    const auto semicolon = std::min(head.find(';'), head.size());
    auto name = head.substr(0, semicolon);
    name.remove_prefix(name.rfind('.') == std::string_view::npos ? 0 : name.rfind('.') + 1);
    parsed.name = upperCase(name);
    parsed.parameters = head.substr(std::min(semicolon + 1, head.size()));
    parsed.text = isQuotedPrintable(head) ? decodeQuotedPrintable(text) : std::string(text);
    parsed.text = utf8Text(parsed.text, parsed.parameter("CHARSET"));
    return true;
}

bool goesOn(std::string_view line) {
    const auto colon = line.substr(0, limits::kLongestValue).find(':');
    return line.ends_with('=') && colon != std::string_view::npos &&
           isQuotedPrintable(line.substr(0, colon));
}

std::vector<std::string> cardParts(std::string_view text) {
    std::vector<std::string> parts;
    std::size_t begin = 0;
    for (std::size_t i = 0; i <= text.size(); ++i) {
        if (i + 1 < text.size() && text[i] == '\\') {
            ++i;
        } else if (i == text.size() || text[i] == ';') {
            parts.push_back(cardText(text.substr(begin, i - begin)));
            begin = i + 1;
        }
    }
    return parts;
}

std::string cardText(std::string_view text) {
    std::string plain;
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] != '\\' || i + 1 == text.size()) {
            plain += text[i] == '\n' || text[i] == '\r' ? ' ' : text[i];
            continue;
        }
        ++i;
        plain += text[i] == 'n' || text[i] == 'N' ? ' ' : text[i];
    }
    return cleanText(plain);
}

std::expected<bool, std::string> CardLines::next(std::string& line) {
    line.clear();
    bool isBegun = std::exchange(hasAhead_, false);
    if (isBegun) line = ahead_;
    while (!isOver_) {
        std::string_view more;
        const auto read = lines_.next(more);
        if (!read) return std::unexpected(read.error());
        if (!*read) {
            isOver_ = true;
            break;
        }
        if (isBegun && goesOn(line)) {
            line.pop_back();
            append(line, more);
        } else if (isBegun && (more.starts_with(' ') || more.starts_with('\t'))) {
            append(line, more.substr(1));
        } else if (isBegun) {
            ahead_ = more.substr(0, limits::kLongestField);
            hasAhead_ = true;
            return true;
        } else {
            line = more.substr(0, limits::kLongestField);
            isBegun = true;
        }
    }
    return isBegun;
}

}  // namespace keepsakes
