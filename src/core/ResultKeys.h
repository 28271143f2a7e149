// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string_view>

/// Keys of result dictionaries that operations share.
namespace keepsakes {

inline constexpr std::string_view kResultNumberOfEvents = "resultNumberOfEvents";
inline constexpr std::string_view kResultNumberOfBundleEvents = "resultNumberOfBundleEvents";
inline constexpr std::string_view kResultOverallSuccess = "resultOverallSuccess";
inline constexpr std::string_view kStateDatabaseAvailable = "stateDatabaseAvailable";
inline constexpr std::string_view kTriggerSource = "triggerSource";
inline constexpr std::string_view kSpiPurgeFailure = "spiPurgeFailure";

}  // namespace keepsakes
