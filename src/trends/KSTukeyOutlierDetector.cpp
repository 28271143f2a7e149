// SPDX-License-Identifier: Apache-2.0
#include "trends/KSTukeyOutlierDetector.h"

#include <algorithm>

namespace keepsakes {

namespace {

constexpr double kFenceFactor = 1.5;

const KSTimeSeries& pointAt(const KSTimeSeriesArray& sorted, double share) {
    return sorted[static_cast<std::size_t>(static_cast<double>(sorted.size()) * share)];
}

}  // namespace

KSTimeSeriesArray KSTukeyOutlierDetector::sortData(KSTimeSeriesArray points) {
    std::ranges::stable_sort(points, {}, &KSTimeSeries::value);
    return points;
}

bool KSTukeyOutlierDetector::fitData(const KSTimeSeriesArray& points) {
    trainDataStats_ = KSAnalyticsStats::initWithTimeSeries(points);
    valid_ = false;
    if (points.empty()) return false;
    const auto sorted = sortData(points);
    q1_ = pointAt(sorted, 0.25).value;
    q2_ = pointAt(sorted, 0.5).value;
    q3_ = pointAt(sorted, 0.75).value;
    iqr_ = q3_ - q1_;
    valid_ = iqr_ > 0;
    return valid_;
}

std::optional<KSAnalyticsResult> KSTukeyOutlierDetector::testData(const KSTimeSeriesArray& points) {
    testDataStats_ = KSAnalyticsStats::initWithTimeSeries(points);
    if (!valid_ || points.empty()) return std::nullopt;
    return _testDatum(pointAt(sortData(points), 0.5));
}

std::optional<KSAnalyticsResult> KSTukeyOutlierDetector::_testDatum(
    const KSTimeSeries& point) const {
    if (!valid_) return std::nullopt;
    KSAnalyticsResult result;
    result.date = point.date;
    result.actual = point.value;
    result.score = point.value - q2_;
    result.outlier = point.value < lowerFence() || point.value > upperFence();
    return result;
}

double KSTukeyOutlierDetector::lowerFence() const { return q1_ - kFenceFactor * iqr_; }
double KSTukeyOutlierDetector::upperFence() const { return q3_ + kFenceFactor * iqr_; }

}  // namespace keepsakes
