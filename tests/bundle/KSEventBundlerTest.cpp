// SPDX-License-Identifier: Apache-2.0
#include "bundle/KSEventBundler.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <random>

#include "bundle/BundleRules.h"
#include "bundle/KSGraph.h"
#include "platform/ActivityCatalogue.h"
#include "support/RecordedAssertions.h"
#include "support/TestEvents.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::UnorderedElementsAre;

constexpr double kHour = 3600;

/// "<rule>: <numbers of its events>" of each bundle, in order.
std::vector<std::string> bundlesOf(KSEventArray events) {
    const auto bundler = KSEventBundler::initWithStartDate(KSDate{0}, KSDate{1e6}, KSDate{1e6});
    const auto clusters = bundler->calculateEventBundlesFromEvents(events);
    std::vector<std::string> texts;
    for (const auto& [number, bundle] : bundler->pruneEventBundles(clusters)) {
        EXPECT_EQ(number, static_cast<int>(texts.size()) + 1);
        EXPECT_TRUE(bundle->filtered);
        std::string text = bundle->bundleType + ":";
        for (const auto& event : bundle->events) {
            text += " " + std::to_string(event->eventIdentifier().bytes[15]);
        }
        texts.push_back(text);
    }
    return texts;
}

KSEventPointer hike() { return makeWorkout(1, 10 * kHour, 12 * kHour, "Hiking"); }

KSEventPointer media(double repetitions) {
    auto event = makeEvent(1, 1, 2, KSEventProvider::foresight, KSEventCategory::mediaOnRepeat);
    event->mediaRepetitions = repetitions;
    return event;
}

KSEventPointer contact(double score) {
    auto event =
        makeEvent(1, 1, 2, KSEventProvider::foresight, KSEventCategory::significantContact);
    event->interactionContactScore = score;
    return event;
}

KSEventPointer structured(std::uint64_t category) {
    auto event = makeEvent(1, 1, 2, KSEventProvider::foresight, KSEventCategory::structuredEvent);
    event->suggestedEventCategory = category;
    return event;
}

struct RuleCase {
    const char* name;
    KSEventArray events;
    std::vector<std::string> bundles;
};

TEST(BundleRules, EachRuleTakesItsEventsAndNoOthers) {
    const auto photosIn = [](double from, double to, std::vector<std::string> words) {
        return makePhotos(2, from * kHour, to * kHour, std::move(words));
    };
    const RuleCase rows[] = {
        {"hike with photos of mountains",
         {hike(), photosIn(11, 11.5, {"mountain"})},
         {"HikingPlusPhotos: 1 2", "CardioActivity: 1"}},
        {"touching is not overlapping",
         {hike(), photosIn(12, 12.5, {"mountain"})},
         {"CardioActivity: 1"}},
        {"photos of something else",
         {hike(), photosIn(11, 11.5, {"museum"})},
         {"CardioActivity: 1"}},
        {"photos of nobody knows what", {makePhotos(2, 1, 2, {})}, {}},
        {"baby on a walk",
         {makeWorkout(1, 10 * kHour, 12 * kHour, "Walking"), photosIn(11, 11.5, {"baby"})},
         {"ActiveBabyParent: 1 2", "BabyParent: 2"}},
        {"pet at yoga",
         {makeWorkout(1, 0, kHour, "Yoga"), photosIn(0.5, 0.6, {"pet"})},
         {"ActivePetParent: 1 2", "PetParent: 2"}},
        {"wedding, birthday, anniversary",
         {photosIn(1, 2, {"wedding", "birthday", "anniversary"})},
         {"WeddingPhotos: 2", "AnniversaryPhotos: 2", "BirthdayPhotos: 2"}},
        {"concert at a place",
         {makeVisit(1, 0, 5000, "Hall"), photosIn(0.5, 1, {"performance"})},
         {"VisitPlusConcert: 1 2"}},
        {"concert at a place without a name",
         {makeVisit(1, 0, 5000, ""), photosIn(0.5, 1, {"concert"})},
         {}},
        {"amusement park",
         {makeVisit(1, 0, 5000, "Park"), photosIn(0.5, 1, {"amusementpark"})},
         {"VisitPlusAmusementPark: 1 2"}},
        {"strength is no cardio", {makeWorkout(1, 1, 2, "Strength Training")}, {}},
        {"played twice", {media(2)}, {}},
        {"played three times", {media(3)}, {"MediaOnRepeat: 1"}},
        {"contact at the threshold", {contact(0.85)}, {}},
        {"contact above it", {contact(0.86)}, {"SignificantContactInteraction: 1"}},
        {"movie", {structured(KSSuggestedEventCategoryMovie)}, {"StructuredEventMovie: 1"}},
        {"boat", {structured(KSSuggestedEventCategoryBoat)}, {"StructuredEventTransportation: 1"}},
        {"food", {structured(KSSuggestedEventCategoryFood)}, {}},
        {"trip",
         {makeEvent(1, 1, 2, KSEventProvider::foresight, KSEventCategory::travel)},
         {"TravelEvent: 1"}},
        {"trip of another provider",
         {makeEvent(1, 1, 2, KSEventProvider::routine, KSEventCategory::travel)},
         {}},
    };
    for (const auto& row : rows) EXPECT_EQ(bundlesOf(row.events), row.bundles) << row.name;
}

TEST(BundleRules, CardioActivitiesAreThirtyOneNamesOfTheCatalogue) {
    int cardio = 0;
    for (const auto& activity : activityCatalogue()) {
        const auto bundles = bundlesOf({makeWorkout(1, 1, 2, std::string(activity.name))});
        cardio += bundles == std::vector<std::string>{"CardioActivity: 1"};
        EXPECT_EQ(activityCode(activity.name), activity.code) << "names are distinct";
        EXPECT_EQ(activityName(activity.code), activity.name) << "codes are distinct";
    }
    EXPECT_EQ(cardio, 31);
    EXPECT_EQ(activityName(kActivityHiking), "Hiking");
}

TEST(KSEventBundler, SomeEventsStayAlone) {
    const auto home = makeVisit(2, 0, 5000, "Home");
    home->placeUserType = 1;
    const auto topic = makeEvent(3, 0, 5000, KSEventProvider::foresight, KSEventCategory::topic);
    const auto trend =
        makeEvent(4, 0, 5000, KSEventProvider::postAnalytics, KSEventCategory::workout);
    const auto instant = makeWorkout(5, 100, 100, "Running");
    const auto backwards = makeWorkout(6, 3000, 200, "Running");
    KSEventArray events = {
        makePhotos(1, 100, 3000, {"concert"}), home, topic, trend, instant, backwards};
    const auto bundler = KSEventBundler::initWithStartDate(KSDate{0}, KSDate{1}, KSDate{2});
    EXPECT_EQ(bundler->calculateEventBundlesFromEvents(events).size(), 6u);
    KSEventArray none;
    EXPECT_TRUE(bundler->calculateEventBundlesFromEvents(none).empty());
}

/// The rule as it is said: every pair whose intervals intersect for more than 0 seconds.
std::vector<int> pairwiseMembership(const KSEventArray& events) {
    const auto alone = [](const KSEvent& event) {
        return event.category() == KSEventCategory::topic;
    };
    std::vector<KSGraph::Edge> edges;
    for (int i = 0; i < static_cast<int>(events.size()); ++i) {
        for (int j = i + 1; j < static_cast<int>(events.size()); ++j) {
            const auto& a = *events[static_cast<std::size_t>(i)];
            const auto& b = *events[static_cast<std::size_t>(j)];
            if (alone(a) || alone(b)) continue;
            if (a.endDate() < a.startDate() || b.endDate() < b.startDate()) continue;
            const double start = std::max(a.startDate().seconds, b.startDate().seconds);
            const double end = std::min(a.endDate().seconds, b.endDate().seconds);
            if (end - start > 0) edges.emplace_back(i, j);
        }
    }
    return KSGraph::initWithNumVertices(static_cast<unsigned>(events.size()), edges)
        ->calculateConnectedComponentWithGraphTraversal(KSGraph::kBreadthFirst);
}

TEST(KSEventBundler, ClustersExactlyAsThePairwiseRule) {
    std::mt19937 random(7);
    for (int round = 0; round < 300; ++round) {
        // Whole numbers in a small range, so that starts and ends meet, touch and coincide.
        std::uniform_int_distribution start(0, 10 + round);
        std::uniform_int_distribution length(-1, 4);
        KSEventArray events;
        for (std::uint32_t number = 0; number < 40; ++number) {
            const double from = start(random);
            const double to = from + length(random);
            events.push_back(number % 9 == 0
                                 ? makeEvent(number, from, to, KSEventProvider::foresight,
                                             KSEventCategory::topic)
                                 : makeWorkout(number, from, to, "Running"));
        }
        const auto expected = pairwiseMembership(events);
        const auto bundler = KSEventBundler::initWithStartDate(KSDate{0}, KSDate{1}, KSDate{2});
        std::vector<int> found(events.size());
        for (const auto& [label, members] : bundler->calculateEventBundlesFromEvents(events)) {
            for (const auto& member : members) found[member->eventIdentifier().bytes[15]] = label;
        }
        ASSERT_EQ(found, expected) << "round " << round;
    }
}

TEST(KSEventBundler, NeedsItsWindow) {
    RecordedAssertions assertions;
    EXPECT_EQ(KSEventBundler::initWithStartDate(std::nullopt, KSDate{1}, KSDate{2}), nullptr);
    EXPECT_EQ(KSEventBundler::initWithStartDate(KSDate{1}, std::nullopt, KSDate{2}), nullptr);
    EXPECT_THAT(assertions.takeDescriptions(),
                ElementsAre("Invalid parameter not satisfying: startDate",
                            "Invalid parameter not satisfying: endDate"));
}

}  // namespace
}  // namespace keepsakes
