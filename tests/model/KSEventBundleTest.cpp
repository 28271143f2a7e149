// SPDX-License-Identifier: Apache-2.0
#include "model/KSEventBundle.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "model/ValueCoding.h"
#include "support/RecordedAssertions.h"
#include "support/SampleRecords.h"
#include "support/TestEvents.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;

TEST(KSEventBundle, TakesSpanExpiryAndProvidersFromItsEvents) {
    const auto workout = makeWorkout(1, 100, 200, "Running");
    workout->expirationDate = KSDate{500};
    const auto trip = makeEvent(2, 50, 150, KSEventProvider::foresight, KSEventCategory::travel);
    trip->expirationDate = KSDate{900};
    const auto trend =
        makeEvent(3, 120, 130, KSEventProvider::postAnalytics, KSEventCategory::workout);
    const auto bundle = KSEventBundle::initWithEventSet({workout, trip, trend}, true, {1000});
    EXPECT_EQ(bundle->source, 5u);
    EXPECT_EQ(bundle->startDate, KSDate{50});
    EXPECT_EQ(bundle->endDate, KSDate{200});
    EXPECT_EQ(bundle->expirationDate, KSDate{900});

    const auto empty = KSEventBundle::initWithEventSet({}, false, {1000});
    EXPECT_EQ(empty->startDate, KSDate::distantFuture());
    EXPECT_EQ(empty->endDate, KSDate::distantPast());
}

TEST(KSEventBundle, KnowsSameAndSharedEvents) {
    const auto a = makeWorkout(1, 10, 20, "a");
    const auto b = makeWorkout(2, 15, 20, "b");
    const auto c = makeWorkout(3, 30, 40, "c");
    const auto ab = KSEventBundle::initWithEventSet({a, b}, true, {});
    const auto ba = KSEventBundle::initWithEventSet({b, a}, true, {});
    const auto bc = KSEventBundle::initWithEventSet({b, c}, true, {});
    const auto onlyC = KSEventBundle::initWithEventSet({c}, true, {});
    EXPECT_TRUE(ab->containTheSameEventSet(*ba));
    EXPECT_FALSE(ab->containTheSameEventSet(*bc));
    EXPECT_TRUE(ab->shareEvents(*bc));
    EXPECT_FALSE(ab->shareEvents(*onlyC));
}

TEST(KSEventBundle, ComesBackFromItsArchiveWithoutItsType) {
    const auto bundle = KSEventBundle::initWithEventSet({samples::fullEvent(1)}, true, {1000});
    bundle->bundleType = "TravelEvent";
    bundle->promptLanguage = "A trip";
    auto archive = *archiveOf(*bundle).asDictionary();
    EXPECT_FALSE(archive.contains("bundleType"));
    const auto read = [](const KSDictionary& dictionary, std::string& error) {
        const KSValue value(dictionary);
        ValueDecoder decoder(value);
        auto back = KSEventBundle::initWithCoder(decoder);
        error = decoder.error();
        return back;
    };
    std::string error;
    EXPECT_EQ(archiveOf(*read(archive, error)), KSValue(archive));
    const auto whole = archive;
    archive.erase("creationDate");
    EXPECT_EQ(read(archive, error), nullptr);
    EXPECT_EQ(error, "creationDate is missing");
    archive = whole;
    archive["events"] = KSArray{KSDictionary{{"provider", 1}}};
    EXPECT_EQ(read(archive, error), nullptr);
    EXPECT_EQ(error, "events[0]: eventIdentifier is missing");

    RecordedAssertions assertions;
    EXPECT_EQ(KSEventBundle::initWithBundleIdentifier(std::nullopt, KSDate{}), nullptr);
    EXPECT_EQ(KSEventBundle::initWithBundleIdentifier(testUUID(1), std::nullopt), nullptr);
    EXPECT_THAT(assertions.takeDescriptions(),
                ElementsAre("Invalid parameter not satisfying: bundleIdentifier",
                            "Invalid parameter not satisfying: creationDate"));
}

}  // namespace
}  // namespace keepsakes
