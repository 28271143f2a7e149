// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>
#include <expected>
#include <functional>
#include <string>

#include "config/Configuration.h"
#include "core/Clock.h"
#include "platform/DeviceState.h"

namespace keepsakes {

class Problems;
class SystemNotifications;

/// The device policy of config.toml. It follows the file; every other setting stays as it was at
/// start. A file with a mistake is a problem that the owner hears of, and changes nothing.
/// Any thread may ask. What it is given outlives it.
class ConfiguredPolicy final : public DevicePolicy {
  public:
    using Load = std::function<std::expected<Configuration, KSError>()>;

    /// Editors write in several steps: so many seconds of quiet make a change.
    static constexpr double kQuietSeconds = 0.5;

    ConfiguredPolicy(const Configuration& atStart, Load load, Clock& clock,
                     SystemNotifications& notifications, Problems& problems);
    ~ConfiguredPolicy() override;

    bool diagnosticSubmissionAllowed() const override { return diagnostics_; }
    bool healthDataSubmissionAllowed() const override { return healthData_; }

    /// The file may have changed: reads it once it is at rest. Any thread.
    void fileChanged();

  private:
    void reload();

    const Load load_;
    Clock& clock_;
    SystemNotifications& notifications_;
    Problems& problems_;
    std::atomic<bool> diagnostics_;
    std::atomic<bool> healthData_;
    Timer quiet_;  // only on queue_
    WorkQueue queue_{"ConfiguredPolicy"};
};

}  // namespace keepsakes
