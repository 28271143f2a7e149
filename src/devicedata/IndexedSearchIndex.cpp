// SPDX-License-Identifier: Apache-2.0
#include "devicedata/IndexedSearchIndex.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <utility>

#include "devicedata/LinkItems.h"
#include "devicedata/SearchQueryString.h"

namespace keepsakes {

namespace {

constexpr std::string_view kErrorDomain = "SearchIndexErrorDomain";

using Clauses = std::vector<SearchClause>;

constexpr auto kItemTexts = std::to_array<std::string_view>(
    {searchkey::kUniqueIdentifier, searchkey::kURL, searchkey::kAuthorAddresses,
     searchkey::kAuthorContactIdentifiers, searchkey::kAccountIdentifier,
     searchkey::kAccountHandles, searchkey::kRecipientAddresses, searchkey::kDisplayName,
     searchkey::kGroupPhotoPath, searchkey::kIndexType, searchkey::kLinkTitle,
     searchkey::kLinkDescription, searchkey::kResolvedURL});
constexpr auto kDates = std::to_array<std::string_view>({searchkey::kContentCreationDate,
                                                         searchkey::kAttributeChangeDate,
                                                         searchkey::kHighlightedContentServerDate});
constexpr auto kNumbers = std::to_array<std::string_view>(
    {searchkey::kIsShared, searchkey::kSyndicationStatus, searchkey::kIsChatAutoDonating,
     searchkey::kIsHighlightedContent, searchkey::kFromMe});

template <std::size_t N>
bool isIn(const std::array<std::string_view, N>& names, std::string_view name) {
    return std::ranges::find(names, name) != names.end();
}

/// An attribute that no item has, or one of another kind than what it is compared with, would
/// quietly find nothing.
bool isAnswerable(const SearchClause& clause) {
    const bool isText = isIn(kItemTexts, clause.name);
    const bool isDate = isIn(kDates, clause.name);
    const bool isNumber = isIn(kNumbers, clause.name);
    if (clause.kind == SearchClause::Kind::exists) return isText || isDate || isNumber;
    return (isText && std::holds_alternative<std::string>(clause.value)) ||
           (isDate && std::holds_alternative<KSDate>(clause.value)) ||
           (isNumber && std::holds_alternative<double>(clause.value));
}

std::expected<Clauses, std::string> clausesOf(const std::string& query) {
    auto clauses = parseSearchQuery(query);
    if (!clauses) return clauses;
    const auto unknown =
        std::ranges::find_if_not(*clauses, [](const auto& clause) { return isAnswerable(clause); });
    if (unknown == clauses->end()) return clauses;
    return std::unexpected(
        fmt::format("the query's clause \"{}\" is not understood: there is no such attribute, or it"
                    " is of another kind",
                    searchQueryText({*unknown})));
}

/// The dates beyond which no item can match.
KSDateInterval datesOf(const Clauses& clauses) {
    KSDateInterval dates{KSDate::distantPast(), KSDate::distantFuture()};
    for (const auto& clause : clauses) {
        if (clause.kind != SearchClause::Kind::inRange ||
            clause.name != searchkey::kContentCreationDate) {
            continue;
        }
        dates.start = std::max(dates.start, std::get<KSDate>(clause.value));
        dates.end = std::min(dates.end, std::get<KSDate>(clause.upper));
    }
    return dates;
}

/// Hands matching items on, with the attributes asked for, in batches.
class Matches {
  public:
    Matches(const Clauses& clauses, const SearchQuery& query, const SearchIndex::FoundItems& found)
        : clauses_(clauses), query_(query), found_(found) {}

    void add(SearchableItem&& item) {
        const bool isMatch = std::ranges::all_of(clauses_, [&item](const SearchClause& clause) {
            return holds(clause, valueForKey(item, clause.name));
        });
        if (!isMatch) return;
        std::erase_if(item, [this](const auto& attribute) {
            return std::ranges::find(query_.fetchAttributes, attribute.first) ==
                   query_.fetchAttributes.end();
        });
        batch_.push_back(std::move(item));
        if (batch_.size() == IndexedSearchIndex::kItemsPerBatch) flush();
    }

    void flush() {
        if (!batch_.empty()) found_(batch_);
        batch_.clear();
    }

  private:
    const Clauses& clauses_;
    const SearchQuery& query_;
    const SearchIndex::FoundItems& found_;
    std::vector<SearchableItem> batch_;
};

SearchableItem donatingChat(const std::string& chat) {
    SearchableItem item;
    item.emplace(searchkey::kUniqueIdentifier, "chat:" + chat);
    item.emplace(searchkey::kAccountIdentifier, chat);
    item.emplace(searchkey::kIndexType, KSArray{"cht"});
    item.emplace(searchkey::kIsChatAutoDonating, KSArray{1});
    return item;
}

}  // namespace

void IndexedSearchIndex::start(const SearchQuery& query, const FoundItems& found,
                               const Completion& completion) {
    const auto clauses = clausesOf(query.queryString);
    if (!clauses) {
        completion(KSError::make(kErrorDomain, 1, clauses.error()));
        return;
    }
    const bool isAsked =
        query.bundleIDs.empty() ||
        std::ranges::find(query.bundleIDs, kParleyBundleIdentifier) != query.bundleIDs.end();
    if (!isAsked) {
        completion(std::nullopt);
        return;
    }
    Matches matches(*clauses, query, found);
    for (const auto& chat : donatingChats_) matches.add(donatingChat(chat));
    // Only links have a URL and a date; without a link to find, the index need not be opened.
    const bool isOfChats = std::ranges::any_of(*clauses, [](const SearchClause& clause) {
        return clause.name == searchkey::kIsChatAutoDonating;
    });
    if (!isOfChats) {
        const auto answered = index_.ask([&](SQLite::Database& index) {
            LinkItems(index, donatingChats_)
                .forEach(datesOf(*clauses),
                         [&matches](SearchableItem&& item) { matches.add(std::move(item)); });
        });
        if (!answered) {
            completion(answered.error());
            return;
        }
    }
    matches.flush();
    completion(std::nullopt);
}

}  // namespace keepsakes
