// SPDX-License-Identifier: Apache-2.0
#include "daemon/ConfiguredPolicy.h"

#include <fmt/format.h>

#include <utility>

#include "core/Log.h"
#include "core/Problems.h"
#include "platform/SystemNotifications.h"

namespace keepsakes {

ConfiguredPolicy::ConfiguredPolicy(const Configuration& atStart, Load load, Clock& clock,
                                   SystemNotifications& notifications, Problems& problems)
    : load_(std::move(load)),
      clock_(clock),
      notifications_(notifications),
      problems_(problems),
      diagnostics_(atStart.policy.diagnostics),
      healthData_(atStart.policy.healthData) {}

ConfiguredPolicy::~ConfiguredPolicy() {
    queue_.sync([this] { quiet_.cancel(); });
}

void ConfiguredPolicy::fileChanged() {
    queue_.async([this] { quiet_ = clock_.after(queue_, kQuietSeconds, [this] { reload(); }); });
}

void ConfiguredPolicy::reload() {
    const auto loaded = load_();
    if (!loaded) {
        const auto line =
            fmt::format("{}; the settings before it stay in force", loaded.error().description());
        logError(line);
        problems_.add(line);
        return;
    }
    const auto& policy = loaded->policy;
    const bool diagnosticsBefore = diagnostics_.exchange(policy.diagnostics);
    const bool healthDataBefore = healthData_.exchange(policy.healthData);
    if (diagnosticsBefore == policy.diagnostics && healthDataBefore == policy.healthData) return;
    logInfo(fmt::format("the policy is now: diagnostics {}, health data {}",
                        policy.diagnostics ? "allowed" : "not allowed",
                        policy.healthData ? "allowed" : "not allowed"));
    notifications_.post(SystemNotifications::kEffectiveSettingsChanged);
}

}  // namespace keepsakes
