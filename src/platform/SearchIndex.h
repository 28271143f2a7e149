// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "core/KSError.h"
#include "core/KSValue.h"

namespace keepsakes {

/// Names of an item's attributes, in queries as well.
namespace searchkey {
inline constexpr std::string_view kUniqueIdentifier = "uniqueIdentifier";        ///< String.
inline constexpr std::string_view kURL = "URL";                                  ///< String.
inline constexpr std::string_view kContentCreationDate = "contentCreationDate";  ///< Date.
inline constexpr std::string_view kAttributeChangeDate = "attributeChangeDate";  ///< Date.
inline constexpr std::string_view kAuthorAddresses = "authorAddresses";          ///< Strings.
inline constexpr std::string_view kAuthorContactIdentifiers = "authorContactIdentifiers";
inline constexpr std::string_view kAccountIdentifier = "accountIdentifier";  ///< Of a chat.
inline constexpr std::string_view kAccountHandles = "accountHandles";        ///< The owner's.
inline constexpr std::string_view kRecipientAddresses = "recipientAddresses";
inline constexpr std::string_view kDisplayName = "displayName";              ///< Of the chat.
inline constexpr std::string_view kIsShared = "isShared";                    ///< By the owner.
inline constexpr std::string_view kSyndicationStatus = "syndicationStatus";  ///< Integer.
inline constexpr std::string_view kGroupPhotoPath = "groupPhotoPath";

// Those of the messaging application itself are arrays, of one value each.
inline constexpr std::string_view kIndexType = "com_brindle_parley_indexType";
inline constexpr std::string_view kIsChatAutoDonating = "com_brindle_parley_isChatAutoDonating";
/// 2: by the owner's own hand; 1: by whom it came from; 0: not.
inline constexpr std::string_view kIsHighlightedContent = "com_brindle_parley_isHighlightedContent";
inline constexpr std::string_view kLinkTitle = "com_brindle_parley_lpTitle";
inline constexpr std::string_view kLinkDescription = "com_brindle_parley_lpDescription";
inline constexpr std::string_view kHighlightedContentServerDate =
    "com_brindle_parley_highlightedContentServerDate";
inline constexpr std::string_view kResolvedURL = "com_brindle_parley_resolvedURL";
inline constexpr std::string_view kFromMe = "com_brindle_parley_fromMe";
}  // namespace searchkey

/// The messaging application, as queries are restricted to it.
inline constexpr std::string_view kParleyBundleIdentifier = "com.brindle.Parley";

/// An item of the index: its attributes by name. Absent ones are absent.
using SearchableItem = KSDictionary;

struct SearchQuery {
    std::string queryString;
    std::vector<std::string> fetchAttributes;  ///< What items are given with; others are left out.
    std::vector<std::string> bundleIDs;        ///< Whose items; anybody's when empty.
};

/// The device's search index over what applications hold. Any thread may call it.
class SearchIndex {
  public:
    using FoundItems = std::function<void(std::span<const SearchableItem>)>;
    using Completion = std::function<void(OptionalError)>;

    virtual ~SearchIndex() = default;

    /// Calls `found` with the matching items in batches, then `completion` with no error; after a
    /// failure, which may come between batches, `completion` with the error. A query string that
    /// is not understood is an error that names the clause. Both are called on the calling thread
    /// before this returns.
    virtual void start(const SearchQuery& query, const FoundItems& found,
                       const Completion& completion) = 0;
};

}  // namespace keepsakes
