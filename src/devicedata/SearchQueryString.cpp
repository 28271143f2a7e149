// SPDX-License-Identifier: Apache-2.0
#include "devicedata/SearchQueryString.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <optional>
#include <utility>

#include "core/Text.h"

namespace keepsakes {

namespace {

using Kind = SearchClause::Kind;
using Value = SearchClause::Value;

struct Comparison {
    std::string_view sign;
    Kind kind;
};
/// Longer signs first, and the one that is printed before its like.
constexpr auto kComparisons = std::to_array<Comparison>({{"!=", Kind::unequal},
                                                         {"<=", Kind::lessOrEqual},
                                                         {">=", Kind::greaterOrEqual},
                                                         {"==", Kind::equal},
                                                         {"=", Kind::equal},
                                                         {"<", Kind::less},
                                                         {">", Kind::greater}});
constexpr std::string_view kRange = "InRange";
constexpr std::string_view kTime = "iso";

bool isNamePart(char c) {
    return (c >= '0' && c <= '9') || (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || c == '_';
}

/// Reads a query from left to right, without going back further than a clause.
class Parser {
  public:
    explicit Parser(std::string_view text) : rest_(text) {}

    std::expected<std::vector<SearchClause>, std::string> query() {
        std::vector<SearchClause> clauses;
        do {
            if (clauses.size() == kMostSearchClauses) {
                return std::unexpected(
                    fmt::format("the query has more than {} clauses", kMostSearchClauses));
            }
            skipBlanks();
            const auto from = rest_;
            auto clause = this->clause();
            skipBlanks();
            if (!clause || !(rest_.empty() || rest_.starts_with("&&"))) {
                return std::unexpected(
                    fmt::format("the query's clause \"{}\" is not understood", shown(from)));
            }
            clauses.push_back(std::move(*clause));
        } while (take("&&"));
        return clauses;
    }

  private:
    /// The clause at the text's start, as far as it can be told, for people.
    static std::string shown(std::string_view text) {
        constexpr std::size_t kMostShown = 80;
        auto clause = text.substr(0, text.find("&&"));
        clause = clause.substr(0, clause.find_last_not_of(" \t\r\n") + 1);
        const bool isCut = clause.size() > kMostShown;
        std::string shown = plainUtf8(clause.substr(0, kMostShown));
        std::ranges::replace_if(
            shown, [](char c) { return static_cast<unsigned char>(c) < ' '; }, ' ');
        return shown + (isCut ? "..." : "");
    }

    void skipBlanks() {
        rest_.remove_prefix(std::min(rest_.find_first_not_of(" \t\r\n"), rest_.size()));
    }

    bool take(std::string_view word) {
        skipBlanks();
        if (!rest_.starts_with(word)) return false;
        rest_.remove_prefix(word.size());
        return true;
    }

    std::string name() {
        skipBlanks();
        const auto* const end = std::ranges::find_if_not(rest_, isNamePart);
        std::string name(rest_.begin(), end);
        rest_.remove_prefix(name.size());
        return name;
    }

    std::optional<SearchClause> clause() {
        SearchClause clause;
        clause.name = name();
        if (clause.name.empty()) return std::nullopt;
        if (clause.name == kRange && take("(")) return range();
        const auto* const comparison = std::ranges::find_if(
            kComparisons, [this](const Comparison& known) { return take(known.sign); });
        if (comparison == kComparisons.end()) return std::nullopt;
        if (comparison->sign == "=" && take("*")) return clause;
        clause.kind = comparison->kind;
        auto value = this->value();
        if (!value) return std::nullopt;
        clause.value = std::move(*value);
        return clause;
    }

    std::optional<SearchClause> range() {
        SearchClause clause{.kind = Kind::inRange, .name = name(), .value = {}, .upper = {}};
        if (clause.name.empty()) return std::nullopt;
        for (auto* end : {&clause.value, &clause.upper}) {
            if (!take(",")) return std::nullopt;
            auto value = this->value();
            if (!value) return std::nullopt;
            *end = std::move(*value);
        }
        // Ends of two kinds hold nothing between them.
        if (!take(")") || clause.value.index() != clause.upper.index()) return std::nullopt;
        return clause;
    }

    std::optional<Value> value() {
        skipBlanks();
        if (take("\"")) return text();
        if (take(kTime)) return time();
        double number = 0;
        const auto [end, error] =
            std::from_chars(rest_.data(), rest_.data() + rest_.size(), number);
        if (error != std::errc() || !std::isfinite(number)) return std::nullopt;
        rest_.remove_prefix(static_cast<std::size_t>(end - rest_.data()));
        return number;
    }

    std::optional<Value> text() {
        std::string text;
        while (!rest_.empty()) {
            const char c = rest_.front();
            rest_.remove_prefix(1);
            if (c == '"') return text;
            const bool isEscape = c == '\\' && !rest_.empty();
            if (isEscape && rest_.front() != '"' && rest_.front() != '\\') return std::nullopt;
            text += isEscape ? rest_.front() : c;
            if (isEscape) rest_.remove_prefix(1);
        }
        return std::nullopt;
    }

    std::optional<Value> time() {
        if (!take("(")) return std::nullopt;
        const auto end = rest_.find(')');
        if (end == std::string_view::npos) return std::nullopt;
        const auto parsed = parseISO8601(rest_.substr(0, end));
        if (!parsed) return std::nullopt;
        rest_.remove_prefix(end + 1);
        // What can be printed again.
        const KSDate date{std::round(parsed->date.seconds * 1000) / 1000};
        const auto again = parseISO8601(formatISO8601(date));
        return again ? std::optional<Value>(again->date) : std::nullopt;
    }

    std::string_view rest_;
};

std::string textOf(const Value& value) {
    if (const auto* number = std::get_if<double>(&value)) return fmt::format("{}", *number);
    if (const auto* date = std::get_if<KSDate>(&value)) {
        return fmt::format("{}({})", kTime, formatISO8601(*date));
    }
    std::string text = "\"";
    for (const char c : std::get<std::string>(value)) {
        if (c == '"' || c == '\\') text += '\\';
        text += c;
    }
    return text + '"';
}

std::string textOf(const SearchClause& clause) {
    if (clause.kind == Kind::exists) return clause.name + "=*";
    if (clause.kind == Kind::inRange) {
        return fmt::format("{}({}, {}, {})", kRange, clause.name, textOf(clause.value),
                           textOf(clause.upper));
    }
    const auto* const comparison = std::ranges::find_if(kComparisons, [&clause](const auto& known) {
        return known.kind == clause.kind && known.sign != "==";
    });
    return fmt::format("{}{}{}", clause.name, comparison->sign, textOf(clause.value));
}

/// The value as one of the query's kinds.
std::optional<Value> comparable(const KSValue& value) {
    if (const auto* text = value.asString()) return *text;
    if (const auto date = value.asDate()) return *date;
    if (const auto truth = value.asBool()) return *truth ? 1.0 : 0.0;
    if (const auto number = value.asNumber()) return *number;
    return std::nullopt;
}

bool holdsForOne(const SearchClause& clause, const KSValue& value) {
    const auto own = comparable(value);
    if (!own || own->index() != clause.value.index()) return false;
    switch (clause.kind) {
        case Kind::exists:
            return true;
        case Kind::equal:
            return *own == clause.value;
        case Kind::unequal:
            return *own != clause.value;
        case Kind::less:
            return *own < clause.value;
        case Kind::lessOrEqual:
            return *own <= clause.value;
        case Kind::greater:
            return *own > clause.value;
        case Kind::greaterOrEqual:
            return *own >= clause.value;
        case Kind::inRange:
            return *own >= clause.value && *own <= clause.upper;
    }
    return false;
}

}  // namespace

std::expected<std::vector<SearchClause>, std::string> parseSearchQuery(std::string_view text) {
    if (text.size() > kLongestSearchQuery) {
        return std::unexpected(
            fmt::format("the query is longer than {} bytes", kLongestSearchQuery));
    }
    return Parser(text).query();
}

std::string searchQueryText(const std::vector<SearchClause>& clauses) {
    std::string text;
    for (const auto& clause : clauses) {
        if (!text.empty()) text += " && ";
        text += textOf(clause);
    }
    return text;
}

bool holds(const SearchClause& clause, const KSValue& value) {
    const auto* array = value.asArray();
    if (clause.kind == Kind::exists) return array ? !array->empty() : !value.isNull();
    if (!array) return holdsForOne(clause, value);
    return std::ranges::any_of(*array,
                               [&clause](const KSValue& one) { return holdsForOne(clause, one); });
}

}  // namespace keepsakes
