// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "core/KSError.h"
#include "core/KSValue.h"

namespace keepsakes {

class AnalyticsService;

/// The base of the daemon's metrics: a named set of values that is submitted once, and only when
/// its keys are exactly those that the metric declares. A subclass overrides `event` and
/// `supportedMetricKeys`; without a name nothing can be set or submitted. An instance belongs to
/// one queue at a time; the analytics service must outlive it. Refusals are errors of
/// `KSErrorDomain`, code 7, and code 0 for a second submission.
class KSMetric {
  public:
    using Keys = std::set<std::string, std::less<>>;

    explicit KSMetric(AnalyticsService& analytics, bool loggingEnabled = true);
    virtual ~KSMetric();
    KSMetric(const KSMetric&) = delete;
    KSMetric& operator=(const KSMetric&) = delete;

    /// The metric's name behind "com.brindle.Keepsakes."; null for none.
    virtual const char* event() const { return nullptr; }
    /// The keys that a submission must carry, no more and no fewer.
    virtual Keys supportedMetricKeys() const { return {}; }

    std::optional<std::string> metricName() const { return metricNameFromEvent(event()); }
    static std::optional<std::string> metricNameFromEvent(const char* event);

    /// Copies every pair into `metrics`, or none when a key is not supported.
    OptionalError setAllMetrics(const KSDictionary& given);

    /// Sends `metrics` under the metric's own name, or under another one.
    OptionalError submitMetrics() { return submitMetricsForEvent(event()); }
    OptionalError submitMetricsForEvent(const char* event);

    bool submitted() const { return submitted_; }
    std::string description() const;

    /// The values to submit.
    KSDictionary metrics;

    /// Edges start, start + gap, … up to and including `end`. A missing argument, or a gap that is
    /// not above 0, fails the assertion that names it and yields no edges.
    static std::vector<double> binsFromStart(std::optional<double> start, std::optional<double> end,
                                             std::optional<double> gap);

    /// How many of the ascending edges are at most `number`. A missing number or an empty list
    /// fails the assertion that names it and yields 0.
    static std::uint64_t binForNumber(std::optional<double> number,
                                      const std::vector<double>& bins);

  private:
    static constexpr std::string_view kUnit = "KSMetric";

    AnalyticsService& analytics_;
    const bool loggingEnabled_;
    bool submitted_ = false;
};

}  // namespace keepsakes
