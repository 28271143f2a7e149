// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>

namespace keepsakes {

/// The owner's two opt-ins. Any thread may ask.
class DevicePolicy {
  public:
    virtual ~DevicePolicy() = default;
    virtual bool diagnosticSubmissionAllowed() const = 0;
    virtual bool healthDataSubmissionAllowed() const = 0;
};

/// Whether the device keeps its files locked until the owner's first unlock, and its lock state.
class LockState {
  public:
    virtual ~LockState() = default;
    virtual bool formattedForContentProtection() const = 0;
    virtual bool unlockedSinceBoot() const = 0;
    /// 0 unlocked, 1 locked, 2 locking; negative on error.
    virtual int currentState() const = 0;
};

}  // namespace keepsakes
