// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string_view>

/// Keys of a trends event's dictionary. Dates are numbers: seconds since 2001-01-01 UTC.
namespace keepsakes::trendskey {

inline constexpr std::string_view kKeyword = "keyword";
inline constexpr std::string_view kTrainStartDate = "trainStartDate";
inline constexpr std::string_view kTrainEndDate = "trainEndDate";
inline constexpr std::string_view kTestStartDate = "testStartDate";
inline constexpr std::string_view kTestEndDate = "testEndDate";
inline constexpr std::string_view kAggregationDuration = "aggregationDuration";
inline constexpr std::string_view kAggregationMethod = "aggregationMethod";
inline constexpr std::string_view kValueFunctionType = "valueFunctionType";
inline constexpr std::string_view kLastEventDate = "lastEventDate";
inline constexpr std::string_view kLastEventInterval = "lastEventInterval";
inline constexpr std::string_view kTrends = "trends";
/// The summaries are these with Mean, Std (the variance), Count, Min and Max behind them.
inline constexpr std::string_view kTrainPrefix = "train";
inline constexpr std::string_view kTestPrefix = "test";

}  // namespace keepsakes::trendskey
