// SPDX-License-Identifier: Apache-2.0
#include "indexer/PlaceRule.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::Field;

constexpr double kDay = 86400;
constexpr double kHour = 3600;

/// A visit so many metres north of a spot, by hours from Monday 2001-01-01.
PlaceVisit visit(double fromHour, double toHour, double metres,
                 std::optional<std::int64_t> before = std::nullopt) {
    return {.stay = {{fromHour * kHour}, {toHour * kHour}},
            .position = {50 + metres / 111195, 8},
            .before = before};
}

TEST(PlaceRule, VisitsWithinReachAreOnePlace) {
    const std::vector<PlaceVisit> visits{visit(0, 1, 0),   visit(2, 3, 60),  visit(4, 5, 180),
                                         visit(6, 7, 120), visit(8, 9, -65), visit(10, 11, 100000)};
    EXPECT_THAT(formPlaces(visits), ElementsAre(Field(&Place::members, ElementsAre(0, 1, 4)),
                                                Field(&Place::members, ElementsAre(2, 3)),
                                                Field(&Place::members, ElementsAre(5))));
    // Near a pole, a hundred metres are many degrees.
    const std::vector<PlaceVisit> polar{{.stay = {}, .position = {89.9, 10}},
                                        {.stay = {}, .position = {89.9, 10.4}}};
    EXPECT_EQ(formPlaces(polar).size(), 1u);
}

TEST(PlaceRule, AFormerPlaceGoesOnWhereMostOfItsVisitsAre) {
    // 7 was split, 3 and 9 became one; the last is new.
    const std::vector<PlaceVisit> visits{
        visit(0, 1, 0, 7),    visit(1, 2, 0, 7),    visit(2, 3, 500, 7), visit(3, 4, 1000, 9),
        visit(4, 5, 1000, 3), visit(5, 6, 1000, 9), visit(6, 7, 2000)};
    EXPECT_THAT(continuedPlaces(visits, formPlaces(visits)),
                ElementsAre(7, std::nullopt, 9, std::nullopt));
}

TEST(PlaceRule, HomeAndWorkNeedEnoughNightsAndDays) {
    setenv("TZ", "UTC", 1);
    struct Case {
        const char* what;
        int nights;
        int workingDays;
        int nightsElsewhere;
        int firstDay;
        bool home;
        bool work;
    };
    const Case cases[] = {
        {"enough of both", 7, 5, 0, 0, true, true},
        {"four nights", 4, 5, 0, 0, false, true},
        {"four working days", 7, 4, 0, 0, true, false},
        {"as often elsewhere", 7, 5, 7, 0, false, true},
        {"weekends are no working days", 7, 2, 0, 5, true, false},
    };
    for (const auto& c : cases) {
        std::vector<PlaceVisit> visits;
        for (int day = c.firstDay; day < c.firstDay + c.nights; ++day) {
            visits.push_back(visit(day * 24 - 2, day * 24 + 7, 0));
        }
        for (int day = c.firstDay; day < c.firstDay + c.workingDays; ++day) {
            visits.push_back(visit(day * 24 + 9, day * 24 + 12, 5000));
            visits.push_back(visit(day * 24 + 12.5, day * 24 + 13, 9000));
        }
        for (int day = 20; day < 20 + c.nightsElsewhere; ++day) {
            visits.push_back(visit(day * 24, day * 24 + 4, 70000));
        }
        const auto places = formPlaces(visits);
        const auto used = usedPlaces(visits, places);
        EXPECT_EQ(used.home, c.home ? std::optional(0U) : std::nullopt) << c.what;
        EXPECT_EQ(used.work, c.work ? std::optional(1U) : std::nullopt) << c.what;
    }
    // What was home long ago is not: after a move the newest weeks count.
    std::vector<PlaceVisit> moved;
    for (int day = 0; day < 100; ++day) moved.push_back(visit(day * 24, day * 24 + 6, 0));
    for (int day = 100; day < 160; ++day) moved.push_back(visit(day * 24, day * 24 + 6, 3000));
    EXPECT_EQ(usedPlaces(moved, formPlaces(moved)).home, 1U);
    static_assert(kEvidenceSpan < 60 * kDay);
}

}  // namespace
}  // namespace keepsakes
