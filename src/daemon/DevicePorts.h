// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <memory>

#include "config/Configuration.h"
#include "core/Clock.h"
#include "daemon/ConfiguredPolicy.h"
#include "platform/PlatformServices.h"

namespace keepsakes {

/// The adapters to this machine, made from the configuration and owned here. Made before the
/// services and outlives them.
class DevicePorts {
  public:
    /// `reload` reads the configuration again.
    DevicePorts(const Configuration& configuration, ConfiguredPolicy::Load reload,
                const StandardFolders& folders, std::unique_ptr<Clock> clock);
    ~DevicePorts();
    DevicePorts(const DevicePorts&) = delete;
    DevicePorts& operator=(const DevicePorts&) = delete;

    /// For the composition root to complete with the listener.
    PlatformServices& services() { return services_; }

    /// For whoever watches the file of settings.
    ConfiguredPolicy& policy();

  private:
    struct Adapters;
    const std::unique_ptr<Adapters> adapters_;
    PlatformServices services_;
};

}  // namespace keepsakes
