// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>

#include "core/Observers.h"

namespace keepsakes {

/// Notifications that have a name and nothing else: whoever learns of something posts it, whoever
/// listens at that moment hears it. Any thread may call it.
class SystemNotifications final {
  public:
    /// The device policy's answers may be other ones now.
    static constexpr std::string_view kEffectiveSettingsChanged =
        "com.brindle.keepsakesd.effective-settings-changed";
    /// Somebody gathers what there is to know about the device and its programs.
    static constexpr std::string_view kDiagnosticReportStarted =
        "com.brindle.keepsakesd.diagnostic-report-started";

    /// Returns at once.
    void post(std::string_view name);

    /// Runs `handler` on `queue` each time.
    [[nodiscard]] Observation observe(std::string_view name, const WorkQueue& queue, Task handler);

  private:
    Observers<std::string> observers_;
};

}  // namespace keepsakes
