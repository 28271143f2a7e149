// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "core/KSDate.h"
#include "core/KSValue.h"

namespace keepsakes {

// The language in which the search index is asked. All clauses of a query have to hold:
//
//     query      = clause *( "&&" clause )
//     clause     = name "=*"                           ; the item has the attribute
//                / name comparison value
//                / "InRange(" name "," value "," value ")"   ; both ends included
//     comparison = "=" / "==" / "!=" / "<" / "<=" / ">" / ">="
//     name       = 1*( ALPHA / DIGIT / "_" )
//     value      = number / DQUOTE text DQUOTE / "iso(" time ")"
//
// Within a text, a backslash stands before a quote or a backslash that is meant as such. A time is
// one of ISO 8601, of UTC where it names no zone. Blanks may stand between all of them.

struct SearchClause {
    enum class Kind { exists, equal, unequal, less, lessOrEqual, greater, greaterOrEqual, inRange };
    using Value = std::variant<double, std::string, KSDate>;

    Kind kind = Kind::exists;
    std::string name;
    Value value;  ///< The lower end of a range.
    Value upper;

    friend bool operator==(const SearchClause&, const SearchClause&) = default;
};

inline constexpr std::size_t kLongestSearchQuery = 4096;
inline constexpr std::size_t kMostSearchClauses = 32;

/// The clauses of a query, or what is wrong, with the clause that is not understood.
std::expected<std::vector<SearchClause>, std::string> parseSearchQuery(std::string_view text);

/// The query that these are the clauses of. Dates are told to the millisecond.
std::string searchQueryText(const std::vector<SearchClause>& clauses);

/// Whether the clause holds for an attribute's value: null when the item has none. Of an array, one
/// element is enough. Values of different kinds are neither equal nor unequal.
bool holds(const SearchClause& clause, const KSValue& value);

}  // namespace keepsakes
