// SPDX-License-Identifier: Apache-2.0
#include "indexer/OccasionRule.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <random>

#include "core/Json.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using Occasions = std::vector<OccasionMembers>;

constexpr GeoPoint kPark{.latitude = 52.51, .longitude = 13.35};
constexpr GeoPoint kNearPark{.latitude = 52.515, .longitude = 13.36};
constexpr GeoPoint kOtherCity{.latitude = 48.13, .longitude = 11.57};

OccasionPhoto photo(double taken, std::optional<GeoPoint> position = std::nullopt,
                    std::optional<std::int64_t> before = std::nullopt) {
    return {.taken = {taken}, .position = position, .before = before};
}

struct RuleCase {
    const char* name;
    std::vector<OccasionPhoto> photos;
    Occasions occasions;
};

std::vector<OccasionPhoto> everyHalfHour(int count) {
    std::vector<OccasionPhoto> photos;
    for (int i = 0; i < count; ++i) photos.push_back(photo(1800.0 * i));
    return photos;
}

Occasions runs(std::initializer_list<std::uint32_t> lengths) {
    Occasions occasions;
    std::uint32_t next = 0;
    for (const auto length : lengths) {
        auto& members = occasions.emplace_back();
        for (std::uint32_t i = 0; i < length; ++i) members.push_back(next++);
    }
    return occasions;
}

TEST(OccasionRule, FormsOccasionsByTimeAndPlace) {
    const RuleCase cases[] = {
        {"no photo", {}, {}},
        {"an hour is near", {photo(0), photo(3600)}, {{0, 1}}},
        {"more than an hour is not", {photo(0), photo(3601)}, {{0}, {1}}},
        {"any order", {photo(3000), photo(0), photo(9000)}, {{1, 0}, {2}}},
        {"near places", {photo(0, kPark), photo(60, kNearPark)}, {{0, 1}}},
        {"far places", {photo(0, kPark), photo(60, kOtherCity)}, {{0}, {1}}},
        {"two places by turns",
         {photo(0, kPark), photo(60, kOtherCity), photo(120, kNearPark), photo(180, kOtherCity)},
         {{0, 2}, {1, 3}}},
        {"without a place, to the one that grew last",
         {photo(0, kPark), photo(60, kOtherCity), photo(120)},
         {{0}, {1, 2}}},
        {"the place is the last that is known",
         {photo(0, kPark), photo(60), photo(120, kOtherCity)},
         {{0, 1}, {2}}},
        // 24 hours hold 49 half-hourly photos.
        {"no longer than a day", everyHalfHour(60), runs({49, 11})},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(formOccasions(c.photos), c.occasions) << c.name;
    }
}

TEST(OccasionRule, AnswersTheSameWhateverTheOrder) {
    std::mt19937 random(7);
    std::vector<OccasionPhoto> photos;
    for (int i = 0; i < 300; ++i) {
        photos.push_back(photo(static_cast<double>(random() % 500000),
                               random() % 3 == 0 ? std::optional(kPark) : std::nullopt));
    }
    const auto instants = [](const std::vector<OccasionPhoto>& of) {
        std::vector<std::vector<double>> result;
        for (const auto& members : formOccasions(of)) {
            auto& times = result.emplace_back();
            for (const auto member : members) times.push_back(of[member].taken.seconds);
        }
        return result;
    };
    const auto expected = instants(photos);
    for (int round = 0; round < 5; ++round) {
        std::ranges::shuffle(photos, random);
        EXPECT_EQ(instants(photos), expected);
    }
}

TEST(OccasionRule, AnOccasionGoesOnUnderItsIdentity) {
    using Former = std::vector<std::optional<std::int64_t>>;
    const struct {
        const char* name;
        std::vector<OccasionPhoto> photos;
        Former continued;
    } cases[] = {
        {"a late photo at its start", {photo(0), photo(600, {}, 7)}, {7}},
        {"two that merge keep the older's", {photo(0, {}, 8), photo(600), photo(1200, {}, 3)}, {3}},
        {"a split goes on with the first photo",
         {photo(0, {}, 5), photo(9000, {}, 5), photo(9060, {}, 5)},
         {5, std::nullopt}},
        {"split and merged at once",
         {photo(0, {}, 2), photo(9000, {}, 2), photo(9060, {}, 4)},
         {2, 4}},
        {"a new one", {photo(0)}, {std::nullopt}},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(continuedOccasions(c.photos, formOccasions(c.photos)), c.continued) << c.name;
    }
}

TEST(OccasionRule, TracksTellTheOffsetOfLocalTimes) {
    const TrackZones zones({{.span = {{0}, {100000}}, .offsetSeconds = 0},
                            {.span = {{10000}, {20000}}, .offsetSeconds = 7200},
                            {.span = {{500000}, {500100}}, .offsetSeconds = -3600}});
    EXPECT_EQ(zones.offsetAt({17199}), 0);
    EXPECT_EQ(zones.offsetAt({17200}), 7200) << "the shorter span knows better";
    EXPECT_EQ(zones.offsetAt({27200}), 7200);
    EXPECT_EQ(zones.offsetAt({27201}), 0);
    EXPECT_EQ(zones.offsetAt({496450}), -3600);
    EXPECT_EQ(zones.offsetAt({500050}), std::nullopt);
}

TEST(OccasionRule, ContentIsTheUnionTheMostFrequentFirst) {
    const std::vector<OccasionWords> photos{
        {.inferences = {"beach", "nature"},
         .persons = {"Ada"},
         .holidays = {},
         .publicEvents = {{.name = "Fair", .performers = {}, .venue = "Square"}}},
        {.inferences = {"nature"}, .persons = {"Bea", "Ada"}, .holidays = {}, .publicEvents = {}}};
    const auto content = occasionContent(photos);
    EXPECT_EQ(valueForKey(content, "inferences"), KSValue(KSArray{"nature", "beach"}));
    const auto& persons = *valueForKey(content, "persons").asArray();
    ASSERT_EQ(persons.size(), 2u);
    EXPECT_EQ(valueForKey(*persons[0].asDictionary(), "name"), KSValue("Ada"));
    // The same person elsewhere has the same identifier, another person another one.
    const auto alone = occasionContent(std::span(photos).first(1));
    EXPECT_EQ(valueForKey(alone, "persons").asArray()->front(), persons[0]);
    EXPECT_NE(valueForKey(*persons[0].asDictionary(), "localIdentifier"),
              valueForKey(*persons[1].asDictionary(), "localIdentifier"));
    EXPECT_EQ(valueForKey(content, "publicEvents"),
              KSValue(KSArray{KSDictionary{{"name", "Fair"}, {"venue", "Square"}}}));
}

}  // namespace
}  // namespace keepsakes
