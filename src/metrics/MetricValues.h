// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <array>
#include <cstdint>
#include <functional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "model/KSEvent.h"

namespace keepsakes {

/// What the usage metrics have in common: the kinds that they tell apart, how keys are formed, and
/// what becomes of a quantity before it is told. Any thread may call these.
namespace metric {

/// Kinds outside these lists are told together, as `kOther`.
inline constexpr std::array kProviders = {KSEventProvider::health, KSEventProvider::photo,
                                          KSEventProvider::foresight, KSEventProvider::routine,
                                          KSEventProvider::postAnalytics};
inline constexpr std::array kCategories = {KSEventCategory::visit,
                                           KSEventCategory::workout,
                                           KSEventCategory::mediaOnRepeat,
                                           KSEventCategory::leisureMedia,
                                           KSEventCategory::photoKeepsake,
                                           KSEventCategory::topic,
                                           KSEventCategory::travel,
                                           KSEventCategory::linkshelf,
                                           KSEventCategory::significantContact,
                                           KSEventCategory::structuredEvent,
                                           KSEventCategory::socialEvent};
inline constexpr std::string_view kOther = "Other";

/// What a bin says of no value at all.
inline constexpr int kNoBin = -1;

/// "<stem><Kind>", the kind's display name without blanks.
std::string key(std::string_view stem, std::string_view kind);
std::string key(std::string_view stem, KSEventProvider provider);
std::string key(std::string_view stem, KSEventCategory category);

/// All keys that `key` may form of a stem.
std::set<std::string, std::less<>> providerKeys(std::string_view stem);
std::set<std::string, std::less<>> categoryKeys(std::string_view stem);

/// The bin of the median (of the upper one, where there are two), or `kNoBin`.
std::int64_t medianBin(std::vector<double> values, const std::vector<double>& bins);

}  // namespace metric

}  // namespace keepsakes
