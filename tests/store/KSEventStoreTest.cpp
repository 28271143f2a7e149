// SPDX-License-Identifier: Apache-2.0
#include "store/KSEventStore.h"

#include <gmock/gmock.h>

#include "StoreFixture.h"
#include "support/SampleRecords.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using Store = StoreFixture;

TEST_F(Store, StoringTheSameIdentifierUpdatesItsRow) {
    EXPECT_EQ(storeAll({makeWorkout(1, 10, 20, "Running"), makeWorkout(1, 30, 40, "Cycling")}),
              (Answer{"", 2}));
    EXPECT_EQ(storeAll({makeWorkout(1, 50, 60, "Hiking")}), (Answer{"", 1}));
    const auto stored = fetch({});
    ASSERT_EQ(numbersOf(stored), std::vector{1});
    EXPECT_EQ(stored[0]->workoutType, "Hiking");
    EXPECT_EQ(stored[0]->startDate(), KSDate{50});
    EXPECT_EQ(storeAll({}), (Answer{"", 0}));

    Answer answer;
    store->storeEvent(makeWorkout(1, 70, 80, "Yoga"), into(answer));
    EXPECT_EQ(answer, (Answer{"", 1}));
    EXPECT_EQ(fetch({}).size(), 2u) << "storeEvent does not look for an older row";
    storeAll({makeWorkout(1, 90, 95, "Last")});
    EXPECT_EQ(fetch({.ascending = true})[1]->workoutType, "Last") << "the last row is the one";
    store->storeEvent(nullptr, into(answer));
    EXPECT_EQ(answer, (Answer{"", 0}));
}

TEST_F(Store, KeepsWhatItsColumnsHoldAndNothingElse) {
    const auto event = samples::fullEvent(1);
    event->itemAuthorAddresses = {""};
    event->itemAccountHandles = {std::string("a\0b", 3)};
    storeAll({event});
    open();
    const auto stored = fetch({}).at(0);

    const auto expected = samples::fullEvent(1);
    expected->location.reset();
    expected->placeUserType = 0;
    expected->placeDiscovery = 0;
    expected->extendedAttributes = nullptr;
    expected->suggestedEvent.reset();
    expected->tripParts.reset();
    expected->mediaType.reset();
    expected->mediaArtist.reset();
    expected->mediaSumTimePlayed.reset();
    expected->itemLinkTitle.reset();
    expected->itemLinkDescription.reset();
    expected->interactionScoredContact.reset();
    expected->interactions.reset();
    expected->scoredTopics.reset();
    // One empty string comes back as none, and a string with U+0000 as two.
    expected->itemAuthorAddresses = std::vector<std::string>{};
    expected->itemAccountHandles = {"a", "b"};
    EXPECT_EQ(archiveOf(*stored).description(), archiveOf(*expected).description());

    storeAll({makeWorkout(2, 900000000, 900000600, "Running")});
    const auto bare = fetch({.ascending = false}).at(0);
    EXPECT_EQ(bare->sourceCreationDate(), KSDate{900000600});
    EXPECT_EQ(bare->itemAuthorAddresses, std::nullopt);
}

TEST_F(Store, FetchesByOverlapCategoryOrderAndLimit) {
    storeAll({makeWorkout(1, 10, 20, "a"), makeWorkout(2, 30, 40, "b"), makeVisit(3, 15, 35, "c"),
              makeWorkout(4, 5, 100, "d")});
    struct Row {
        KSEventFetchOptions options;
        std::vector<int> numbers;
    };
    const Row rows[] = {
        {{.ascending = true}, {4, 1, 3, 2}},
        {{.ascending = false}, {2, 3, 1, 4}},
        {{.dateInterval = KSDateInterval{{20}, {25}}, .ascending = true}, {4, 1, 3}},
        {{.dateInterval = KSDateInterval{{0}, {10}}, .ascending = true}, {4, 1}},
        {{.dateInterval = KSDateInterval{{101}, {200}}}, {}},
        {{.ascending = true, .category = KSEventCategory::visit}, {3}},
        {{.dateInterval = KSDateInterval{{36}, {50}},
          .ascending = true,
          .category = KSEventCategory::workout,
          .limit = 1},
         {4}},
        {{.ascending = true, .limit = 0}, {}},
        {{.ascending = true, .limit = 1e300}, {4, 1, 3, 2}},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(numbersOf(fetch(row.options)), row.numbers) << row.options.description();
    }
}

TEST_F(Store, FindsTheLastOfCategoriesAndThoseAfterADate) {
    storeAll({makeWorkout(1, 10, 20, "a"), makeWorkout(2, 30, 40, "b"), makeVisit(3, 50, 60, "c")});
    const auto last = [this](std::vector<KSEventCategory> categories) {
        KSEventPointer found;
        store->fetchLastEventOfCategories(
            categories,
            [&found](const KSEventPointer& event, const OptionalError&) { found = event; });
        return found ? numbersOf({found}) : std::vector<int>{};
    };
    EXPECT_EQ(last({KSEventCategory::workout}), std::vector{2});
    EXPECT_EQ(last({KSEventCategory::workout, KSEventCategory::visit}), std::vector{3});
    EXPECT_EQ(last({KSEventCategory::topic}), std::vector<int>{});
    EXPECT_EQ(last({}), std::vector<int>{});
    store->fetchEventsWithStartDateAfter({10}, KSEventCategory::workout,
                                         [](const KSEventArray& events, const OptionalError&) {
                                             EXPECT_EQ(numbersOf(events), (std::vector{1, 2}));
                                         });
}

TEST_F(Store, RemovesWhatItIsToldAndNoMore) {
    const auto expired = makeWorkout(1, 10, 20, "a");
    expired->expirationDate = platform.clock.now() - 1;
    const auto kept = makeWorkout(2, 10, 20, "b");
    kept->expirationDate = platform.clock.now() + 1;
    const auto lasting = makeWorkout(3, 10, 20, "c");
    storeAll({expired, kept, lasting, makeWorkout(4, 1, 2, "d")});
    Answer answer;
    store->purgeExpiredEvents(into(answer));
    EXPECT_EQ(answer, (Answer{"", 1}));
    execute("UPDATE KSEventMO SET provider = 0 WHERE workoutType = 'd'");
    EXPECT_EQ(fetch({}).size(), 2u) << "a row of unknown provider is no event";
    store->purgeUnknownEvents(into(answer));
    EXPECT_EQ(answer, (Answer{"", 1}));
    store->removeEvents({kept, makeWorkout(9, 1, 2, "never stored")}, into(answer));
    EXPECT_EQ(answer, (Answer{"", 1}));
    store->removeAllEvents(into(answer));
    EXPECT_EQ(answer, (Answer{"", 1}));
    EXPECT_TRUE(fetch({}).empty());
}

TEST_F(Store, ComparesTrendsByWhatTheyMeasure) {
    const auto trend = [](const char* keyword, int duration) {
        auto event = makeEvent(1, 1, 2, KSEventProvider::postAnalytics, KSEventCategory::workout);
        event->trends = KSDictionary{{"keyword", keyword},
                                     {"aggregationDuration", duration},
                                     {"aggregationMethod", 1},
                                     {"valueFunctionType", 2},
                                     {"mean", duration * 7}};
        return event;
    };
    EXPECT_TRUE(KSEventStore::isEqualTrendsData(*trend("a", 1), *trend("a", 1)));
    EXPECT_FALSE(KSEventStore::isEqualTrendsData(*trend("a", 1), *trend("b", 1)));
    EXPECT_FALSE(KSEventStore::isEqualTrendsData(*trend("a", 1), *trend("a", 2)));
}

}  // namespace
}  // namespace keepsakes
