// SPDX-License-Identifier: Apache-2.0
#include "sources/KSPhotoManager.h"

#include <gmock/gmock.h>

#include "StoreFixture.h"
#include "sources/KSPhotoKeepsakeTags.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;

class Photos : public StoreFixture {
  protected:
    Photos() {
        universe->add("EventStore", store);
        photos = KSPhotoManager::initWithUniverse(*universe);
    }

    Answer collect() {
        Answer answer;
        photos->fetchAndSavePhotoKeepsakesBetweenStartDate({0}, platform.clock.now(), into(answer));
        return answer;
    }

    KSEventArray rehydrate(const KSEventArray& events, std::string& error) {
        KSEventArray refreshed;
        photos->rehydratePhotoKeepsakes(events,
                                        [&](KSEventArray answer, const OptionalError& failed) {
                                            refreshed = std::move(answer);
                                            error = failed ? failed->description() : "";
                                        });
        WorkerThreads::shared().settle();
        return refreshed;
    }

    std::shared_ptr<KSPhotoManager> photos;
};

TEST_F(Photos, StoresNewKeepsakesAndKeepsReturningDaysForAYear) {
    platform.photos.keepsakes = {{"a", {{100}, {200}}, {"Mountain"}},
                                 {"b", {{300}, {400}}, {"anniversary", "x"}},
                                 {"c", {{500}, {600}}, {"Anniversary"}}};
    EXPECT_EQ(collect(), (Answer{"", 3}));
    platform.photos.keepsakes.push_back({"d", {{500}, {700}}, {}});
    platform.photos.keepsakes.push_back({"e", {{501}, {700}}, {"birthday"}});
    EXPECT_EQ(collect(), (Answer{"", 1})) << "one that starts with the newest stored is not new";

    const auto stored = fetch({.ascending = true});
    ASSERT_EQ(stored.size(), 4u);
    const auto now = platform.clock.now();
    const double lives[] = {2419200, 32140800, 2419200, 32140800};
    for (std::size_t i = 0; i < 4; ++i) EXPECT_EQ(stored[i]->expirationDate, now + lives[i]) << i;
    EXPECT_EQ(stored[0]->identifierFromProvider, "a");
    EXPECT_EQ(stored[0]->sourceCreationDate(), platform.photos.graphCreationDate);
    EXPECT_EQ(stored[0]->provider(), KSEventProvider::photo);
    EXPECT_EQ(stored[0]->category(), KSEventCategory::photoKeepsake);
}

TEST_F(Photos, AFailedOrEmptySummaryIsNoErrorAndNoResult) {
    EXPECT_EQ(collect(), (Answer{"", -1}));
    platform.photos.keepsakes = {{"a", {{100}, {200}}, {}}};
    platform.photos.nextError = KSError::make("Photos", 1, "no library");
    EXPECT_EQ(collect(), (Answer{"", -1}));
    EXPECT_TRUE(fetch({}).empty());
}

TEST_F(Photos, RehydratesInBatchesOfFifty) {
    KSEventArray events;
    for (std::uint32_t number = 0; number < 120; ++number) {
        events.push_back(makePhotos(number, 100, 200, {}));
        platform.photos.keepsakes.push_back(
            {"keepsake" + std::to_string(number), {{100}, {200}}, {"Beach", "pet"}, 7, {"Anna"}});
    }
    platform.photos.keepsakes.erase(platform.photos.keepsakes.begin() + 3);
    std::string error;
    const auto refreshed = rehydrate(events, error);
    EXPECT_THAT(platform.photos.batchSizes, ElementsAre(50, 50, 20));
    EXPECT_EQ(refreshed.size(), 119u) << "one keepsake is gone";
    const auto& attributes = *refreshed[0]->extendedAttributes;
    EXPECT_THAT(*attributes.photoKeepsakeInferences, ElementsAre("beach", "pet"));
    EXPECT_EQ(attributes.photoKeepsakePersons->at(0).name, "Anna");
    EXPECT_EQ(attributes.photoCount, 7);
    EXPECT_EQ(refreshed[0]->identifierFromProvider, events[0]->identifierFromProvider);

    platform.photos.batchSizes.clear();
    EXPECT_EQ(rehydrate({events.begin(), events.begin() + 50}, error).size(), 49u);
    EXPECT_THAT(platform.photos.batchSizes, ElementsAre(50));
    EXPECT_TRUE(rehydrate({makeWorkout(1, 1, 2, "a")}, error).empty());

    platform.photos.nextError = KSError::make("Photos", 1, "no library");
    EXPECT_TRUE(rehydrate(events, error).empty());
    EXPECT_EQ(error, "no library");
}

TEST_F(Photos, RemovesEventsWhoseKeepsakeIsGone) {
    const auto kept = makePhotos(1, 100, 200, {});
    const auto gone = makePhotos(2, 150, 250, {});
    storeAll({kept, gone});
    platform.photos.keepsakes = {{"keepsake1", {{100}, {200}}, {}}};
    const auto remove = [this](const KSEventArray& events) {
        Answer answer;
        photos->removePhotoEventsDeletedAtSource(events, into(answer));
        WorkerThreads::shared().settle();
        return answer;
    };
    EXPECT_EQ(remove({kept, gone}), (Answer{"", 1}));
    EXPECT_EQ(numbersOf(fetch({})), std::vector{1});
    platform.photos.nextError = KSError::make("Photos", 1, "no library");
    EXPECT_EQ(remove({kept}), (Answer{"", 1})) << "a failed summary counts as an empty one";
    EXPECT_EQ(remove({}), (Answer{"", 0}));
}

TEST(KSPhotoKeepsakeTags, MapsWordsToNumbersAndGroups) {
    const auto& numbers = KSPhotoKeepsakeTags::getInferenceTagMap();
    EXPECT_EQ(numbers.size(), 31u);
    EXPECT_EQ(numbers.at("baby"), 1);
    EXPECT_EQ(numbers.at("frequentLocation"), 9);
    EXPECT_EQ(numbers.at("Gathering"), 31);
    EXPECT_EQ(KSPhotoKeepsakeTags::getCoarseInferenceTag(16), 8);
    EXPECT_EQ(KSPhotoKeepsakeTags::getCoarseInferenceTag(1), 7);
    EXPECT_EQ(KSPhotoKeepsakeTags::getCoarseInferenceTag(31), 2);
    for (const int tag : {0, 32, -1}) {
        EXPECT_EQ(KSPhotoKeepsakeTags::getCoarseInferenceTag(tag), std::nullopt);
    }
}

TEST(KSEventExtendedAttributes, DescribesItselfWithItsOddSpaces) {
    const KSPerson person{"p", "Anna", {}, {}};
    EXPECT_EQ(person.description(),
              "<KSPerson localIdentifier , p, name, Anna, contactIdentifier, (null), family, "
              "(null), >");
    const KSPublicEvent event{"Fair", {{"A", "B"}}, "Hall"};
    EXPECT_EQ(event.description(), "<KSPublicEvent name, Fair, performers, (A, B), venue, Hall, >");
    auto attributes = KSEventExtendedAttributes::initWithLocalIdentifier("k");
    attributes->photoKeepsakePersons = {person};
    EXPECT_EQ(attributes->description(),
              "<KSEventExtendedAttributes localIdentifier, k, photoKeepsakeInferences, (null), "
              "photoKeepsakeHolidays, (null), photoKeepsakePublicEvents, (null), "
              "photoKeepsakePersons, (" +
                  person.description() + "), >");
}

}  // namespace
}  // namespace keepsakes
