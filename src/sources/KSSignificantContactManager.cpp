// SPDX-License-Identifier: Apache-2.0
#include "sources/KSSignificantContactManager.h"

#include <fmt/format.h>
#include <fmt/ranges.h>

#include <algorithm>
#include <optional>
#include <set>
#include <utility>

#include "core/Calendar.h"
#include "core/Clock.h"
#include "core/KSAssertion.h"
#include "core/Log.h"
#include "core/MurmurHash3.h"
#include "model/KSExtensions.h"
#include "platform/PlatformServices.h"
#include "sources/ContactCoding.h"
#include "sources/IdentifiedEvents.h"
#include "sources/Lifetimes.h"
#include "store/KSEventStore.h"

namespace keepsakes {

namespace {

std::optional<std::string> keyOf(const InteractionPerson& person) {
    return person.personId ? person.personId : person.identifier;
}

/// The sorted participants, joined; nothing for an interaction whose sender nobody knows.
std::optional<std::string> conversationKey(const Interaction& interaction) {
    const auto sender = keyOf(interaction.sender);
    if (!sender) return std::nullopt;
    std::vector<std::string> participants{*sender};
    for (const auto& person : interaction.recipients) {
        participants.push_back(keyOf(person).value_or("UNKNOWN"));
    }
    std::ranges::sort(participants);
    return fmt::format("{}", fmt::join(participants, "_"));
}

std::vector<std::string> personIdentifiers(const std::vector<Interaction>& interactions) {
    std::set<std::string> identifiers;
    for (const auto& interaction : interactions) {
        if (interaction.sender.personId) identifiers.insert(*interaction.sender.personId);
        for (const auto& person : interaction.recipients) {
            if (person.personId) identifiers.insert(*person.personId);
        }
    }
    return {identifiers.begin(), identifiers.end()};
}

/// What is known of one group of people.
struct Group {
    std::vector<Interaction> interactions;
    std::optional<double> bestScore;
    std::optional<RankedContact> bestContact;
};

using Groups = std::map<std::string, Group>;

Groups groupsOf(const std::vector<Interaction>& interactions,
                const KSSignificantContactManager::RankedContacts& ranked) {
    Groups groups;
    for (const auto& interaction : interactions) {
        const auto key = conversationKey(interaction);
        if (!key) continue;
        auto& group = groups[*key];
        group.interactions.push_back(interaction);
        const auto found = ranked.find(*keyOf(interaction.sender));
        const double score = found == ranked.end() ? 0.0 : found->second.score;
        if (group.bestScore && score <= *group.bestScore) continue;
        group.bestScore = score;
        group.bestContact.reset();
        if (found != ranked.end()) group.bestContact = found->second;
    }
    return groups;
}

/// The runs of interactions of which none starts on a later day than the one before it ended.
std::vector<std::vector<Interaction>> dayRuns(std::vector<Interaction> interactions) {
    std::ranges::stable_sort(interactions, {}, [](const auto& one) { return one.startDate; });
    std::vector<std::vector<Interaction>> runs;
    for (auto& interaction : interactions) {
        const bool goesOn =
            !runs.empty() && KSExtensions::startOfDay(interaction.startDate) ==
                                 KSExtensions::startOfDay(runs.back().back().endDate);
        if (!goesOn) runs.emplace_back();
        runs.back().push_back(std::move(interaction));
    }
    return runs;
}

}  // namespace

KSSignificantContactManager::KSSignificantContactManager(
    InteractionStore& interactionStore, ContactStore& contactStore,
    std::shared_ptr<KSEventStore> keepsakeStore, Clock& clock)
    : interactionStore_(interactionStore),
      contactStore_(contactStore),
      keepsakeStore_(std::move(keepsakeStore)),
      clock_(clock),
      queue_("KSSignificantContactManager") {}

std::shared_ptr<KSSignificantContactManager> KSSignificantContactManager::initWithUniverse(
    const ServiceLookup& universe) {
    const auto& platform = universe.platform();
    return initWithInteractionStore(platform.interactionStore, platform.contactStore,
                                    universe.service<KSEventStore>("EventStore"), *platform.clock);
}

std::shared_ptr<KSSignificantContactManager> KSSignificantContactManager::initWithInteractionStore(
    InteractionStore* interactionStore, ContactStore* contactStore,
    std::shared_ptr<KSEventStore> keepsakeStore, Clock& clock) {
    if (!assertParameter(keepsakeStore != nullptr, "keepsakeStore", kUnit, 58)) return nullptr;
    if (!interactionStore || !contactStore) return nullptr;
    return std::shared_ptr<KSSignificantContactManager>(new KSSignificantContactManager(
        *interactionStore, *contactStore, std::move(keepsakeStore), clock));
}

void KSSignificantContactManager::fetchInteractionsBetweenStartDate(KSDate start, KSDate end,
                                                                    InteractionsHandler handler) {
    queue_.async([this, start, end, handler = std::move(handler)] {
        auto interactions = interactionStore_.queryInteractions({.startsFrom = start,
                                                                 .endsUntil = end,
                                                                 .mechanisms = kPersonalMechanisms,
                                                                 .limit = kMostInteractions});
        if (!interactions) {
            logWarning(interactions.error().description());
            return;
        }
        std::ranges::reverse(*interactions);
        handler(*interactions);
    });
}

void KSSignificantContactManager::fetchRankedContactsWithIdentifiers(
    const std::vector<std::string>& identifiers,
    const std::function<void(const RankedContacts&)>& handler) const {
    RankedContacts byPerson;
    auto contacts = contactStore_.rankedContacts(identifiers);
    if (!contacts) {
        logWarning(contacts.error().description());
        handler(byPerson);
        return;
    }
    for (auto& contact : *contacts) {
        if (!(contact.score >= kLeastScore)) continue;
        auto person = contact.identifier;
        if (person.starts_with(kContactPrefix)) person.erase(0, kContactPrefix.size());
        byPerson.insert_or_assign(std::move(person), std::move(contact));
    }
    handler(byPerson);
}

KSSignificantContactManager::Conversations
KSSignificantContactManager::conversationsFromInteractions(
    const std::vector<Interaction>& interactions) const {
    Groups groups;
    fetchRankedContactsWithIdentifiers(personIdentifiers(interactions),
                                       [&groups, &interactions](const RankedContacts& ranked) {
                                           groups = groupsOf(interactions, ranked);
                                       });
    Conversations conversations;
    for (auto& [key, group] : groups) {
        if (!group.bestContact || *group.bestScore < kLeastScore) continue;
        for (auto& run : dayRuns(std::move(group.interactions))) {
            conversations.push_back(KSConversation::conversationWithContactIdentifier(
                key, group.bestContact, std::move(run)));
        }
    }
    return conversations;
}

std::shared_ptr<KSEvent> KSSignificantContactManager::createEventFromConversation(
    const KSConversation& conversation) const {
    const auto& interactions = conversation.interactions();
    if (!assertParameter(!interactions.empty(), "interactions.count > 0", kUnit, 233)) {
        return nullptr;
    }
    const KSDate now = clock_.now();
    auto event = KSEvent::initWithEventIdentifier(
        KSUUID::random(), interactions.front().startDate, interactions.back().endDate, now,
        KSEventProvider::foresight, KSEventCategory::significantContact);
    event->expirationDate = now + lifetime::kFourWeeks;
    event->identifierFromProvider = _providerIdOfConversation(conversation);
    return event;
}

std::string KSSignificantContactManager::_providerIdOfConversation(
    const KSConversation& conversation) {
    std::string joined;
    for (const auto& interaction : conversation.interactions()) {
        if (!joined.empty()) joined += '|';
        joined += interaction.uuid;
    }
    return identifierHash(joined);
}

void KSSignificantContactManager::saveConversations(const Conversations& conversations,
                                                    const ResultHandler& handler) {
    KSDate earliest = KSDate::distantFuture();
    for (const auto& conversation : conversations) {
        earliest = std::min(earliest, conversation->interactions().front().startDate);
    }
    const auto stored =
        storedIdentifiers(*keepsakeStore_, earliest, KSEventCategory::significantContact);
    if (!stored) {
        handler(stored.error(), {});
        return;
    }
    KSEventArray fresh;
    for (const auto& conversation : conversations) {
        if (stored->contains(_providerIdOfConversation(*conversation))) continue;
        fresh.push_back(createEventFromConversation(*conversation));
    }
    keepsakeStore_->storeEvents(fresh, handler);
}

void KSSignificantContactManager::fetchAndSaveConversationsBetweenStartDate(KSDate start,
                                                                            KSDate end,
                                                                            ResultHandler handler) {
    fetchInteractionsBetweenStartDate(
        start, end,
        [this, handler = std::move(handler)](const std::vector<Interaction>& interactions) {
            saveConversations(conversationsFromInteractions(interactions), handler);
        });
}

std::optional<KSSignificantContactManager::ConversationIndex>
KSSignificantContactManager::conversationsOfEvents(const KSEventArray& events) {
    const auto span = KSExtensions::getDurationOfKSEventArray(events);
    if (!span) return std::nullopt;
    const auto index = std::make_shared<std::optional<ConversationIndex>>();
    fetchInteractionsBetweenStartDate(
        span->start, span->end, [this, index](const std::vector<Interaction>& interactions) {
            index->emplace();
            for (auto& conversation : conversationsFromInteractions(interactions)) {
                (*index)->emplace(_providerIdOfConversation(*conversation), conversation);
            }
        });
    waitForQueueEmpty();
    return std::move(*index);
}

KSEventArray KSSignificantContactManager::rehydrateConversations(const KSEventArray& events) {
    KSEventArray refreshed;
    const auto conversations = conversationsOfEvents(events);
    if (!conversations) return refreshed;
    forEachFoundIn(*conversations, events, [&refreshed](const KSEvent& event, const auto& found) {
        auto filled = event.copy();
        // The narrow copy drops it, and a client that stores back what it fetched must not lose it.
        filled->identifierFromProvider = event.identifierFromProvider;
        filled->interactionContactScore = found->scoredContact()->score;
        filled->interactionScoredContact = encodeContact(*found->scoredContact());
        auto& interactions = filled->interactions.emplace();
        for (const auto& interaction : found->interactions()) {
            interactions.push_back(encodeInteraction(interaction));
        }
        refreshed.push_back(std::move(filled));
    });
    return refreshed;
}

void KSSignificantContactManager::removeConversationsDeletedAtSource(const KSEventArray& events,
                                                                     const ResultHandler& handler) {
    const auto conversations = conversationsOfEvents(events);
    if (!conversations) {
        handler(std::nullopt, {});
        return;
    }
    keepsakeStore_->removeEvents(eventsMissingIn(*conversations, events), handler);
}

void KSSignificantContactManager::waitForQueueEmpty() {
    queue_.sync([] {});
}

}  // namespace keepsakes
