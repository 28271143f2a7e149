// SPDX-License-Identifier: Apache-2.0
#include "readers/MailBody.h"

#include <algorithm>
#include <array>
#include <utility>

#include "core/Text.h"
#include "readers/ReaderLimits.h"
#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

constexpr std::size_t kDeepestPart = 8;
constexpr std::size_t kLongestBoundary = 70;  // RFC 2046, 5.1.1

/// The six bits of a digit of base64 (RFC 4648, 4), or -1.
int base64Digit(char c) {
    if (c >= 'A' && c <= 'Z') return c - 'A';
    if (c >= 'a' && c <= 'z') return c - 'a' + 26;
    if (c >= '0' && c <= '9') return c - '0' + 52;
    if (c == '+') return 62;
    return c == '/' ? 63 : -1;
}

/// A line of underscores, behind which mailing lists put their address, and other programs the mail
/// that is answered.
bool isRule(std::string_view line) {
    constexpr std::size_t kShortestRule = 20;
    return line.size() >= kShortestRule && line.find_first_not_of('_') == std::string_view::npos;
}

}  // namespace

void MailBody::Header::line(std::string_view line) {
    if (line.starts_with(' ') || line.starts_with('\t')) {
        if (current_ && current_->size() + line.size() <= limits::kLongestField) *current_ += line;
        return;
    }
    current_ = nullptr;
    const auto colon = line.find(':');
    // All three begin so; most fields of a mail do not.
    if (!line.starts_with('C') && !line.starts_with('c')) return;
    if (colon > limits::kLongestValue) return;  // or there is none
    const auto name = lowerCased(trimmed(line.substr(0, colon)));
    auto* const field = name == "content-type"                ? &type_
                        : name == "content-transfer-encoding" ? &encoding_
                        : name == "content-disposition"       ? &disposition_
                                                              : nullptr;
    if (!field || !field->empty()) return;
    *field = line.substr(colon + 1);
    current_ = field;
}

bool MailBody::Header::isType(std::string_view type) const {
    auto own = lowerCased(trimmed(std::string_view(type_).substr(0, type_.find(';'))));
    if (own.empty()) own = "text/plain";
    return type.ends_with('/') ? own.starts_with(type) : own == type;
}

bool MailBody::Header::isAttached() const {
    return lowerCased(trimmed(disposition_)).starts_with("attachment");
}

MailBody::Encoding MailBody::Header::encoding() const {
    const auto name = lowerCased(trimmed(encoding_));
    if (name == "quoted-printable") return Encoding::quotedPrintable;
    return name == "base64" ? Encoding::base64 : Encoding::none;
}

std::string MailBody::Header::parameter(std::string_view name) const {
    std::string_view rest(type_);
    while (true) {
        rest.remove_prefix(std::min(rest.find(';'), rest.size()));
        if (rest.empty()) return {};
        rest.remove_prefix(1);
        const auto equals = rest.find('=');
        if (equals == std::string_view::npos) return {};
        const bool isWanted = lowerCased(trimmed(rest.substr(0, equals))) == name;
        rest = trimmed(rest.substr(equals + 1));
        std::string value;
        if (rest.starts_with('"')) {
            rest.remove_prefix(1);
            while (!rest.empty() && rest.front() != '"') {
                if (rest.front() == '\\' && rest.size() > 1) rest.remove_prefix(1);
                value += rest.front();
                rest.remove_prefix(1);
            }
        } else {
            value = trimmed(rest.substr(0, rest.find(';')));
        }
        if (isWanted) return value;
    }
}

void MailBody::begin() {
    hasBegun_ = true;
    beginPart();
}

void MailBody::line(std::string_view line) {
    if (isOver_) return;
    if (!hasBegun_) begin();
    bytes_ += line.size() + 1;
    if (bytes_ > limits::kLongestMail || links_.isFull()) {
        endPart();
        isOver_ = true;
    } else if (line.starts_with("--") && isBoundary(line)) {
        return;
    } else if (!inHeader_) {
        addText(line);
    } else if (line.empty()) {
        beginPart();
    } else {
        part_.line(line);
    }
}

/// Begins what follows the line when it is a boundary. A boundary of an outer part also ends those
/// inside.
bool MailBody::isBoundary(std::string_view line) {
    line.remove_prefix(2);
    line = line.substr(0, line.find_last_not_of(" \t") + 1);
    const auto found = std::ranges::find_if(boundaries_, [line](const std::string& boundary) {
        return line.starts_with(boundary) &&
               (line.size() == boundary.size() || line.substr(boundary.size()) == "--");
    });
    if (found == boundaries_.end()) return false;
    endPart();
    const bool isLast = line.size() > found->size();
    boundaries_.erase(isLast ? found : found + 1, boundaries_.end());
    part_ = {};
    kind_ = Kind::other;
    inHeader_ = !isLast;
    return true;
}

void MailBody::beginPart() {
    inHeader_ = false;
    kind_ = Kind::other;
    text_.clear();
    bits_ = bitCount_ = 0;
    if (part_.isType("multipart/")) {
        auto boundary = part_.parameter("boundary");
        if (boundary.empty() || boundary.size() > kLongestBoundary) return;
        if (boundaries_.size() < kDeepestPart) boundaries_.push_back(std::move(boundary));
        return;
    }
    if (part_.isAttached()) return;
    if (part_.isType("message/rfc822")) {
        part_ = {};
        inHeader_ = true;
        return;
    }
    if (part_.isType("text/plain")) kind_ = Kind::plain;
    if (part_.isType("text/html")) kind_ = Kind::html;
    encoding_ = part_.encoding();
    charset_ = lowerCased(part_.parameter("charset"));
}

void MailBody::endPart() {
    if (kind_ == Kind::other) return;
    // In all other charsets a URL stands as it does in ASCII.
    const bool isWide = charset_.starts_with("utf-16") || charset_.starts_with("utf-32");
    if (kind_ == Kind::html) {
        findHtmlLinks(utf8Text(text_, charset_), links_);
    } else {
        findInPlain(isWide ? utf8Text(text_, charset_) : text_);
    }
    kind_ = Kind::other;
    text_.clear();
}

void MailBody::findInPlain(std::string_view text) {
    while (!text.empty() && !links_.isFull()) {
        const auto end = std::min(text.find('\n'), text.size());
        auto line = text.substr(0, end);
        text.remove_prefix(std::min(end + 1, text.size()));
        if (line.ends_with('\r')) line.remove_suffix(1);
        if (line == "-- " || isRule(line)) return;
        if (!line.starts_with('>')) findLinks(line, links_);
    }
}

void MailBody::addText(std::string_view line) {
    if (kind_ == Kind::other || text_.size() >= limits::kLongestText) return;
    switch (encoding_) {
        case Encoding::quotedPrintable:
            addQuotedPrintable(line);
            break;
        case Encoding::base64:
            addBase64(line);
            break;
        case Encoding::none:
            text_ += line;
            text_ += '\n';
    }
}

void MailBody::addQuotedPrintable(std::string_view line) {
    line = line.substr(0, line.find_last_not_of(" \t") + 1);
    const bool goesOn = line.ends_with('=');
    if (goesOn) line.remove_suffix(1);
    for (std::size_t i = 0; i < line.size(); ++i) {
        const int high = line[i] == '=' && i + 2 < line.size() ? hexDigit(line[i + 1]) : -1;
        const int low = high >= 0 ? hexDigit(line[i + 2]) : -1;
        if (low < 0) {
            text_ += line[i];
            continue;
        }
        text_ += static_cast<char>(high * 16 + low);
        i += 2;
    }
    if (!goesOn) text_ += '\n';
}

void MailBody::addBase64(std::string_view line) {
    for (const char c : line) {
        const int digit = base64Digit(c);
        if (digit < 0) continue;
        bits_ = (bits_ << 6U) | static_cast<std::uint32_t>(digit);
        bitCount_ += 6;
        if (bitCount_ < 8) continue;
        bitCount_ -= 8;
        text_ += static_cast<char>((bits_ >> bitCount_) & 0xFFU);
    }
}

std::vector<FoundLink> MailBody::takeLinks() {
    endPart();
    auto links = links_.links();
    // What the text was kept in is kept for the next.
    auto text = std::move(text_);
    *this = {};
    text_ = std::move(text);
    text_.clear();
    return links;
}

}  // namespace keepsakes
