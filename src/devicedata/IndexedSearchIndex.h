// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <utility>
#include <vector>

#include "devicedata/IndexFile.h"
#include "platform/SearchIndex.h"

namespace keepsakes {

/// The search index answered from the links in the index of the owner's messages, as items of
/// `kParleyBundleIdentifier`; SearchQueryString.h has the query language. Items are links (index
/// type "lnk"), the latest last, and the chats that donate automatically ("cht"), which the
/// configuration names. A message that several files hold has its links once; drafts and what was
/// thrown away have none. Before the first scan there are no links.
class IndexedSearchIndex final : public SearchIndex {
  public:
    /// Links from people who score less are not highlighted.
    static constexpr double kLeastScore = 0.5;
    static constexpr std::size_t kItemsPerBatch = 100;

    /// A chat is named by the address of the other side, or by the identifier or name of a room.
    IndexedSearchIndex(std::filesystem::path index, std::vector<std::string> donatingChats)
        : index_(std::move(index)), donatingChats_(std::move(donatingChats)) {}

    void start(const SearchQuery& query, const FoundItems& found,
               const Completion& completion) override;

  private:
    const IndexFile index_;
    const std::vector<std::string> donatingChats_;
};

}  // namespace keepsakes
