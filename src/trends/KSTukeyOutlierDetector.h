// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>

#include "trends/KSAnalyticsResult.h"
#include "trends/KSAnalyticsStats.h"

namespace keepsakes {

/// Says whether a value is unusual beside its history, by Tukey's fences: one and a half times the
/// interquartile range beyond the quartiles (J. W. Tukey, Exploratory Data Analysis, 1977). A plain
/// value. A history whose quartiles coincide gives no usable fit.
class KSTukeyOutlierDetector {
  public:
    /// The points in ascending order of value.
    static KSTimeSeriesArray sortData(KSTimeSeriesArray points);

    /// Takes the quartiles at the positions n/4, n/2 and 3n/4 of the sorted points, rounded down,
    /// without interpolation; whether the fit is usable.
    bool fitData(const KSTimeSeriesArray& points);

    /// Tests the upper median of the points; nothing without a usable fit.
    std::optional<KSAnalyticsResult> testData(const KSTimeSeriesArray& points);
    std::optional<KSAnalyticsResult> _testDatum(const KSTimeSeries& point) const;

    const KSAnalyticsStats& getTrainDataStats() const { return trainDataStats_; }
    const KSAnalyticsStats& getTestDataStats() const { return testDataStats_; }
    void setTestDataStats(const KSAnalyticsStats& stats) { testDataStats_ = stats; }

    bool valid() const { return valid_; }
    double q1() const { return q1_; }
    double q2() const { return q2_; }
    double q3() const { return q3_; }
    double iqr() const { return iqr_; }
    /// A value on a fence is not yet an outlier.
    double lowerFence() const;
    double upperFence() const;

  private:
    bool valid_ = false;
    double q1_ = 0;
    double q2_ = 0;
    double q3_ = 0;
    double iqr_ = 0;
    KSAnalyticsStats trainDataStats_;
    KSAnalyticsStats testDataStats_;
};

}  // namespace keepsakes
