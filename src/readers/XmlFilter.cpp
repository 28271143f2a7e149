// SPDX-License-Identifier: Apache-2.0
#include "readers/XmlFilter.h"

#include <unicode/unistr.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <cstring>
#include <memory>
#include <optional>
#include <string>
#include <utility>

#include "readers/LinkFinder.h"
#include "readers/ReaderLimits.h"

namespace keepsakes {

namespace {

/// "&#1114111;" is the longest reference to a character.
constexpr std::size_t kLongestReference = 10;

bool isBlank(char c) { return c == ' ' || c == '\t' || c == '\r' || c == '\n'; }

/// The number of the text "&#...;"; nothing when it is none.
std::optional<unsigned> referredNumber(std::string_view reference) {
    if (!reference.starts_with("&#") || !reference.ends_with(';')) return std::nullopt;
    auto digits = reference.substr(2, reference.size() - 3);
    const bool isHex = digits.starts_with('x') || digits.starts_with('X');
    if (isHex) digits.remove_prefix(1);
    unsigned number = 0;
    const auto [end, error] =
        std::from_chars(digits.data(), digits.data() + digits.size(), number, isHex ? 16 : 10);
    if (error != std::errc() || end != digits.data() + digits.size()) return std::nullopt;
    return number;
}

/// Whether it names half a character of UTF-16.
bool isSurrogate(std::optional<unsigned> number) {
    return number && *number >= 0xD800 && *number <= 0xDFFF;
}

struct NamedReference {
    std::string_view reference;
    char character;
};
constexpr auto kNamedReferences = std::to_array<NamedReference>(
    {{"&amp;", '&'}, {"&lt;", '<'}, {"&gt;", '>'}, {"&quot;", '"'}, {"&apos;", '\''}});

/// The value with what its references stand for in UTF-8; those that stand for nothing as they are.
std::string withoutReferences(std::string_view value) {
    std::string text;
    while (!value.empty()) {
        const auto plain = std::min(value.find('&'), value.size());
        text += value.substr(0, plain);
        value.remove_prefix(plain);
        if (value.empty()) break;
        const auto reference = value.substr(0, value.substr(0, kLongestReference).find(';') + 1);
        const auto* const named =
            std::ranges::find(kNamedReferences, reference, &NamedReference::reference);
        const auto number = referredNumber(reference);
        if (named != kNamedReferences.end()) {
            text += named->character;
        } else if (number && *number <= 0x10FFFF && !isSurrogate(number)) {
            icu::UnicodeString(static_cast<UChar32>(*number)).toUTF8String(text);
        } else {
            text += value.substr(0, std::max<std::size_t>(reference.size(), 1));
        }
        value.remove_prefix(std::max<std::size_t>(reference.size(), 1));
    }
    return text;
}

/// The links in an attribute's value, as an attribute's value.
std::string linksIn(std::string_view value) {
    LinkList found;
    findLinks(withoutReferences(value), found);
    std::string text;
    for (const auto& link : found.links()) {
        if (!text.empty()) text += ' ';
        for (const char c : link.url) {
            if (c == '&' || c == '\'') {
                text += c == '&' ? "&amp;" : "&apos;";
            } else {
                text += c;
            }
        }
    }
    return text;
}

class Filter {
  public:
    Filter(std::vector<std::string_view> names, std::vector<std::string_view> searched)
        : names_(std::move(names)), searched_(std::move(searched)) {}

    void pass(std::string_view piece, std::string& out) {
        while (!piece.empty()) {
            if (state_ == State::dropped) {
                // The one place where there is much to pass over.
                const auto end = std::min(piece.find(quote_), piece.size());
                if (isSearched_ && value_.size() < limits::kLongestText) {
                    value_ += piece.substr(0, std::min(end, limits::kLongestText - value_.size()));
                }
                piece.remove_prefix(end);
                if (piece.empty()) return;
            }
            step(piece.front(), out);
            piece.remove_prefix(1);
        }
    }

    /// What was held back for a reference that never ended.
    void finish(std::string& out) { out += std::exchange(reference_, {}); }

  private:
    enum class State { text, opened, tag, name, value, dropped, markup };

    void step(char c, std::string& out) {
        if (holdReference(c, out)) return;
        switch (state_) {
            case State::text:
                if (c == '<') state_ = State::opened;
                break;
            case State::opened:
                markup_.assign(1, c);
                state_ = c == '!' || c == '?' ? State::markup : State::tag;
                break;
            case State::markup:
                inMarkup(c);
                break;
            case State::tag:
                inTag(c);
                break;
            case State::name:
                inName(c);
                break;
            case State::dropped:
                if (isSearched_) out += linksIn(value_);
                value_.clear();
                state_ = State::tag;
                break;
            case State::value:
                if (c == quote_) state_ = State::tag;
                break;
        }
        out += c;
    }

    /// Keeps a reference until it is whole; takes it away when it is none that may stand.
    bool holdReference(char c, std::string& out) {
        if (reference_.empty()) {
            if (c != '&' || (state_ != State::value && state_ != State::text)) return false;
            reference_.assign(1, '&');
            return true;
        }
        reference_ += c;
        if (c != ';' && c != '<' && c != quote_ && reference_.size() < kLongestReference) {
            return true;
        }
        auto held = std::exchange(reference_, {});
        if (isSurrogate(referredNumber(held))) return true;
        const char last = held.back();
        held.pop_back();
        out += held;
        if (last == '&') {
            reference_.assign(1, '&');
            return true;
        }
        step(last, out);
        return true;
    }

    /// Comments, instructions and declarations end with ends of their own.
    void inMarkup(char c) {
        if (markup_.size() < kLongestMarkupStart) markup_ += c;
        last_ = {last_[1], last_[2], c};
        const bool isComment = markup_.starts_with("!--");
        const bool isData = markup_.starts_with("![CDATA[");
        const std::string_view ends(last_.data(), last_.size());
        const bool isOver = isComment                ? ends == "-->"
                            : isData                 ? ends == "]]>"
                            : markup_.front() == '?' ? ends.ends_with("?>")
                                                     : c == '>';
        if (isOver) state_ = State::text;
    }

    void inTag(char c) {
        if (c == '>') {
            state_ = State::text;
        } else if (c == '"' || c == '\'') {
            quote_ = c;
            const auto isIn = [this](const std::vector<std::string_view>& names) {
                return std::ranges::find(names, std::string_view(name_)) != names.end();
            };
            isSearched_ = isIn(searched_);
            state_ = isSearched_ || isIn(names_) ? State::dropped : State::value;
        } else if (!isBlank(c) && c != '=' && c != '/') {
            name_.assign(1, c);
            state_ = State::name;
        }
    }

    void inName(char c) {
        if (c == '=' || c == '>' || isBlank(c)) {
            state_ = c == '>' ? State::text : State::tag;
        } else if (name_.size() <= limits::kLongestValue) {
            name_ += c;
        }
    }

    static constexpr std::size_t kLongestMarkupStart = 8;

    const std::vector<std::string_view> names_;
    const std::vector<std::string_view> searched_;
    bool isSearched_ = false;
    std::string value_;
    State state_ = State::text;
    char quote_ = '"';
    std::string name_;
    std::string markup_;
    std::array<char, 3> last_{};
    std::string reference_;
};

}  // namespace

ReadBlock withoutAttributes(ReadBlock read, std::vector<std::string_view> names,
                            std::vector<std::string_view> searched) {
    struct Stream {
        Filter filter;
        std::vector<char> block;
        std::string passed;
        std::size_t given = 0;
        bool isOver = false;
    };
    const auto stream =
        std::make_shared<Stream>(Stream{.filter = Filter(std::move(names), std::move(searched)),
                                        .block = std::vector<char>(limits::kBlockSize)});
    return [read = std::move(read),
            stream](std::span<char> into) -> std::expected<std::size_t, std::string> {
        while (stream->given == stream->passed.size() && !stream->isOver) {
            stream->passed.clear();
            stream->given = 0;
            const auto count = read(stream->block);
            if (!count) return std::unexpected(count.error());
            stream->filter.pass({stream->block.data(), *count}, stream->passed);
            stream->isOver = *count == 0;
            if (stream->isOver) stream->filter.finish(stream->passed);
        }
        const auto count = std::min(into.size(), stream->passed.size() - stream->given);
        std::memcpy(into.data(), stream->passed.data() + stream->given, count);
        stream->given += count;
        return count;
    };
}

}  // namespace keepsakes
