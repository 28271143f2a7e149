// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "core/KSDate.h"
#include "platform/InteractionStore.h"
#include "readers/FileRecords.h"
#include "readers/LinkFinder.h"

namespace keepsakes {

/// What tells one message from another: the same for every copy of it.
using MessageIdentity = std::array<std::uint8_t, 16>;

/// One message or call as a file tells it. People are handles (see Handles.h).
struct InteractionRecord {
    MessageIdentity identity{};
    KSDate start;
    KSDate end;
    InteractionMechanism mechanism = InteractionMechanism::mail;
    InteractionDirection direction = InteractionDirection::unknown;
    /// Nothing when the owner is the sender, or nobody knows who was.
    std::string sender;
    /// Distinct; without the owner where the direction is incoming.
    std::vector<std::string> recipients;

    friend bool operator==(const InteractionRecord&, const InteractionRecord&) = default;
};

/// One link of a message.
struct LinkRecord {
    FoundLink link;
    /// The room that it was shared in, by its identifier and its name; empty outside of rooms.
    std::string room;
    std::string roomName;
    /// The owner's own address that the message came to or from; empty where that is not told.
    std::string account;
    bool isStarred = false;  ///< The owner marked the message, in the file itself.

    friend bool operator==(const LinkRecord&, const LinkRecord&) = default;
};

/// Somebody whom a card names with a word for a relationship; of another card only the UID.
struct CardRelation {
    std::string relationship;
    std::string name;

    friend bool operator==(const CardRelation&, const CardRelation&) = default;
};

/// One entry of an address book.
struct ContactCard {
    std::string uid;   ///< Empty when the card has none.
    std::string name;  ///< For people; empty when the card has none.
    std::vector<std::string> handles;
    std::optional<GeoPoint> position;
    std::vector<CardRelation> relations;
    /// Not a card: the name that a phone's own address book gave to a number of a backup.
    bool fromPhone = false;

    friend bool operator==(const ContactCard&, const ContactCard&) = default;
};

/// Takes what a file holds about people while it is read, in the file's order, so that a mailbox of
/// any size never stands in memory. Of a file that turns out to be damaged the sink's owner drops
/// what came before.
class PeopleSink {
  public:
    virtual ~PeopleSink() = default;
    virtual void interaction(const InteractionRecord& record) = 0;
    /// Of the interaction told last.
    virtual void link(const LinkRecord& link) = 0;
    virtual void card(const ContactCard& card) = 0;
    /// A number or address that the file shows to be the owner's own.
    virtual void ownerHandle(const std::string& handle) = 0;
};

}  // namespace keepsakes
