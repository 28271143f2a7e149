// SPDX-License-Identifier: Apache-2.0
#include "sources/KSVitalsManager.h"

#include <gmock/gmock.h>

#include "StoreFixture.h"
#include "core/Calendar.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;

class Vitals : public StoreFixture {
  protected:
    Vitals() {
        universe->add("EventStore", store);
        vitals = KSVitalsManager::initWithUniverse(*universe);
    }

    Answer collect() {
        Answer answer;
        vitals->fetchAndSaveWorkoutsBetweenStartDate({0}, platform.clock.now(), into(answer));
        WorkerThreads::shared().settle();
        return answer;
    }

    std::shared_ptr<KSVitalsManager> vitals;
};

TEST_F(Vitals, StoresOnlyWorkoutsThatStartedAfterTheNewestStoredOne) {
    platform.health.samples = {{{100}, {200}, 24}, {{300}, {400}, 37}};
    EXPECT_EQ(collect(), (Answer{"", 2}));
    platform.health.samples.push_back({{300}, {450}, 13});
    platform.health.samples.push_back({{250}, {270}, 13});
    platform.health.samples.push_back({{300.5}, {460}, 55});
    EXPECT_EQ(collect(), (Answer{"", 1}));
    EXPECT_EQ(collect(), (Answer{"", 0})) << "nothing new is still stored, as an empty list";

    const auto stored = fetch({.ascending = true});
    ASSERT_EQ(stored.size(), 3u);
    EXPECT_EQ(stored[0]->workoutType, "Hiking");
    EXPECT_EQ(stored[2]->workoutType, "Strength Training");
    EXPECT_EQ(stored[0]->provider(), KSEventProvider::health);
    EXPECT_EQ(stored[0]->category(), KSEventCategory::workout);
    EXPECT_EQ(stored[0]->expirationDate, platform.clock.now() + 2419200);
    EXPECT_EQ(stored[0]->identifierFromProvider, std::nullopt);
}

TEST_F(Vitals, PassesTheHealthStoresErrorOn) {
    platform.health.nextError = KSError::make("Health", 3, "not authorised");
    EXPECT_EQ(collect(), (Answer{"not authorised", -1}));
}

TEST_F(Vitals, CountsWholeYears) {
    const auto age = [this](KSDate now) {
        platform.clock.step(now - platform.clock.now());
        std::optional<int> years;
        vitals->fetchUserAgeWithHandler(
            [&years](std::optional<int> answer, const OptionalError&) { years = answer; });
        WorkerThreads::shared().settle();
        return years;
    };
    const KSDate birthday = *calendar::dateOfDay(2024, 5, 1);
    EXPECT_EQ(age(birthday), std::nullopt);
    platform.health.born = DateComponents{1990, 5, 1};
    EXPECT_EQ(age(birthday - 1), 33);
    EXPECT_EQ(age(birthday), 34);
    platform.health.born = DateComponents{2023, 2, 30};
    EXPECT_EQ(age(birthday), std::nullopt) << "no such day";
}

TEST_F(Vitals, HasAWordForEachSexCode) {
    EXPECT_EQ(KSVitalsManager::convertBiologicalSexObjToString(0), "not set");
    EXPECT_EQ(KSVitalsManager::convertBiologicalSexObjToString(3), "other");
    for (const auto code : {std::optional(4), std::optional(-1), std::optional<int>()}) {
        EXPECT_EQ(KSVitalsManager::convertBiologicalSexObjToString(code), std::nullopt);
    }
    platform.health.nextError = KSError::make("Health", 3, "not authorised");
    std::string failed;
    vitals->fetchUserBiologicalSexWithHandler(
        [&failed](std::optional<int>, const OptionalError& error) {
            failed = error->description();
        });
    WorkerThreads::shared().settle();
    EXPECT_EQ(failed, "not authorised");
}

}  // namespace
}  // namespace keepsakes
