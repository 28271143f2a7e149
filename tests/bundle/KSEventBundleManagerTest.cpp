// SPDX-License-Identifier: Apache-2.0
#include "bundle/KSEventBundleManager.h"

#include <gmock/gmock.h>

#include "ManagersFixture.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::UnorderedElementsAre;

constexpr double kDay = 86400;

class Bundles : public ManagersFixture {
  protected:
    KSDate now() const { return platform.clock.now(); }

    std::string run() {
        std::string outcome = "(no answer)";
        bundles->bundleEventsWithHandler(
            [&outcome](const OptionalError& error, const KSDictionary& result) {
                outcome = error ? error->description() : KSValue(result).description();
            });
        WorkerThreads::shared().settle();
        return outcome;
    }

    KSEventBundleArray fetchAll(const KSEventBundleFetchOptions& options = {.ascending = true}) {
        KSEventBundleArray found;
        bundles->fetchEventBundlesWithOptions(
            options, [&found](KSEventBundleArray answer, const OptionalError&,
                              const KSDictionary&) { found = std::move(answer); });
        WorkerThreads::shared().settle();
        return found;
    }

    /// "<filtered or not>: <numbers of its events>" of each.
    std::vector<std::string> texts(const KSEventBundleArray& found) {
        std::vector<std::string> texts;
        for (const auto& bundle : found) {
            std::string text = bundle->filtered ? "rule:" : "cluster:";
            for (const int number : numbersOf(bundle->events)) text += " " + std::to_string(number);
            texts.push_back(text);
        }
        return texts;
    }

    /// A hike with photos a day ago, photos without words beside it, and a visit by itself.
    void storeAHike() {
        const double start = (now() - kDay).seconds;
        storeAll({makeWorkout(1, start, start + 7200, "Hiking"),
                  makePhotos(2, start + 60, start + 120, {}),
                  makePhotos(3, start + 300, start + 400, {}),
                  makeVisit(4, start + 20000, start + 21000, "Museum")});
        platform.photos.keepsakes = {{"keepsake2", {{start + 60}, {start + 120}}, {"mountain"}, 5},
                                     {"keepsake3", {{start + 300}, {start + 400}}, {}, 2}};
    }
};

TEST_F(Bundles, APassStoresRuleAndClusterBundlesAndReplacesThemTheNextTime) {
    storeAHike();
    EXPECT_EQ(run(), R"({"resultNumberOfBundleEvents": 4, "resultNumberOfEvents": 4, )"
                     R"("stateDatabaseAvailable": true})");
    const std::vector<std::string> expected = {"rule: 1 2", "rule: 1", "cluster: 1 2 3",
                                               "cluster: 4"};
    EXPECT_THAT(texts(fetchAll()), testing::UnorderedElementsAreArray(expected))
        << "a hike stays in every bundle that it belongs to";
    run();
    EXPECT_THAT(texts(fetchAll()), testing::UnorderedElementsAreArray(expected));
    EXPECT_THAT(texts(fetchAll({.ascending = true, .filterBundle = true})),
                UnorderedElementsAre("rule: 1 2", "rule: 1"));
    for (const auto& bundle : fetchAll()) EXPECT_NE(bundle->promptLanguage.value_or(""), "");
}

TEST_F(Bundles, AClusterThatARuleTookWholeIsNotRepeated) {
    const double start = (now() - kDay).seconds;
    storeAll({makeWorkout(1, start, start + 7200, "Running")});
    run();
    EXPECT_THAT(texts(fetchAll()), ElementsAre("rule: 1"));
}

TEST_F(Bundles, WithoutRulesEveryClusterIsABundle) {
    storeAHike();
    bundles->setEnableSemanticPruning(false);
    run();
    EXPECT_THAT(texts(fetchAll()), UnorderedElementsAre("cluster: 1 2 3", "cluster: 4"));
}

TEST_F(Bundles, OnlyTheLastSevenDaysAreStored) {
    const auto workoutAt = [this](std::uint32_t number, double days) {
        const double start = (now() - days * kDay).seconds;
        return makeWorkout(number, start, start + 60, "Running");
    };
    storeAll({workoutAt(1, 6.9), workoutAt(2, 7.1), workoutAt(3, 27), workoutAt(4, 29)});
    EXPECT_EQ(run(), R"({"resultNumberOfBundleEvents": 1, "resultNumberOfEvents": 3, )"
                     R"("stateDatabaseAvailable": true})");
    EXPECT_THAT(texts(fetchAll()), ElementsAre("rule: 1"));
}

TEST_F(Bundles, HandsMetricsTheirWindowsAfterARecentCollection) {
    storeAHike();
    std::vector<std::size_t> steps;
    std::vector<std::string> data;
    bundles->setMetricsObserver(
        {[&steps](double, const KSEventArray& events, const auto& clusters, const auto&) {
             steps.push_back(events.size() * 100 + clusters.size());
         },
         [&data, this](const KSEventArray& events, KSDate start, KSDate end, KSDate sub) {
             data.push_back(std::to_string(events.size()));
             EXPECT_EQ(now() - start, 3 * kDay);
             EXPECT_EQ(now() - end, 2 * kDay);
             EXPECT_EQ(sub, now());
         }});
    run();
    EXPECT_THAT(steps, IsEmpty()) << "no collection yet";
    manager->persistCollectionDate();
    platform.clock.advance(3 * kDay - 10);
    run();
    EXPECT_THAT(steps, ElementsAre(402, 402, 402, 402, 0, 0, 0, 0));
    EXPECT_THAT(data, ElementsAre("0"));
    platform.clock.advance(20);
    run();
    EXPECT_EQ(steps.size(), 8u) << "the collection is more than three days ago";
}

TEST_F(Bundles, StoreCountsWhatItWasHandedAndPurgesWhatExpired) {
    const auto event = makeWorkout(1, 10, 20, "Running");
    event->expirationDate = now() + 100;
    storeAll({event});
    const auto full = KSEventBundle::initWithEventSet({event, makeVisit(2, 10, 30, "x")}, true, {});
    const auto empty = KSEventBundle::initWithEventSet({}, true, {});
    const auto result = [](std::string& text) {
        return [&text](const OptionalError& error, const KSDictionary& answer) {
            text = error ? error->description() : KSValue(answer).description();
        };
    };
    std::string text;
    bundleStore->storeEventBundles({full, empty, nullptr}, result(text));
    EXPECT_EQ(text, R"({"resultNumberOfBundleEvents": 3})");
    EXPECT_THAT(texts(fetchAll()), ElementsAre("rule: 1")) << "2 was never stored";
    EXPECT_EQ(fetchAll()[0]->expirationDate, now() + 100);

    bundleStore->purgeExpiredEventBundles(result(text));
    EXPECT_EQ(text, R"({"resultNumberOfBundleEvents": 0})");
    platform.clock.advance(101);
    bundleStore->purgeExpiredEventBundles(result(text));
    EXPECT_EQ(text, R"({"resultNumberOfBundleEvents": 1})");
    bundleStore->storeEventBundles({full}, result(text));
    bundleStore->removeEventBundles({full}, result(text));
    EXPECT_EQ(text, "{}");
    EXPECT_THAT(fetchAll(), IsEmpty());
    bundleStore->storeEventBundles({}, nullptr);
}

TEST_F(Bundles, FetchSelectsByOverlapOrderAndLimit) {
    for (std::uint32_t number = 1; number <= 3; ++number) {
        const auto event = makeWorkout(number, number * 100, number * 100 + 50, "Running");
        storeAll({event});
        bundleStore->storeEventBundles({KSEventBundle::initWithEventSet({event}, number == 2, {})},
                                       nullptr);
    }
    EXPECT_THAT(texts(fetchAll({.dateInterval = KSDateInterval{{150}, {200}}, .ascending = true})),
                ElementsAre("cluster: 1", "rule: 2"));
    EXPECT_THAT(texts(fetchAll({.ascending = false, .limit = 2})),
                ElementsAre("cluster: 3", "rule: 2"));
}

}  // namespace
}  // namespace keepsakes
