// SPDX-License-Identifier: Apache-2.0
// Property: a query, nested or cut anywhere, is either refused with a reason or printed as one that
// parses to the same clauses; whether they hold for an item is then the same, too.
#include <cstdint>
#include <string>

#include "Check.h"
#include "devicedata/SearchQueryString.h"

namespace {

using namespace keepsakes;

constexpr std::string_view kSeed =
    "com_brindle_parley_indexType=\"lnk\" && URL=* && "
    "InRange(com_brindle_parley_isHighlightedContent, 1, 2) && InRange(contentCreationDate, "
    "iso(2024-06-14T12:00:00Z), iso(2024-06-15T12:00:00.5+02:00)) && a!=-1.5e3 && b>=\"\\\\\\\"\"";

}  // namespace

extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t* data, std::size_t size,
                                               std::size_t most, unsigned) {
    return beginOrMutate(kSeed, data, size, most);
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const auto clauses = parseSearchQuery(std::string(data, data + size));
    if (!clauses) {
        check(!clauses.error().empty(), "a refusal has a reason");
        check(clauses.error().size() < 1000, "a reason of bounded length");
        return 0;
    }
    check(clauses->size() <= kMostSearchClauses, "not too many clauses");
    const auto again = parseSearchQuery(searchQueryText(*clauses));
    check(again.has_value(), "what is printed is understood");
    check(*again == *clauses, "what is printed parses to the same");
    const KSValue values(KSArray{1, "lnk", KSDate{740000000}, true, 0.5});
    for (std::size_t i = 0; i < clauses->size(); ++i) {
        check(holds((*clauses)[i], values) == holds((*again)[i], values), "it means the same");
    }
    return 0;
}
