// SPDX-License-Identifier: Apache-2.0
#include "indexer/StayRule.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <functional>
#include <random>
#include <string>

#include "indexer/DayPoints.h"

namespace keepsakes {

void PrintTo(const TrackPoint& point, std::ostream* out) {
    *out << point.time.seconds << " " << point.position.latitude << " " << point.position.longitude
         << " +-" << point.accuracyMeters;
}

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

/// A point so many metres north of a spot in Europe.
TrackPoint at(double time, double metres, float accuracy = std::nanf("")) {
    return {.time = {time}, .position = {50 + metres / 111195, 8}, .accuracyMeters = accuracy};
}

/// Points every so many seconds at one place.
void still(std::vector<TrackPoint>& track, double from, double to, double metres,
           double every = 30) {
    for (double time = from; time <= to; time += every) track.push_back(at(time, metres));
}

std::vector<Stay> staysOf(const std::vector<TrackPoint>& track) {
    std::vector<Stay> found;
    StayDetector detector([&found](const Stay& stay) { found.push_back(stay); });
    for (const auto& point : track) detector.add(point);
    detector.finish();
    return found;
}

/// "start..end @metres", with "?" for one of low confidence and "+" for an open one.
std::string told(const std::vector<Stay>& stays) {
    std::string text;
    for (const auto& stay : stays) {
        text += std::to_string(std::lround(stay.span.start.seconds)) + ".." +
                std::to_string(std::lround(stay.span.end.seconds)) + " @" +
                std::to_string(std::lround((stay.center.latitude - 50) * 111195)) +
                (stay.confidence() < 0.5 ? "?" : "") + (stay.isOpen ? "+ " : " ");
    }
    return text;
}

TEST(StayRule, FindsWhereTheOwnerStayed) {
    using Track = std::vector<TrackPoint>;
    struct Case {
        std::string what;
        std::function<void(Track&)> make;
        std::string stays;
    };
    const std::vector<Case> cases = {
        {"five minutes are a stay",
         [](Track& t) { still(t, 0, 300, 0), still(t, 310, 320, 500, 10); }, "0..300 @0+ "},
        {"less is none", [](Track& t) { still(t, 0, 290, 0, 10), still(t, 310, 2000, 9000, 3000); },
         ""},
        {"a slow walk is none",
         [](Track& t) {
             for (int i = 0; i < 200; ++i) t.push_back(at(i * 10, i * 9));
         },
         ""},
        {"two places, the second left open",
         [](Track& t) { still(t, 0, 600, 0), still(t, 1200, 2400, 2000); },
         "0..600 @0 1200..2400 @2000+ "},
        {"a place reached at its edge",
         [](Track& t) {
             t.push_back(at(0, -90)), still(t, 60, 1200, 5), t.push_back(at(1300, 8000)),
                 t.push_back(at(8300, 16000));
         },
         "0..1200 @3 "},
        {"one point that jumps",
         [](Track& t) { still(t, 0, 600, 0), t.push_back(at(620, 3000)), still(t, 640, 1200, 0); },
         "0..1180 @0+ "},
        {"a leap that no one makes, until enough points agree",
         [](Track& t) {
             still(t, 0, 600, 0), still(t, 700, 720, 900000, 10), still(t, 730, 1000, 0);
             still(t, 1100, 2000, 900000);
         },
         "0..1000 @0 1220..2000 @900000+ "},
        {"points that are too inaccurate",
         [](Track& t) {
             still(t, 0, 600, 0);
             for (int i = 0; i < 20; ++i) t.push_back(at(610 + i * 30, 900, 500));
             still(t, 1300, 1900, 0);
         },
         "0..1900 @0+ "},
        {"a short absence",
         [](Track& t) { still(t, 0, 900, 0), still(t, 1000, 1250, 400), still(t, 1400, 2000, 0); },
         "0..2000 @0+ "},
        {"a long absence",
         [](Track& t) { still(t, 0, 900, 0), still(t, 1000, 1250, 400), still(t, 1600, 2200, 0); },
         "0..900 @0 1600..2200 @0+ "},
        {"a silent night at home",
         [](Track& t) {
             still(t, 0, 2400, 0), still(t, 30000, 31200, 0), still(t, 32000, 40000, 5000, 7000);
         },
         "0..31200 @0 32000..39000 @5000?+ "},
        {"minutes beside a long silence",
         [](Track& t) { still(t, 0, 600, 0), still(t, 30000, 30300, 0); }, "0..30300 @0?+ "},
        {"little but a silence",
         [](Track& t) {
             t = {at(0, 0), at(20000, 10), at(20100, 900)};
         },
         "0..20000 @5?+ "},
        {"a silence longer than any stay",
         [](Track& t) { still(t, 0, 600, 0), still(t, 50000, 50600, 0); },
         "0..600 @0 50000..50600 @0+ "},
        {"whole minutes, several points in each",
         [](Track& t) {
             for (int i = 0; i < 60; ++i) t.push_back(at(i / 6 * 60, i % 6 * 10));
         },
         "0..540 @25+ "},
    };
    for (const auto& [what, make, stays] : cases) {
        Track track;
        make(track);
        EXPECT_EQ(told(staysOf(track)), stays) << what;
    }
}

TEST(StayRule, BeginningAtAStayFindsTheSameFromThereOn) {
    std::mt19937 random(7);
    const auto draw = [&random](unsigned below) { return static_cast<double>(random() % below); };
    std::vector<TrackPoint> track;
    double time = 0;
    double metres = 0;
    for (int leg = 0; leg < 300; ++leg) {
        const auto choice = random() % 3;
        metres += choice == 0 ? 0 : choice == 1 ? 350.0 : -2000.0;
        for (const double end = time + draw(1500); time < end; time += 20) {
            track.push_back(at(time, metres + draw(60) - 30));
        }
        time += draw(4000);
    }
    const auto all = staysOf(track);
    ASSERT_GT(all.size(), 50u);
    for (std::size_t i = 0; i < all.size(); ++i) {
        std::vector<TrackPoint> rest;
        std::ranges::copy_if(track, std::back_inserter(rest),
                             [&](const auto& point) { return point.time >= all[i].span.start; });
        EXPECT_EQ(staysOf(rest), (std::vector(all.begin() + static_cast<long>(i), all.end())));
    }
}

TEST(DayPoints, KeepTheBestPointOfEachStepInWhateverOrderTheyCome) {
    std::vector<TrackPoint> points;
    std::mt19937 random(3);
    const auto draw = [&random](unsigned below) { return static_cast<double>(random() % below); };
    for (int i = 0; i < 60000; ++i) {
        const auto accuracy = draw(3) == 0 ? std::nanf("") : static_cast<float>(draw(90));
        points.push_back(at(86400 + draw(86400000) / 1000, draw(1000), accuracy));
    }
    const auto kept = [&points] {
        DayPoints day;
        for (const auto& point : points) day.add(point);
        return encodePoints(1, day.take());
    };
    const auto bytes = kept();
    points.insert(points.end(), points.begin(), points.begin() + 30000);
    std::ranges::shuffle(points, random);
    EXPECT_EQ(kept(), bytes);

    DayPoints day;
    decodePoints(1, bytes, day);
    EXPECT_EQ(encodePoints(1, day.take()), bytes);
    DayPoints few;
    for (const auto& point : {at(86405, 1), at(86401, 2, 40), at(86409, 3, 7), at(86411, 4)}) {
        few.add(point);
    }
    const auto best = few.take();
    ASSERT_EQ(best.size(), 2u);
    EXPECT_EQ(best[0].accuracyMeters, 7);
    EXPECT_EQ(best[1].time.seconds, 86411);
}

TEST(DayPoints, OfDamagedBytesThoseBeforeTheDamageAreRead) {
    const std::vector<TrackPoint> points{at(-0.001, -5e6, 3), at(-12345.678, 5e6), at(-20, 0, 0)};
    DayPoints ordered;
    for (const auto& point : points) ordered.add(point);
    const auto bytes = encodePoints(-1, ordered.take());
    std::size_t last = 0;
    for (std::size_t length = 0; length <= bytes.size(); ++length) {
        DayPoints cut;
        decodePoints(-1, std::string_view(bytes).substr(0, length), cut);
        const auto count = cut.take().size();
        EXPECT_GE(count, last);
        last = count;
    }
    EXPECT_EQ(last, points.size());
    DayPoints hostile;
    decodePoints(-1, std::string(4000, '\xFF'), hostile);
    EXPECT_TRUE(hostile.empty());
}

}  // namespace
}  // namespace keepsakes
