// SPDX-License-Identifier: Apache-2.0
#include "sources/KSSignificantContactManager.h"

#include <fmt/format.h>
#include <gmock/gmock.h>

#include "StoreFixture.h"
#include "core/Calendar.h"
#include "core/MurmurHash3.h"
#include "support/RecordedAssertions.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::UnorderedElementsAre;

const InteractionPerson kOwner{std::nullopt, "OWNER"};
const InteractionPerson kAnna{"anna", "123456789"};
const InteractionPerson kBen{"ben", "ben@example.org"};
const InteractionPerson kStranger{std::nullopt, "900"};
const InteractionPerson kNobody{};

Interaction message(const std::string& uuid, double start, InteractionPerson sender,
                    std::vector<InteractionPerson> recipients = {kOwner},
                    InteractionMechanism mechanism = InteractionMechanism::textMessage) {
    return {.uuid = uuid,
            .startDate = {start},
            .endDate = {start + 10},
            .mechanism = mechanism,
            .direction = InteractionDirection::unknown,
            .sender = std::move(sender),
            .recipients = std::move(recipients)};
}

class SignificantContacts : public StoreFixture {
  protected:
    SignificantContacts() {
        universe->add("EventStore", store);
        contacts = KSSignificantContactManager::initWithUniverse(*universe);
        platform.contacts.contacts = {{"CN:anna", "Anna", 0.9}, {"ben", "Ben", 0.5}};
    }

    Answer collect(double start = 0, double end = 1e9) {
        Answer answer;
        contacts->fetchAndSaveConversationsBetweenStartDate({start}, {end}, into(answer));
        WorkerThreads::shared().settle();
        return answer;
    }

    /// Each conversation as "<key> <best contact>: <uuids>".
    std::vector<std::string> conversations(const std::vector<Interaction>& interactions) {
        std::vector<std::string> told;
        for (const auto& one : contacts->conversationsFromInteractions(interactions)) {
            auto text = fmt::format("{} {}:", one->contactIdentifier(), one->scoredContact()->name);
            for (const auto& interaction : one->interactions()) text += " " + interaction.uuid;
            told.push_back(std::move(text));
        }
        return told;
    }

    std::shared_ptr<KSSignificantContactManager> contacts;
};

TEST_F(SignificantContacts, GroupsByTheParticipantsWhoeverOfThemWrites) {
    EXPECT_THAT(conversations({message("1", 100, kAnna), message("2", 200, kOwner, {kAnna}),
                               message("3", 300, kBen, {kOwner, kAnna}),
                               message("4", 400, kAnna, {kBen, kOwner})}),
                UnorderedElementsAre("OWNER_anna Anna: 1 2", "OWNER_anna_ben Anna: 3 4"));
    EXPECT_THAT(conversations({message("1", 100, kOwner, {kAnna})}), IsEmpty())
        << "only those who write themselves count";
    EXPECT_THAT(conversations({message("1", 100, kStranger), message("2", 100, kNobody)}),
                IsEmpty());
    EXPECT_THAT(conversations({message("1", 100, kAnna, {kNobody, kOwner, kNobody})}),
                ElementsAre("OWNER_UNKNOWN_UNKNOWN_anna Anna: 1"));
}

TEST_F(SignificantContacts, KeepsTheFirstOfTheBestContacts) {
    platform.contacts.contacts = {{"CN:anna", "Anna", 0.7}, {"CN:ben", "Ben", 0.7}};
    EXPECT_THAT(conversations({message("1", 100, kBen, {kAnna}), message("2", 200, kAnna, {kBen})}),
                ElementsAre("anna_ben Ben: 1 2"));
    for (const auto& [score, count] : {std::pair(0.5, 1u), {0.4999, 0u}, {NAN, 0u}}) {
        platform.contacts.contacts = {{"anna", "Anna", score}};
        EXPECT_EQ(conversations({message("1", 100, kAnna)}).size(), count) << score;
    }
    platform.contacts.nextError = KSError::make("Contacts", 1, "no book");
    EXPECT_THAT(conversations({message("1", 100, kAnna)}), IsEmpty());
}

TEST_F(SignificantContacts, ADayThatBeganAfterTheLastOneEndedIsAConversationOfItsOwn) {
    const auto midnight = calendar::dateOfDay(2024, 6, 15)->seconds;
    auto overMidnight = message("call", midnight - 5, kAnna);
    EXPECT_THAT(conversations({message("late", midnight - 60, kAnna), overMidnight,
                               message("early", midnight + 60, kAnna)}),
                ElementsAre("OWNER_anna Anna: late call early"));
    EXPECT_THAT(conversations({message("early", midnight + 60, kAnna),
                               message("late", midnight - 60, kAnna)}),
                ElementsAre("OWNER_anna Anna: late", "OWNER_anna Anna: early"));
}

TEST_F(SignificantContacts, AsksForTheLatestOfTheElevenMechanisms) {
    auto& stored = platform.interactions.interactions;
    for (int i = 0; i < 2600; ++i) stored.push_back(message(std::to_string(i), i, kAnna));
    stored[2599].mechanism = InteractionMechanism::bulkMail;
    std::vector<std::string> uuids;
    contacts->fetchInteractionsBetweenStartDate(
        {50}, {2598 + 10}, [&uuids](const std::vector<Interaction>& interactions) {
            for (const auto& one : interactions) uuids.push_back(one.uuid);
        });
    contacts->waitForQueueEmpty();
    ASSERT_EQ(uuids.size(), 2500u);
    EXPECT_EQ(uuids.front(), "99");
    EXPECT_EQ(uuids.back(), "2598");
    std::vector<int> numbers;
    for (const auto mechanism : platform.interactions.asked.at(0).mechanisms) {
        numbers.push_back(static_cast<int>(mechanism));
    }
    EXPECT_THAT(numbers, ElementsAre(0, 2, 3, 4, 8, 9, 10, 11, 12, 16, 17));
}

TEST_F(SignificantContacts, StoresEachConversationOnceAndFillsItInAgain) {
    platform.interactions.interactions = {message("a", 100, kAnna),
                                          message("b", 200, kOwner, {kAnna})};
    EXPECT_EQ(collect(), (Answer{"", 1}));
    EXPECT_EQ(collect(), (Answer{"", 0}));
    const auto stored = fetch({});
    ASSERT_EQ(stored.size(), 1u);
    EXPECT_EQ(stored[0]->provider(), KSEventProvider::foresight);
    EXPECT_EQ(stored[0]->category(), KSEventCategory::significantContact);
    EXPECT_EQ(stored[0]->startDate(), KSDate{100});
    EXPECT_EQ(stored[0]->endDate(), KSDate{210});
    EXPECT_EQ(stored[0]->expirationDate, platform.clock.now() + 2419200);
    EXPECT_EQ(stored[0]->identifierFromProvider, identifierHash("a|b"));

    const auto filled = contacts->rehydrateConversations(stored);
    ASSERT_EQ(filled.size(), 1u);
    EXPECT_EQ(filled[0]->interactionContactScore, 0.9);
    EXPECT_EQ(valueForKey(*filled[0]->interactionScoredContact, "name"), KSValue("Anna"));
    EXPECT_EQ(filled[0]->interactions->size(), 2u);
    EXPECT_EQ(filled[0]->identifierFromProvider, stored[0]->identifierFromProvider);
    EXPECT_EQ(filled[0]->eventIdentifier(), stored[0]->eventIdentifier());

    platform.interactions.interactions.push_back(message("c", 150, kAnna));
    EXPECT_THAT(contacts->rehydrateConversations(stored), IsEmpty());
    EXPECT_THAT(contacts->rehydrateConversations({}), IsEmpty());
}

TEST_F(SignificantContacts, RemovesWhatIsGoneButNotWhatCouldNotBeAsked) {
    platform.interactions.interactions = {message("a", 100, kAnna), message("b", 200, kBen)};
    EXPECT_EQ(collect(), (Answer{"", 2}));
    const auto stored = fetch({.ascending = true});
    const auto remove = [&] {
        Answer answer;
        contacts->removeConversationsDeletedAtSource(stored, into(answer));
        return answer;
    };
    platform.interactions.nextError = KSError::make("Interactions", 1, "busy");
    EXPECT_EQ(remove(), (Answer{"", -1}));
    EXPECT_EQ(fetch({}).size(), 2u);
    platform.interactions.nextError = KSError::make("Interactions", 1, "busy");
    EXPECT_THAT(contacts->rehydrateConversations(stored), IsEmpty());

    platform.interactions.interactions.erase(platform.interactions.interactions.begin());
    EXPECT_EQ(remove(), (Answer{"", 1}));
    const auto left = fetch({});
    ASSERT_EQ(left.size(), 1u);
    EXPECT_EQ(left[0]->identifierFromProvider, identifierHash("b"));
}

TEST_F(SignificantContacts, AFailedQueryNeverAnswers) {
    platform.interactions.nextError = KSError::make("Interactions", 1, "busy");
    EXPECT_EQ(collect(), (Answer{"", -1}));
}

TEST_F(SignificantContacts, NeedTheirStores) {
    RecordedAssertions assertions;
    auto& clock = platform.clock;
    EXPECT_EQ(KSSignificantContactManager::initWithInteractionStore(
                  &platform.interactions, &platform.contacts, nullptr, clock),
              nullptr);
    EXPECT_THAT(assertions.takeDescriptions(),
                ElementsAre("Invalid parameter not satisfying: keepsakeStore"));
    EXPECT_EQ(KSSignificantContactManager::initWithInteractionStore(nullptr, &platform.contacts,
                                                                    store, clock),
              nullptr);
    EXPECT_EQ(KSSignificantContactManager::initWithInteractionStore(&platform.interactions, nullptr,
                                                                    store, clock),
              nullptr);
    EXPECT_THAT(assertions.takeDescriptions(), IsEmpty());
}

}  // namespace
}  // namespace keepsakes
