// SPDX-License-Identifier: Apache-2.0
#include "model/KSEvent.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "model/KSConduitContext.h"
#include "model/KSEventBundleFetchOptions.h"
#include "model/KSEventFetchOptions.h"
#include "model/KSExtensions.h"
#include "model/ValueCoding.h"
#include "support/RecordedAssertions.h"
#include "support/SampleRecords.h"
#include "support/TestEvents.h"

namespace keepsakes {

void PrintTo(const KSValue& value, std::ostream* out) { *out << value.description(); }

namespace {

using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;

struct MissingPart {
    const char* assertion;
    std::optional<KSUUID> id = testUUID(1);
    std::optional<KSDate> start = KSDate{1};
    std::optional<KSDate> end = KSDate{2};
    std::optional<KSDate> created = KSDate{3};
    KSEventProvider provider = KSEventProvider::health;
    KSEventCategory category = KSEventCategory::workout;
};

TEST(KSEvent, IsNotMadeWithoutItsCore) {
    const MissingPart rows[] = {
        {.assertion = "eventIdentifier (KSEvent:63)", .id = {}},
        {.assertion = "startDate (KSEvent:64)", .start = {}},
        {.assertion = "endDate (KSEvent:65)", .end = {}},
        {.assertion = "creationDate (KSEvent:66)", .created = {}},
        {.assertion = "provider (KSEvent:67)", .provider = KSEventProvider::unknown},
        {.assertion = "category (KSEvent:68)", .category = KSEventCategory::unknown},
    };
    for (const auto& row : rows) {
        RecordedAssertions assertions;
        EXPECT_EQ(KSEvent::initWithEventIdentifier(row.id, row.start, row.end, row.created,
                                                   row.provider, row.category),
                  nullptr);
        EXPECT_THAT(assertions.take(),
                    ElementsAre(std::string("Invalid parameter not satisfying: ") + row.assertion));
    }
}

TEST(KSEvent, NamesWhatItDoesNotKnow) {
    EXPECT_EQ(KSEvent::describeProvider(KSEventProvider{5}), "Post Analytics");
    EXPECT_EQ(KSEvent::describeProvider(KSEventProvider{6}), "Unknown (6)");
    EXPECT_EQ(KSEvent::describeCategory(KSEventCategory{6}), "Unknown (6)");
    EXPECT_EQ(KSEvent::describeCategory(KSEventCategory{12}), "Social Event");
    EXPECT_EQ(KSEvent::describeCategory(KSEventCategory{13}), "Unknown (13)");
    EXPECT_EQ(KSEvent::_descriptionOf(12), "KSSuggestedEventCategoryNLEvent");
    EXPECT_EQ(KSEvent::_descriptionOf(13), "Unknown");
}

TEST(KSEvent, CopiesNarrowly) {
    const auto event = samples::fullEvent(1);
    const auto copy = event->copy();
    EXPECT_TRUE(copy->isEqual(*event));
    const auto bare = KSEvent::initWithEventIdentifier(event->eventIdentifier(), event->startDate(),
                                                       event->endDate(), event->creationDate(),
                                                       event->provider(), event->category());
    bare->mode = event->mode;
    bare->expirationDate = event->expirationDate;
    bare->storedSourceCreationDate = event->storedSourceCreationDate;
    EXPECT_EQ(archiveOf(*copy), archiveOf(*bare));
}

TEST(KSEvent, SourceCreationDateFallsBackToTheEnd) {
    EXPECT_EQ(makeWorkout(1, 10, 20, "Running")->sourceCreationDate(), KSDate{20});
}

TEST(KSEvent, EveryFieldComesBackFromItsArchive) {
    const auto event = samples::fullEvent(1);
    const KSValue archive = archiveOf(*event);
    ValueDecoder decoder(archive);
    const auto back = KSEvent::initWithCoder(decoder);
    ASSERT_NE(back, nullptr) << decoder.error();
    EXPECT_EQ(archiveOf(*back), archive);
    // 48 keys: a field that is forgotten in the table would be missing on both sides above.
    EXPECT_EQ(archive.asDictionary()->size(), 48u);
}

struct BadArchive {
    const char* key;
    KSValue value;
    const char* error;
};

TEST(KSEvent, ArchivesThatCannotBeReadSayWhy) {
    const auto good = *archiveOf(*samples::fullEvent(1)).asDictionary();
    const BadArchive rows[] = {
        {"eventIdentifier", KSValue(), "eventIdentifier: not a UUID"},
        {"eventIdentifier", "not-a-uuid", "eventIdentifier: not a UUID"},
        {"startDate", "2024-06-15", "startDate: not a date"},
        {"endDate", std::numeric_limits<double>::quiet_NaN(), "endDate: not a finite date"},
        {"expirationDate", std::numeric_limits<double>::infinity(),
         "expirationDate: not a finite date"},
        {"provider", 0, "provider is 0"},
        {"category", 0, "category is 0"},
        {"category", "Visit", "category: not an integer"},
        {"itemAccountHandles", KSArray{"a", 1}, "itemAccountHandles: not an array of strings"},
        {"location", KSArray{1.0}, "location: not a location"},
        {"scoredTopics", "[1]", "scoredTopics: not a JSON object"},
        {"extendedAttributes", KSDictionary{},
         "extendedAttributes: photoKeepsakeLocalIdentifier is missing"},
        {"extendedAttributes",
         KSDictionary{{"photoKeepsakePersons", KSArray{KSDictionary{{"name", 5}}}}},
         "extendedAttributes.photoKeepsakePersons[0].name: not a string"},
    };
    for (const auto& row : rows) {
        auto bad = good;
        bad.insert_or_assign(row.key, row.value);
        const KSValue archive(bad);
        ValueDecoder decoder(archive);
        EXPECT_EQ(KSEvent::initWithCoder(decoder), nullptr) << row.key;
        EXPECT_EQ(decoder.error(), row.error);
    }
    for (const char* key :
         {"eventIdentifier", "startDate", "endDate", "creationDate", "provider", "category"}) {
        auto bad = good;
        bad.erase(key);
        const KSValue archive(bad);
        ValueDecoder decoder(archive);
        EXPECT_EQ(KSEvent::initWithCoder(decoder), nullptr);
        EXPECT_EQ(decoder.error(), std::string(key) + " is missing");
    }
    auto odd = good;
    odd.emplace("neverHeardOf", KSArray{KSDictionary{}});
    odd.insert_or_assign("startDate", 5);
    const KSValue archive(odd);
    ValueDecoder decoder(archive);
    ASSERT_NE(KSEvent::initWithCoder(decoder), nullptr) << decoder.error();
}

TEST(KSEvent, PlaceDiscoveryComesBackAsThirtyTwoBits) {
    const auto event = makeVisit(1, 1, 2, "Here");
    event->placeDiscovery = 0x1'0000'0002;
    const KSValue archive = archiveOf(*event);
    ValueDecoder decoder(archive);
    EXPECT_EQ(KSEvent::initWithCoder(decoder)->placeDiscovery, 2u);
}

TEST(KSEvent, DescribesTenInteractionsAndCountsTheRest) {
    const auto contact =
        makeEvent(1, 1, 2, KSEventProvider::foresight, KSEventCategory::significantContact);
    contact->interactions = std::vector<KSDictionary>(10, KSDictionary{{"kind", "call"}});
    EXPECT_THAT(contact->description(), Not(HasSubstr("others")));
    contact->interactions = std::vector<KSDictionary>(25, KSDictionary{{"kind", "call"}});
    EXPECT_THAT(contact->description(), EndsWith(") \n ... and 15 others>"));
}

TEST(KSEvent, DescriptionsFollowTheCategory) {
    const auto visit = makeVisit(1, 1, 2, "Home");
    visit->location = KSLocation{48.2, 16.37};
    visit->mode = KSPlaceMode::local;
    EXPECT_THAT(visit->description(),
                HasSubstr("provider, Routine, category, Visit, placeName, Home, latitude, "
                          "48.200000, longitude, 16.370000, locationMode, Local, new place, 0>"));
    EXPECT_THAT(makeWorkout(1, 1, 2, "Running")->description(), HasSubstr("workoutType, Running>"));
    const auto topics = makeEvent(1, 1, 2, KSEventProvider::foresight, KSEventCategory::topic);
    topics->scoredTopics = KSDictionary{{"TFZX59DDWR22CqH8gMQt4Lw", 0.5}, {"Txxx", 1}};
    EXPECT_THAT(topics->description(), HasSubstr("scoredTopics, {\"Food\": 0.5, \"Txxx\": 1}"));
    EXPECT_THAT(makeEvent(1, 1, 2, KSEventProvider::photo, KSEventCategory{6})->description(),
                HasSubstr("category, Unknown (6), no other details>"));
}

TEST(KSExtensions, SortsStablyAndSpansTheWhole) {
    const auto late = makeWorkout(1, 50, 60, "a");
    const auto longest = makeWorkout(2, 10, 100, "b");
    const auto twin = makeWorkout(3, 50, 55, "c");
    const KSEventArray events = {late, longest, twin};
    EXPECT_THAT(KSExtensions::sortKSEventArrayByStartDate(events),
                ElementsAre(longest, late, twin));
    EXPECT_THAT(KSExtensions::sortKSEventArrayByEndDate(events), ElementsAre(twin, late, longest));
    EXPECT_EQ(KSExtensions::getDurationOfKSEventArray(events), (KSDateInterval{{10}, {100}}));
    EXPECT_EQ(KSExtensions::getDurationOfKSEventArray({}), std::nullopt);
}

TEST(KSExtensions, BetweenTakesItsBoundsInEitherOrder) {
    for (const auto& [a, b] : {std::pair{10.0, 20.0}, {20.0, 10.0}}) {
        EXPECT_TRUE(KSExtensions::betweenDate({10}, KSDate{a}, KSDate{b}));
        EXPECT_TRUE(KSExtensions::betweenDate({20}, KSDate{a}, KSDate{b}));
        EXPECT_FALSE(KSExtensions::betweenDate({20.5}, KSDate{a}, KSDate{b}));
    }
    EXPECT_FALSE(KSExtensions::betweenDate({10}, KSDate{10}, std::nullopt));
}

TEST(FetchOptions, CompareDescribeAndTravel) {
    const KSEventFetchOptions none;
    EXPECT_EQ(none.description(),
              "ascending, NO,  startDate, (null), endDate, (null), category, 0, limit, (null)");
    EXPECT_EQ(KSEventBundleFetchOptions{}.description(),
              "ascending, NO,  startDate, (null), endDate, (null), limit, (null), filterBundle, "
              "NO,");
    const KSEventFetchOptions full{KSDateInterval{{1}, {2}}, true, KSEventCategory::visit, 5};
    auto other = full;
    other.category = KSEventCategory::workout;
    EXPECT_NE(full, other);
    EXPECT_EQ(full.hash(), KSEventFetchOptions(full).hash());
    EXPECT_EQ(none.hash(), KSEventFetchOptions{}.hash());

    ValueEncoder encoder;
    full.encodeWithCoder(encoder);
    auto archive = encoder.take();
    const auto read = [](const KSValue& value, std::string& error) {
        KSEventFetchOptions options;
        ValueDecoder decoder(value);
        if (!KSEventFetchOptions::initWithCoder(decoder, options)) error = decoder.error();
        return options;
    };
    std::string error;
    EXPECT_EQ(read(archive, error), full);
    archive.erase("category");
    EXPECT_EQ(read(archive, error).category, KSEventCategory::unknown);
    archive["limit"] = -1;
    read(archive, error);
    EXPECT_EQ(error, "limit: not a count");
}

TEST(KSConduitContext, HoldsTheArchivesNameOrNone) {
    EXPECT_THAT(*KSConduitContext::init().conduitProcessName(), HasSubstr("keepsakes_model"));
    const KSValue empty{KSDictionary{}};
    ValueDecoder decoder(empty);
    auto context = KSConduitContext::init();
    ASSERT_TRUE(KSConduitContext::initWithCoder(decoder, context));
    EXPECT_EQ(context.conduitProcessName(), std::nullopt);

    RecordedAssertions assertions;
    EXPECT_EQ(KSConduitContext::encodeDictionary(KSDictionary{}), (KSValue::Bytes{'{', '}'}));
    EXPECT_TRUE(KSConduitContext::decodeToDictionary(KSValue::Bytes{'{'}).isNull());
    EXPECT_EQ(KSConduitContext::encodeDictionary(KSValue()), std::nullopt);
    EXPECT_TRUE(KSConduitContext::decodeToDictionary(1).isNull());
    EXPECT_THAT(
        assertions.takeDescriptions(),
        ElementsAre("Invalid parameter not satisfying: value", "Object is not of data type"));
}

}  // namespace
}  // namespace keepsakes
