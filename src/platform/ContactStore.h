// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "core/KSError.h"

namespace keepsakes {

/// Stands in front of a contact's identifier.
inline constexpr std::string_view kContactPrefix = "CN:";

/// Somebody in the owner's address books.
struct RankedContact {
    std::string identifier;  ///< The person's, behind `kContactPrefix`.
    std::string name;
    double score = 0;  ///< How close the owner and the contact are in touch, 0 to 1.

    friend bool operator==(const RankedContact&, const RankedContact&) = default;
};

/// Somebody whom an address book relates to the owner or to one of the owner's contacts.
struct RelatedPerson {
    std::string relationship;  ///< One of a few words, such as "family" or "friend".
    std::string name;

    friend bool operator==(const RelatedPerson&, const RelatedPerson&) = default;
};

/// The contacts of the personal profile service. Any thread may call it; it blocks the caller and
/// changes nothing.
class ContactStore {
  public:
    using Contacts = std::expected<std::vector<RankedContact>, KSError>;

    virtual ~ContactStore() = default;

    /// The contacts of these persons (without the prefix), in no particular order; persons who are
    /// no contacts are left out.
    virtual Contacts rankedContacts(std::span<const std::string> personIdentifiers) = 0;

    /// Each relationship and name once, by these.
    virtual std::expected<std::vector<RelatedPerson>, KSError> relatedPeople() = 0;
};

}  // namespace keepsakes
