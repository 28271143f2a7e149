// SPDX-License-Identifier: Apache-2.0
#include "trends/KSTukeyOutlierDetector.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>

namespace keepsakes {
namespace {

/// A point a day with these values.
KSTimeSeriesArray seriesOf(const std::vector<double>& values) {
    KSTimeSeriesArray points;
    for (const double value : values) {
        points.push_back({KSDate{86400.0 * static_cast<double>(points.size())}, value, 1});
    }
    return points;
}

TEST(Detector, TakesQuartilesAtPositionsWithoutInterpolation) {
    const struct {
        std::vector<double> values;
        bool valid;
        double q1, q2, q3;
    } rows[] = {
        {{}, false, 0, 0, 0},
        {{7}, false, 7, 7, 7},
        {{4, 1, 3, 2}, true, 2, 3, 4},
        {{5, 1, 2}, true, 1, 2, 5},
        {{9, 9, 9, 9, 9, 9}, false, 9, 9, 9},
        {{0, 5, 5, 5, 5, 5, 5, 90}, false, 5, 5, 5},
        {{1, 2, 3, 4, 5, 6, 7, 8, 9}, true, 3, 5, 7},
    };
    for (const auto& row : rows) {
        KSTukeyOutlierDetector detector;
        EXPECT_EQ(detector.fitData(seriesOf(row.values)), row.valid);
        EXPECT_EQ(detector.valid(), row.valid);
        EXPECT_EQ(detector.q1(), row.q1);
        EXPECT_EQ(detector.q2(), row.q2);
        EXPECT_EQ(detector.q3(), row.q3);
        EXPECT_EQ(detector.iqr(), row.q3 - row.q1);
        EXPECT_EQ(detector.testData(seriesOf({1})).has_value(), row.valid);
        EXPECT_EQ(detector.getTestDataStats().count, 1u) << "summed up with or without a model";
    }
}

TEST(Detector, AValueOnAFenceIsNoOutlier) {
    KSTukeyOutlierDetector detector;
    ASSERT_TRUE(detector.fitData(seriesOf({1, 2, 3, 4})));
    EXPECT_EQ(detector.lowerFence(), -1);
    EXPECT_EQ(detector.upperFence(), 7);
    for (const auto& [value, outlier] :
         {std::pair(-1.0, false), {-1.001, true}, {7.0, false}, {7.001, true}, {3.0, false}}) {
        const auto result = detector.testData({{KSDate{5}, value, 2}});
        EXPECT_EQ(result, (KSAnalyticsResult{outlier, KSDate{5}, 0, value, value - 3})) << value;
    }
    EXPECT_EQ(detector.testData(seriesOf({9, 1, 5, 3}))->actual, 5) << "the upper median";
    ASSERT_FALSE(detector.fitData(seriesOf({1, 1})));
    EXPECT_FALSE(detector.testData(seriesOf({1}))) << "an earlier fit is forgotten";
}

TEST(Stats, HoldTheVarianceAndNotItsRoot) {
    const auto stats = KSAnalyticsStats::initWithTimeSeries(seriesOf({3, 1, 2}));
    EXPECT_EQ(stats, (KSAnalyticsStats{1, 3, 2, 2.0 / 3, 3}));
    constexpr double kLargest = std::numeric_limits<double>::max();
    EXPECT_EQ(KSAnalyticsStats::initWithTimeSeries({}),
              (KSAnalyticsStats{kLargest, -kLargest, 0, 0, 0}));
}

}  // namespace
}  // namespace keepsakes
