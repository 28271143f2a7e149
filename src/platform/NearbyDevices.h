// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <string>
#include <vector>

#include "core/KSError.h"

namespace keepsakes {

/// The short-range radio's knowledge of other devices. Any thread may call it.
class NearbyDevices {
  public:
    /// The devices' names, one for each device; empty for one without a name.
    using Devices = std::expected<std::vector<std::string>, KSError>;

    virtual ~NearbyDevices() = default;

    /// The devices that are near now. Blocks the caller, for some seconds at most.
    virtual Devices devicesNear() = 0;

    /// Has a call that waits come to its end, and those to come not wait.
    virtual void stop() = 0;
};

}  // namespace keepsakes
