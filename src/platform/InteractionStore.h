// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <array>
#include <cstddef>
#include <expected>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "core/KSDate.h"
#include "core/KSError.h"

namespace keepsakes {

/// By which means two people were in touch. The numbers are kept in the index and never change.
enum class InteractionMechanism : int {
    mail = 0,
    bulkMail = 1,  ///< Mailing lists, newsletters, mails to a crowd.
    textMessage = 2,
    multimediaMessage = 3,
    phoneCall = 4,       ///< Answered.
    unansweredCall = 5,  ///< Missed by either side.
    unsentMessage = 6,   ///< Drafts, and what could not be sent.
    serviceMessage = 7,  ///< From machines: short codes, names in place of numbers, "noreply".
    chatMessage = 8,     ///< Instant message between two.
    groupChatMessage = 9,
    groupTextMessage = 10,  ///< SMS or MMS among several.
    videoCall = 11,
    internetCall = 12,
    rejectedCall = 13,  ///< Declined or blocked.
    voicemail = 14,
    automaticMail = 15,  ///< Replies and notices that nobody wrote.
    sharedItem = 16,     ///< A file or link sent from one to the other.
    richMessage = 17,    ///< RCS, between two or more.
};

/// What tells of people in touch with each other, in the order in which it is asked for. The others
/// are left out on purpose.
inline constexpr auto kPersonalMechanisms = std::to_array<InteractionMechanism>({
    InteractionMechanism::mail,
    InteractionMechanism::textMessage,
    InteractionMechanism::multimediaMessage,
    InteractionMechanism::phoneCall,
    InteractionMechanism::chatMessage,
    InteractionMechanism::groupChatMessage,
    InteractionMechanism::groupTextMessage,
    InteractionMechanism::videoCall,
    InteractionMechanism::internetCall,
    InteractionMechanism::sharedItem,
    InteractionMechanism::richMessage,
});

enum class InteractionDirection : int { unknown = 0, incoming = 1, outgoing = 2 };

struct InteractionPerson {
    std::optional<std::string> personId;    ///< Of somebody in the owner's address books.
    std::optional<std::string> identifier;  ///< Number or address; nothing when it is withheld.

    friend bool operator==(const InteractionPerson&, const InteractionPerson&) = default;
};

/// One message or call: who, when and how, and nothing of what was said.
struct Interaction {
    std::string uuid;  ///< The same for the same message, wherever it is found.
    KSDate startDate;
    KSDate endDate;
    InteractionMechanism mechanism = InteractionMechanism::mail;
    InteractionDirection direction = InteractionDirection::unknown;
    InteractionPerson sender;
    std::vector<InteractionPerson> recipients;

    friend bool operator==(const Interaction&, const Interaction&) = default;
};

struct InteractionQuery {
    KSDate startsFrom;
    KSDate endsUntil;
    std::span<const InteractionMechanism> mechanisms;
    std::size_t limit = 0;
};

/// The record of the owner's communications. Any thread may call it; it blocks the caller and
/// changes nothing.
class InteractionStore {
  public:
    using Interactions = std::expected<std::vector<Interaction>, KSError>;

    virtual ~InteractionStore() = default;

    /// The `limit` latest interactions that start and end within the dates, both included, by one
    /// of the mechanisms; descending by start.
    virtual Interactions queryInteractions(const InteractionQuery& query) = 0;
};

}  // namespace keepsakes
