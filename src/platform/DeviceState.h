// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "core/Observers.h"

namespace keepsakes {

/// The owner's two opt-ins. Any thread may ask. A change is announced by the notification
/// `SystemNotifications::kEffectiveSettingsChanged`.
class DevicePolicy {
  public:
    virtual ~DevicePolicy() = default;
    virtual bool diagnosticSubmissionAllowed() const = 0;
    virtual bool healthDataSubmissionAllowed() const = 0;
};

/// Whether the device keeps its files locked until the owner's first unlock, and its lock state.
/// Any thread may ask; an answer never waits.
class LockState {
  public:
    virtual ~LockState() = default;
    virtual bool formattedForContentProtection() const = 0;
    virtual bool unlockedSinceBoot() const = 0;
    /// 0 unlocked, 1 locked, 2 locking; negative on error.
    virtual int currentState() const = 0;
    /// Runs `changed` on `queue` after the lock state has changed, and after the first unlock.
    [[nodiscard]] virtual Observation observe(const WorkQueue& queue, Task changed) = 0;
};

}  // namespace keepsakes
