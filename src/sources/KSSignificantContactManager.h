// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "core/KSError.h"
#include "core/ServiceLookup.h"
#include "core/WorkQueue.h"
#include "model/KSEvent.h"
#include "sources/KSConversation.h"

namespace keepsakes {

class Clock;
class KSEventStore;

/// Turns the record of the owner's communications into events: one for each group of people and
/// day on which somebody close was in touch. Owned by the registry as "SignificantContactManager";
/// interactions are asked for on its queue, everything else happens on the caller's thread. Its
/// operations may be called from any thread, those that wait for the queue from any but its own.
class KSSignificantContactManager final : public KSService {
  public:
    using Conversations = std::vector<KSConversation::Pointer>;
    using InteractionsHandler = std::function<void(const std::vector<Interaction>&)>;
    using RankedContacts = std::map<std::string, RankedContact, std::less<>>;

    static constexpr std::size_t kMostInteractions = 2500;
    /// Contacts that score less count as none.
    static constexpr double kLeastScore = 0.5;

    /// Needs "EventStore".
    static std::shared_ptr<KSSignificantContactManager> initWithUniverse(
        const ServiceLookup& universe);
    /// A missing event store fails the assertion; a missing store of the device yields nothing.
    static std::shared_ptr<KSSignificantContactManager> initWithInteractionStore(
        InteractionStore* interactionStore, ContactStore* contactStore,
        std::shared_ptr<KSEventStore> keepsakeStore, Clock& clock);

    /// The latest interactions of the dates, ascending by start, on the queue. After an error of
    /// the store the handler is not called at all.
    void fetchInteractionsBetweenStartDate(KSDate start, KSDate end, InteractionsHandler handler);
    /// Contacts of at least `kLeastScore` by person identifier. Calls the handler before it
    /// returns.
    void fetchRankedContactsWithIdentifiers(
        const std::vector<std::string>& identifiers,
        const std::function<void(const RankedContacts&)>& handler) const;
    Conversations conversationsFromInteractions(const std::vector<Interaction>& interactions) const;
    std::shared_ptr<KSEvent> createEventFromConversation(const KSConversation& conversation) const;
    /// The same for the same interactions, as 32 lower-case hexadecimal digits.
    static std::string _providerIdOfConversation(const KSConversation& conversation);

    /// Stores an event for each conversation that is not stored yet.
    void saveConversations(const Conversations& conversations, const ResultHandler& handler);
    void fetchAndSaveConversationsBetweenStartDate(KSDate start, KSDate end, ResultHandler handler);

    /// Copies of the events with their contact, its score and their interactions; events whose
    /// conversation is gone are missing. Waits for the queue.
    KSEventArray rehydrateConversations(const KSEventArray& events);
    /// Removes the events whose conversation is gone. Waits for the queue.
    void removeConversationsDeletedAtSource(const KSEventArray& events,
                                            const ResultHandler& handler);

    void waitForQueueEmpty();

  private:
    static constexpr std::string_view kUnit = "KSSignificantContactManager";

    KSSignificantContactManager(InteractionStore& interactionStore, ContactStore& contactStore,
                                std::shared_ptr<KSEventStore> keepsakeStore, Clock& clock);

    using ConversationIndex = std::unordered_map<std::string, KSConversation::Pointer>;
    /// The conversations of the time that the events span, by identifier from provider; nothing
    /// when there are no events or the interactions could not be fetched.
    std::optional<ConversationIndex> conversationsOfEvents(const KSEventArray& events);

    InteractionStore& interactionStore_;
    ContactStore& contactStore_;
    const std::shared_ptr<KSEventStore> keepsakeStore_;
    Clock& clock_;
    WorkQueue queue_;
};

}  // namespace keepsakes
