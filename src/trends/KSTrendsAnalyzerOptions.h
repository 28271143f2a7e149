// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <functional>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "model/KSEvent.h"

namespace keepsakes {

/// How long one bucket of a series is. Values above 2 have no buckets.
enum class KSAggregationDuration : std::uint64_t { none = 0, day = 1, week = 2 };

/// What the values of a bucket's events come to. With values above 2 the bucket only counts.
enum class KSAggregationMethod : std::uint64_t { sum = 0, mean = 1, last = 2 };

enum KSTrendsAnalyzerValueFunctionType : std::uint64_t {
    KSTrendsAnalyzerValueFunctionTypeCustom = 0,
    KSTrendsAnalyzerValueFunctionTypeLongEvent = 1,  ///< 1 beyond ten minutes, otherwise 0.
    KSTrendsAnalyzerValueFunctionTypeDuration = 2,   ///< Seconds.
};

/// What a value function answers for an event that has no value.
inline constexpr double kKSTrendsAnalysisNoValue = std::numeric_limits<double>::lowest();

/// One analysis plan: which events, what each counts for, and the days that are compared. Not
/// changed once made; any thread may read it.
class KSTrendsAnalyzerOptions {
  public:
    using Pointer = std::shared_ptr<const KSTrendsAnalyzerOptions>;
    using ValueFunction = std::function<double(const KSEvent&)>;

    /// With a value function of the caller's own, or with a built-in one. A missing interval or
    /// function, or the type "custom", fails the assertion that names it and yields nothing.
    static Pointer initWithKeyword(std::string keyword, KSEventCategory category,
                                   std::optional<KSDateInterval> trainDateInterval,
                                   std::optional<KSDateInterval> testDateInterval,
                                   KSAggregationDuration aggregationDuration,
                                   KSAggregationMethod aggregationMethod,
                                   ValueFunction valueFunction);
    static Pointer initWithKeyword(std::string keyword, KSEventCategory category,
                                   std::optional<KSDateInterval> trainDateInterval,
                                   std::optional<KSDateInterval> testDateInterval,
                                   KSAggregationDuration aggregationDuration,
                                   KSAggregationMethod aggregationMethod,
                                   KSTrendsAnalyzerValueFunctionType valueType);

    const std::string keyword;
    const KSEventCategory category;  ///< 0 means every category.
    const KSDateInterval trainDateInterval;
    const KSDateInterval testDateInterval;
    const KSAggregationDuration aggregationDuration;
    const KSAggregationMethod aggregationMethod;
    const ValueFunction valueFunction;
    const KSTrendsAnalyzerValueFunctionType valueFunctionType;

    std::string description() const;

  private:
    static constexpr std::string_view kUnit = "KSTrendsAnalyzerOptions";

    KSTrendsAnalyzerOptions(std::string keyword, KSEventCategory category,
                            const KSDateInterval& trainDateInterval,
                            const KSDateInterval& testDateInterval,
                            KSAggregationDuration aggregationDuration,
                            KSAggregationMethod aggregationMethod, ValueFunction valueFunction,
                            KSTrendsAnalyzerValueFunctionType valueFunctionType);
};

using KSTrendsAnalyzerPlans = std::vector<KSTrendsAnalyzerOptions::Pointer>;

}  // namespace keepsakes
