// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>

#include "core/Semaphore.h"
#include "platform/NearbyDevices.h"

namespace keepsakes {

class Clock;

/// The devices that BlueZ knows to be near: those with a signal strength, which it keeps for a
/// while after it heard of a device, and those that are connected. It is asked when somebody wants
/// to know and not followed, on a connection made for the question: nothing wakes the daemon
/// between two questions, and BlueZ is never started for one. The clock outlives it.
class BluezDevices final : public NearbyDevices {
  public:
    static constexpr double kScanSeconds = 10;
    static constexpr double kCallLimitSeconds = 5;
    /// Beyond these the answer is taken for nonsense.
    static constexpr std::size_t kMostDevices = 2000;

    /// With `scan`, every powered adapter looks for devices before they are counted.
    BluezDevices(Clock& clock, bool scan) : clock_(clock), scan_(scan) {}

    Devices devicesNear() override;
    void stop() override;

  private:
    Clock& clock_;
    const bool scan_;
    std::atomic<bool> isStopped_ = false;
    Semaphore stopped_;
};

}  // namespace keepsakes
