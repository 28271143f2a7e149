// SPDX-License-Identifier: Apache-2.0
#include "sources/KSTopicManager.h"

#include <gmock/gmock.h>

#include "StoreFixture.h"
#include "core/Calendar.h"
#include "support/RecordedAssertions.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;

constexpr const char* kHiking = "TN5KR8Z7ESDORJr1QSxzJFA";
constexpr const char* kFood = "TFZX59DDWR22CqH8gMQt4Lw";

class TopicManager : public StoreFixture {
  protected:
    TopicManager() {
        universe->add("EventStore", store);
        topics = KSTopicManager::initWithUniverse(*universe);
    }

    Answer collect(double start, double end) {
        Answer answer;
        topics->fetchAndSaveScoredTopicsBetweenStartDate({start}, {end}, into(answer));
        topics->waitForQueueEmpty();
        return answer;
    }

    std::shared_ptr<KSTopicManager> topics;
};

TEST_F(TopicManager, StoresOneEventForAnIntervalWithAHighTopic) {
    platform.topics.scores = {{kHiking, 0.549}, {kFood, 0.1}};
    EXPECT_EQ(collect(100, 200).error, "");
    EXPECT_TRUE(fetch({}).empty());
    platform.topics.scores = {{kHiking, 0.55}, {kFood, 0.9}, {"other", 1}};
    EXPECT_EQ(collect(100, 200), (Answer{"", 1}));
    EXPECT_THAT(platform.topics.asked.back(),
                testing::Pair("keepsakes-topics", TopicQuery{.fromDate = {100},
                                                             .toDate = {200},
                                                             .scoringDate = {200},
                                                             .decayRate = 0.000001,
                                                             .scoreWithBiases = false}));
    const auto asked = platform.topics.asked.size();
    EXPECT_EQ(collect(100, 200), (Answer{"", -1})) << "the interval has its event";
    EXPECT_EQ(platform.topics.asked.size(), asked);
    EXPECT_EQ(collect(100, 201), (Answer{"", 1}));
    EXPECT_EQ(collect(99, 200), (Answer{"", 1}));

    const auto stored = fetch({.ascending = true});
    ASSERT_EQ(stored.size(), 3u);
    const auto& event = *stored[1];
    EXPECT_EQ(event.startDate(), KSDate{100});
    EXPECT_EQ(event.provider(), KSEventProvider::foresight);
    EXPECT_EQ(event.category(), KSEventCategory::topic);
    EXPECT_EQ(event.creationDate(), platform.clock.now());
    EXPECT_EQ(event.expirationDate, platform.clock.now() + 2419200);
    EXPECT_EQ(event.scoredTopics, std::nullopt);
}

TEST_F(TopicManager, FillsEventsInAndRemovesThoseWithoutAHighTopic) {
    platform.topics.scores = {{kHiking, 0.9}};
    collect(100, 200);
    const auto stored = fetch({});
    platform.topics.scores = {{kHiking, 0.55}, {kFood, 0.5}};
    const auto filled = topics->rehydratedScoredTopicsEvents(stored);
    ASSERT_EQ(filled.size(), 1u);
    EXPECT_EQ(filled[0]->scoredTopics, (KSDictionary{{kHiking, 0.55}}));
    EXPECT_EQ(filled[0]->eventIdentifier(), stored[0]->eventIdentifier());
    EXPECT_EQ(platform.topics.asked.back().second.scoringDate, KSDate{200});

    platform.topics.nextError = KSError::make("Topics", 1, "not yet");
    EXPECT_TRUE(topics->rehydratedScoredTopicsEvents(stored).empty());
    EXPECT_EQ(fetch({}).size(), 1u) << "nobody knows its topics: that is no reason to remove it";
    platform.topics.scores = {{kHiking, 0.5}};
    EXPECT_TRUE(topics->rehydratedScoredTopicsEvents(stored).empty());
    EXPECT_TRUE(fetch({}).empty());
}

TEST_F(TopicManager, PassesErrorsOn) {
    platform.topics.nextError = KSError::make("Topics", 1, "not yet");
    EXPECT_EQ(collect(1, 2), (Answer{"not yet", -1}));
    EXPECT_TRUE(fetch({}).empty());
    RecordedAssertions assertions;
    EXPECT_EQ(KSTopicManager::initWithTopicStore(platform.topics, platform.clock, nullptr),
              nullptr);
    EXPECT_EQ(assertions.take().size(), 1u);
}

TEST(KSTopicManager, KnowsTheDayBefore) {
    const KSDate day = *calendar::dateOfDay(2024, 6, 15);
    const KSDate before = *calendar::dateOfDay(2024, 6, 14);
    for (const double seconds : {0.0, 3600.0, 86399.0}) {
        EXPECT_EQ(KSTopicManager::startOfDayBefore(day + seconds), before);
        EXPECT_EQ(KSTopicManager::endOfDayBefore(day + seconds), day - 1);
    }
}

}  // namespace
}  // namespace keepsakes
