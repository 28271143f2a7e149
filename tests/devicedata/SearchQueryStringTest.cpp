// SPDX-License-Identifier: Apache-2.0
#include "devicedata/SearchQueryString.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace keepsakes {
namespace {

using testing::HasSubstr;

const KSDate kNoon = parseISO8601("2024-06-14T12:00:00Z")->date;

bool finds(const std::string& query, const KSDictionary& item) {
    const auto clauses = parseSearchQuery(query);
    EXPECT_TRUE(clauses) << query << ": " << clauses.error();
    return clauses && std::ranges::all_of(*clauses, [&item](const SearchClause& clause) {
               return holds(clause, valueForKey(item, clause.name));
           });
}

TEST(SearchQueryString, FindsWhatAllClausesHoldFor) {
    const KSDictionary item{{"text", "a \"b\\"},
                            {"number", 2},
                            {"half", 0.5},
                            {"truth", true},
                            {"date", kNoon},
                            {"empty", KSArray{}},
                            {"many", KSArray{"x", "y", 3}}};
    const std::vector<std::pair<std::string, bool>> cases{
        {"text=*", true},
        {"nothing=*", false},
        {"empty=*", false},
        {R"(text="a \"b\\")", true},
        {R"(text = "A")", false},
        {R"(text != "A")", true},
        {R"(nothing != "A")", false},
        {"number=2&&half=0.5", true},
        {"number==2 && half>=1", false},
        {"number<2", false},
        {"number<=2 && number>1 && truth=1", true},
        {R"(number="2")", false},
        {"InRange(number, 1, 2)", true},
        {"InRange( number ,3,4 )", false},
        {"InRange(number,3,1)", false},
        {R"(many="y" && many=3)", true},
        {"InRange(date, iso(2024-06-14T12:00:00Z), iso(2024-06-14T14:00:00+02:00))", true},
        {"date > iso(2024-06-14T12:00:00.001Z)", false},
        {"date >= iso(2024-06-14)", true},
    };
    for (const auto& [query, isFound] : cases) EXPECT_EQ(finds(query, item), isFound) << query;
}

TEST(SearchQueryString, NamesTheClauseThatIsNotUnderstood) {
    const std::vector<std::pair<std::string, std::string>> cases{
        {"", "clause \"\""},
        {"a=1 && ", "clause \"\""},
        {"a=1 & b=2", "clause \"a=1 & b=2\""},
        {"a=1 || b=2 && c=3", "clause \"a=1 || b=2\""},
        {"a=1 && like(b, 2)", "clause \"like(b, 2)\""},
        {"(a=1)", "clause \"(a=1)\""},
        {"InRange(InRange(a, 1, 2), 1, 2)", "clause \"InRange(InRange(a, 1, 2), 1, 2)\""},
        {"InRange(a, 1)", "clause \"InRange(a, 1)\""},
        {"InRange(a, 1, \"2\")", "clause"},
        {"a=\"open", "clause \"a=\"open\""},
        {R"(a="\n")", "clause"},
        {"a=nan", "clause \"a=nan\""},
        {"a=1e999", "clause"},
        {"a=iso(yesterday)", "clause \"a=iso(yesterday)\""},
        {"a!=*", "clause \"a!=*\""},
        {std::string(5000, '('), "longer than 4096 bytes"},
    };
    for (const auto& [query, what] : cases) {
        const auto clauses = parseSearchQuery(query);
        ASSERT_FALSE(clauses) << query;
        EXPECT_THAT(clauses.error(), HasSubstr(what));
    }
    std::string many = "a=1";
    for (int i = 0; i < 40; ++i) many += "&&a=1";
    EXPECT_THAT(parseSearchQuery(many).error(), HasSubstr("more than 32 clauses"));
}

TEST(SearchQueryString, WhatIsPrintedParsesToTheSame) {
    const std::string query =
        R"(type = "l\"n\\k" && URL=* && InRange(flag, -1, 2.5e-7) && size!=1e+300 && a<1 && b>2)"
        R"( && c<="x" && d>=iso(0001-01-01) && InRange(date, iso(2024-06-14T12:00:00.123Z),)"
        R"( iso(9999-12-31T23:59:59.999Z)))";
    const auto whole = parseSearchQuery(query);
    ASSERT_TRUE(whole) << whole.error();
    EXPECT_EQ(whole->size(), 9u);
    for (std::size_t length = 0; length <= query.size(); ++length) {
        const auto cut = parseSearchQuery(query.substr(0, length));
        if (!cut) continue;
        const auto text = searchQueryText(*cut);
        const auto again = parseSearchQuery(text);
        ASSERT_TRUE(again) << text;
        EXPECT_EQ(*again, *cut) << text;
    }
}

}  // namespace
}  // namespace keepsakes
