// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "devicedata/IndexFile.h"
#include "platform/ContactStore.h"

namespace keepsakes {

/// The owner's contacts answered from the index: the people of the address books, scored at the
/// last scan. Before the first scan there are none.
class IndexedContactStore final : public ContactStore {
  public:
    explicit IndexedContactStore(std::filesystem::path index) : index_(std::move(index)) {}

    Contacts rankedContacts(std::span<const std::string> personIdentifiers) override;
    std::expected<std::vector<RelatedPerson>, KSError> relatedPeople() override;

  private:
    const IndexFile index_;
};

}  // namespace keepsakes
