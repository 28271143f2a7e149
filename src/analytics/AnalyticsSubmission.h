// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string_view>

#include "core/KSValue.h"

namespace keepsakes {

class AnalyticsService;

/// Hands an event to the analytics service and, at the debug level, writes what was handed over to
/// the log. Any thread may call it.
void submitAnalyticsEvent(AnalyticsService& analytics, std::string_view event,
                          const KSDictionary& fields, bool logged = true);

}  // namespace keepsakes
