// SPDX-License-Identifier: Apache-2.0
#include "sources/KSDiscoveryManager.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/TestPlatform.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

TEST(KSDiscoveryManager, CountsDevicesInAllAndByTheirPeoplesRelationships) {
    const std::vector<RelatedPerson> related = {
        {"family", "Anna Beispiel"}, {"family", "Zoë"},  {"friend", "Jo Muster"},
        {"friend", "Anna Andere"},   {"colleague", "Ö"}, {"neighbor", "---"},
    };
    const std::vector<std::pair<std::vector<std::string>, std::string>> rows = {
        {{}, "0: colleague 0, family 0, friend 0, neighbor 0"},
        {{"Anna\u2019s phone"}, "1: colleague 0, family 1, friend 1, neighbor 0"},
        {{"ZOES-Handy", "zoe", ""}, "3: colleague 0, family 2, friend 0, neighbor 0"},
        {{"Joanna", "Beispiel TV", "Jo", "\xFF\xFE", "S"},
         "5: colleague 0, family 0, friend 0, neighbor 0"},
    };
    for (const auto& [devices, expected] : rows) {
        std::string told;
        auto counts = KSDiscoveryManager::proximityOf(devices, related);
        const auto total = counts.extract("total");
        for (const auto& [relationship, count] : counts) {
            told += (told.empty() ? ": " : ", ") + relationship + " " + count.description();
        }
        EXPECT_EQ(total.mapped().description() + told, expected);
    }
}

TEST(KSDiscoveryManager, SubmitsNumbersOrNothing) {
    TestPlatform platform;
    EXPECT_EQ(KSDiscoveryManager::initWithPlatform(platform.services), nullptr) << "not wanted";
    platform.services.nearbyDevices = &platform.nearby;
    const auto discovery = KSDiscoveryManager::initWithPlatform(platform.services);
    const auto submitted = [&] {
        discovery->submitProximity();
        WorkerThreads::shared().settle();
        return platform.analytics.take();
    };
    platform.nearby.names = {"Annas Handy", "TV"};
    platform.contacts.related = {{"family", "Anna"}};
    constexpr const char* kEvent = "com.brindle.Keepsakes.ProximityDectection";
    EXPECT_THAT(submitted(), ElementsAre(Pair(kEvent, KSDictionary{{"total", 2}, {"family", 1}})));
    platform.contacts.nextError = KSError::make("Contacts", 1, "no index");
    EXPECT_THAT(submitted(), ElementsAre(Pair(kEvent, KSDictionary{{"total", 2}})));
    platform.nearby.nextError = KSError::make("Radio", 1, "no radio");
    EXPECT_THAT(submitted(), IsEmpty()) << "not knowing is not none";
    EXPECT_EQ(platform.nearby.asked, 3);
}

}  // namespace
}  // namespace keepsakes
