// SPDX-License-Identifier: Apache-2.0
#include "analytics/AnalyticsSubmission.h"

#include <fmt/format.h>

#include "core/Log.h"
#include "platform/AnalyticsService.h"

namespace keepsakes {

void submitAnalyticsEvent(AnalyticsService& analytics, std::string_view event,
                          const KSDictionary& fields, bool logged) {
    if (logged && logsDebug()) {
        logDebug(fmt::format("=== BEGIN analytics submission for event {} ===", event));
        for (const auto& [key, value] : fields) {
            logDebug(fmt::format("{} : {}", key, value.description()));
        }
        logDebug(fmt::format("=== END analytics submission for event {} ===", event));
    }
    analytics.send(event, fields);
}

}  // namespace keepsakes
