// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>

#include "StoreFixture.h"
#include "core/MurmurHash3.h"
#include "sources/KSForesightTravelManager.h"
#include "sources/KSSuggestedEventManager.h"
#include "support/RecordedAssertions.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

SuggestedEvent suggestion(const std::string& identifier, double start,
                          SuggestionCategory category = SuggestionCategory::ticket) {
    return {.eventIdentifier = identifier,
            .startDate = {start},
            .endDate = {start + 100},
            .category = category,
            .title = "Title of " + identifier};
}

const Trip kLisbon{.startDate = {1000},
                   .endDate = {5000},
                   .title = "Lisbon, 3 to 7 May",
                   .tripParts = {{{"out1", "out2"}, "Lisbon"}, {{"hôtel"}, std::nullopt}}};

class CalendarSources : public StoreFixture {
  protected:
    CalendarSources() {
        universe->add("EventStore", store);
        trips = KSForesightTravelManager::initWithUniverse(*universe);
        suggested = KSSuggestedEventManager::initWithUniverse(*universe);
    }

    Answer collectTrips() {
        Answer answer;
        trips->fetchAndSaveTripsBetweenStartDate({0}, {1e6}, into(answer));
        WorkerThreads::shared().settle();
        return answer;
    }

    Answer collectSuggested() {
        Answer answer;
        suggested->fetchAndSaveSuggestedEventBetweenStartDate({0}, {1e6}, into(answer));
        WorkerThreads::shared().settle();
        return answer;
    }

    void failNext() { platform.profile.nextError = KSError::make("Profile", 1, "busy"); }

    std::shared_ptr<KSForesightTravelManager> trips;
    std::shared_ptr<KSSuggestedEventManager> suggested;
};

TEST_F(CalendarSources, StoreATripOnceAndFillItInAgain) {
    platform.profile.trips = {kLisbon};
    EXPECT_EQ(collectTrips(), (Answer{"", 1}));
    EXPECT_EQ(collectTrips(), (Answer{"", 0}));
    const auto stored = fetch({});
    ASSERT_EQ(stored.size(), 1u);
    EXPECT_EQ(stored[0]->provider(), KSEventProvider::foresight);
    EXPECT_EQ(stored[0]->category(), KSEventCategory::travel);
    EXPECT_EQ(stored[0]->startDate(), KSDate{1000});
    EXPECT_EQ(stored[0]->endDate(), KSDate{5000});
    EXPECT_EQ(stored[0]->expirationDate, platform.clock.now() + 2419200);
    EXPECT_EQ(stored[0]->identifierFromProvider, identifierHash("out1:out2|hôtel"));
    EXPECT_FALSE(stored[0]->tripTitle);

    // Neither title nor dates make another trip of it.
    platform.profile.trips[0].title = "Portugal";
    auto filled = trips->rehydratedTripEvents(stored);
    ASSERT_EQ(filled.size(), 1u);
    EXPECT_EQ(filled[0]->tripTitle, "Portugal");
    EXPECT_EQ(filled[0]->identifierFromProvider, stored[0]->identifierFromProvider);
    ASSERT_EQ(filled[0]->tripParts->size(), 2u);
    EXPECT_EQ(valueForKey(filled[0]->tripParts->at(0), "placemark"), KSValue("Lisbon"));
    EXPECT_EQ(valueForKey(filled[0]->tripParts->at(1), "eventIdentifiers"),
              KSValue(KSArray{"hôtel"}));

    // The other order is another journey.
    std::ranges::reverse(platform.profile.trips[0].tripParts);
    EXPECT_THAT(trips->rehydratedTripEvents(stored), IsEmpty());
    EXPECT_EQ(collectTrips(), (Answer{"", 1}));
    Answer removed;
    trips->removeTripEventsDeletedAtSource(fetch({}), into(removed));
    EXPECT_EQ(removed, (Answer{"", 1}));
    EXPECT_THAT(trips->rehydratedTripEvents({}), IsEmpty());
}

TEST_F(CalendarSources, StoreASuggestionOnceUnlessATripHasIt) {
    platform.profile.trips = {kLisbon};
    platform.profile.suggestedEvents = {
        suggestion("out1", 1000, SuggestionCategory::flight), suggestion("film", 2000),
        suggestion("party", 3000, SuggestionCategory::naturalLanguage),
        suggestion("dinner", 4000, SuggestionCategory::social)};
    platform.profile.suggestedEvents.push_back(suggestion("nameless", 4500));
    platform.profile.suggestedEvents.back().eventIdentifier.reset();
    EXPECT_EQ(collectSuggested(), (Answer{"", 3}));
    EXPECT_EQ(collectSuggested(), (Answer{"", 0}));
    const auto stored = fetch({.ascending = true});
    std::vector<std::string> told;
    for (const auto& event : stored) {
        told.push_back(*event->identifierFromProvider + " " + event->describeCategory());
        EXPECT_EQ(event->provider(), KSEventProvider::foresight);
        EXPECT_EQ(event->suggestedEventIdentifier, event->identifierFromProvider);
        EXPECT_EQ(event->expirationDate, platform.clock.now() + 2419200);
    }
    EXPECT_THAT(told, ElementsAre("film Structured Event", "party Social Event",
                                  "dinner Structured Event"));
}

TEST_F(CalendarSources, FillSuggestionsInFromTheCalendar) {
    platform.profile.suggestedEvents = {suggestion("film", 2000), suggestion("other", 3000)};
    collectSuggested();
    const auto stored = fetch({.ascending = true});
    platform.calendars.events = {{.eventIdentifier = "film",
                                  .title = "Kino",
                                  .startDate = {2000},
                                  .endDate = {2100},
                                  .location = "Graz",
                                  .attendees = {"Anna"}}};
    platform.profile.suggestedEvents[1].title.reset();
    const auto filled = suggested->rehydratedSuggestedEvents(stored);
    ASSERT_EQ(filled.size(), 2u);
    EXPECT_EQ(filled[0]->suggestedEventTitle, "Title of film");
    EXPECT_EQ(filled[0]->suggestedEventCategory, KSSuggestedEventCategoryTicket);
    EXPECT_EQ(filled[0]->suggestedEventIdentifier, "film");
    EXPECT_EQ(valueForKey(*filled[0]->suggestedEvent, "location"), KSValue("Graz"));
    EXPECT_EQ(valueForKey(*filled[0]->suggestedEvent, "attendees"), KSValue(KSArray{"Anna"}));
    EXPECT_FALSE(filled[1]->suggestedEventTitle);
    EXPECT_FALSE(filled[1]->suggestedEvent);
    suggested->rehydratedSuggestedEvents(stored);
    EXPECT_THAT(platform.calendars.opened, ElementsAre(128u));

    platform.profile.suggestedEvents.pop_back();
    EXPECT_EQ(suggested->rehydratedSuggestedEvents(stored).size(), 1u);
    Answer removed;
    suggested->removeSuggestedEventsDeletedAtSource(stored, into(removed));
    EXPECT_EQ(removed, (Answer{"", 1}));
    EXPECT_EQ(fetch({}).size(), 1u);
}

TEST_F(CalendarSources, TakeNothingFromAQueryThatFails) {
    platform.profile.trips = {kLisbon};
    platform.profile.suggestedEvents = {suggestion("film", 2000)};
    failNext();
    EXPECT_EQ(collectTrips(), (Answer{"", -1})) << "the handler is not called";
    ASSERT_EQ(collectTrips(), (Answer{"", 1}));
    ASSERT_EQ(collectSuggested(), (Answer{"", 1}));
    failNext();
    EXPECT_THAT(trips->rehydratedTripEvents(fetch({.category = KSEventCategory::travel})),
                IsEmpty());
    const auto films = fetch({.category = KSEventCategory::structuredEvent});
    failNext();
    EXPECT_THAT(suggested->rehydratedSuggestedEvents(films), IsEmpty());
    Answer removed;
    failNext();
    suggested->removeSuggestedEventsDeletedAtSource(films, into(removed));
    EXPECT_EQ(removed, (Answer{"", -1}));
    EXPECT_EQ(fetch({}).size(), 2u);
}

TEST_F(CalendarSources, NeedTheirStores) {
    RecordedAssertions assertions;
    auto& clock = platform.clock;
    EXPECT_EQ(KSForesightTravelManager::initWithProfileStore(&platform.profile, nullptr, clock),
              nullptr);
    EXPECT_EQ(KSSuggestedEventManager::initWithProfileStore(&platform.profile, &platform.calendars,
                                                            nullptr, clock),
              nullptr);
    EXPECT_THAT(assertions.takeDescriptions(),
                ElementsAre("Invalid parameter not satisfying: keepsakeStore",
                            "Invalid parameter not satisfying: keepsakeStore"));
    EXPECT_EQ(KSForesightTravelManager::initWithProfileStore(nullptr, store, clock), nullptr);
    EXPECT_EQ(
        KSSuggestedEventManager::initWithProfileStore(nullptr, &platform.calendars, store, clock),
        nullptr);
    EXPECT_THAT(assertions.takeDescriptions(), IsEmpty());
}

}  // namespace
}  // namespace keepsakes
