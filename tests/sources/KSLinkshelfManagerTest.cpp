// SPDX-License-Identifier: Apache-2.0
#include "sources/KSLinkshelfManager.h"

#include <fmt/format.h>
#include <gmock/gmock.h>

#include "StoreFixture.h"
#include "support/RecordedAssertions.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

const KSDate kNoon = parseISO8601("2024-06-14T12:00:00Z")->date;

SearchableItem link(const std::string& identifier, KSDate created) {
    return {{"uniqueIdentifier", identifier}, {"contentCreationDate", created}};
}

class Linkshelf : public StoreFixture {
  protected:
    Linkshelf() {
        universe->add("EventStore", store);
        links = KSLinkshelfManager::initWithUniverse(*universe);
        platform.defaults.values["com.brindle.Sharelane/LinkshelfEnabled"] = true;
    }

    Answer collect() {
        Answer answer;
        links->fetchAndSaveSharedContentBetweenStartDate(kNoon - 3600, kNoon + 3600.5,
                                                         into(answer));
        links->waitForQueueEmpty();
        return answer;
    }

    Answer remove(const KSEventArray& events) {
        Answer answer;
        links->removeSharedContentsDeletedAtSource(events, into(answer));
        return answer;
    }

    std::shared_ptr<KSLinkshelfManager> links;
};

TEST_F(Linkshelf, AsksForHighlightedLinksAlone) {
    const std::string dates =
        "InRange(contentCreationDate, iso(2024-06-14T11:00:00Z), iso(2024-06-14T13:00:00.500Z))";
    EXPECT_EQ(collect(), (Answer{"", 0}));
    ASSERT_EQ(platform.search.asked.size(), 2u);
    const auto& chats = platform.search.asked[0];
    EXPECT_EQ(chats.queryString, "com_brindle_parley_isChatAutoDonating=1");
    EXPECT_THAT(chats.fetchAttributes, ElementsAre("accountIdentifier"));
    const auto& asked = platform.search.asked[1];
    EXPECT_EQ(asked.queryString,
              "com_brindle_parley_indexType=\"lnk\" && URL=* &&"
              " com_brindle_parley_isHighlightedContent=2 && " +
                  dates);
    EXPECT_THAT(asked.bundleIDs, ElementsAre("com.brindle.Parley"));
    EXPECT_EQ(asked.fetchAttributes.size(), 17u);

    platform.search.donatingChats = {{{"other", 1}}, {{"accountIdentifier", "anna@x.org"}}};
    collect();
    EXPECT_EQ(platform.search.asked.at(3).queryString,
              "com_brindle_parley_indexType=\"lnk\" && URL=* &&"
              " InRange(com_brindle_parley_isHighlightedContent, 1, 2) && " +
                  dates);
    platform.search.donatingChats = {{{"other", 1}}};
    collect();
    EXPECT_THAT(platform.search.asked.at(5).queryString, HasSubstr("isHighlightedContent=2"));
}

TEST_F(Linkshelf, AsksNothingUnlessTheOwnerWantsIt) {
    platform.search.items = {link("a", kNoon)};
    EXPECT_EQ(collect(), (Answer{"", 1}));
    const auto stored = fetch({});
    platform.search.asked.clear();
    for (const auto& value : {KSValue(), KSValue(false), KSValue("maybe"), KSValue(0)}) {
        platform.defaults.values["com.brindle.Sharelane/LinkshelfEnabled"] = value;
        EXPECT_EQ(collect(), (Answer{"", 0}));
    }
    EXPECT_THAT(links->rehydratedSharedContentEvents(stored), IsEmpty());
    EXPECT_EQ(remove(stored), (Answer{"", 1})) << "what was switched off is taken away";
    EXPECT_THAT(platform.search.asked, IsEmpty());
}

TEST_F(Linkshelf, StoresWhatIsLaterThanTheNewestStored) {
    platform.search.items = {link("a", kNoon),
                             link("b", kNoon + 60),
                             {{"uniqueIdentifier", "c"}},
                             {{"contentCreationDate", kNoon}}};
    EXPECT_EQ(collect(), (Answer{"", 2}));
    platform.search.items.push_back(link("late", kNoon + 30));
    platform.search.items.push_back(link("same", kNoon + 60));
    platform.search.items.push_back(link("new", kNoon + 61));
    EXPECT_EQ(collect(), (Answer{"", 1}));
    const auto stored = fetch({.ascending = true});
    ASSERT_EQ(stored.size(), 3u);
    EXPECT_EQ(stored[0]->startDate(), kNoon);
    EXPECT_EQ(stored[0]->endDate(), kNoon);
    EXPECT_EQ(stored[0]->provider(), KSEventProvider::foresight);
    EXPECT_EQ(stored[0]->category(), KSEventCategory::linkshelf);
    EXPECT_EQ(stored[0]->expirationDate, platform.clock.now() + 2419200);
    EXPECT_EQ(stored[0]->identifierFromProvider, "a");
    EXPECT_EQ(stored[2]->identifierFromProvider, "new");
}

TEST_F(Linkshelf, FillsInWhatTheItemHas) {
    auto full = link("a", kNoon);
    full.merge(SearchableItem{{"URL", "https://x.org"},
                              {"authorAddresses", KSArray{"anna@x.org"}},
                              {"authorContactIdentifiers", KSArray{"anna"}},
                              {"accountHandles", KSArray{"me@x.org"}},
                              {"recipientAddresses", KSArray{"me@x.org", "bo@x.org"}},
                              {"displayName", "Anna"},
                              {"com_brindle_parley_lpTitle", KSArray{"Title", "no"}},
                              {"com_brindle_parley_lpDescription", KSArray{"About"}},
                              {"isShared", true},
                              {"syndicationStatus", 2}});
    platform.search.items = {full, link("bare", kNoon), link("gone", kNoon)};
    EXPECT_EQ(collect(), (Answer{"", 3}));
    const auto stored = fetch({});
    platform.search.items.pop_back();
    const auto filled = links->rehydratedSharedContentEvents(stored);
    EXPECT_THAT(platform.search.asked.back().queryString,
                HasSubstr("iso(2024-06-14T11:59:59Z), iso(2024-06-14T12:00:01Z)"));
    ASSERT_EQ(filled.size(), 2u);
    const auto find = [&filled](const std::string& identifier) {
        return *std::ranges::find_if(filled, [&identifier](const auto& event) {
            return event->identifierFromProvider == identifier;
        });
    };
    const auto event = find("a");
    EXPECT_EQ(event->itemUniqueIdentifier, "a");
    EXPECT_EQ(event->itemURL, "https://x.org");
    EXPECT_EQ(event->itemContentCreationDate, kNoon);
    EXPECT_THAT(*event->itemAuthorAddresses, ElementsAre("anna@x.org"));
    EXPECT_THAT(*event->itemAuthorContactIdentifiers, ElementsAre("anna"));
    EXPECT_THAT(*event->itemAccountHandles, ElementsAre("me@x.org"));
    EXPECT_THAT(*event->itemRecipientAddresses, ElementsAre("me@x.org", "bo@x.org"));
    EXPECT_EQ(event->itemDisplayName, "Anna");
    EXPECT_EQ(event->itemLinkTitle, "Title");
    EXPECT_EQ(event->itemLinkDescription, "About");
    EXPECT_TRUE(event->itemIsShared);
    EXPECT_EQ(event->itemSyndicationStatus, 2u);
    EXPECT_TRUE(event->expirationDate);
    const auto bare = find("bare");
    EXPECT_FALSE(bare->itemURL || bare->itemAuthorAddresses || bare->itemLinkTitle);
    EXPECT_THAT(links->rehydratedSharedContentEvents({}), IsEmpty());
}

TEST_F(Linkshelf, RemovesWhatIsGoneButNotWhatCouldNotBeAsked) {
    platform.search.items = {link("a", kNoon), link("b", kNoon + 60)};
    EXPECT_EQ(collect(), (Answer{"", 2}));
    const auto stored = fetch({});
    platform.search.items.pop_back();
    const auto broken = KSError::make("Search", 1, "broken");
    platform.search.nextError = broken;
    EXPECT_EQ(remove(stored),
              (Answer{"nil query result from shared content fetching, no events removed", -1}));
    EXPECT_EQ(fetch({}).size(), 2u);
    platform.search.nextError = broken;
    EXPECT_THAT(links->rehydratedSharedContentEvents(stored), IsEmpty());
    platform.search.nextError = broken;
    EXPECT_EQ(collect(), Answer{}) << "it is not called";
    EXPECT_EQ(remove(stored), (Answer{"", 1}));
    EXPECT_THAT(platform.search.asked.back().queryString,
                HasSubstr("iso(2024-06-14T12:00:00Z), iso(2024-06-14T12:01:00Z)"));
    ASSERT_EQ(fetch({}).size(), 1u);
    EXPECT_EQ(fetch({})[0]->identifierFromProvider, "a");
}

TEST_F(Linkshelf, NeedsTheEventStore) {
    RecordedAssertions assertions;
    const TestUniverse empty(platform.services);
    EXPECT_EQ(KSLinkshelfManager::initWithUniverse(empty), nullptr);
    EXPECT_THAT(
        assertions.takeDescriptions(),
        ElementsAre("Invalid parameter not satisfying: [universe getService:@\"EventStore\"]"));
    platform.services.searchIndex = nullptr;
    EXPECT_EQ(KSLinkshelfManager::initWithUniverse(*universe), nullptr);
    EXPECT_THAT(assertions.takeDescriptions(), IsEmpty());
}

}  // namespace
}  // namespace keepsakes
