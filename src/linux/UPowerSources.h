// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <mutex>

#include "linux/BusReader.h"
#include "platform/PowerSources.h"

namespace keepsakes {

/// The device's power as UPower tells of it: all batteries that supply the device, and the line
/// power that charges them, as one source. Made before the bus thread starts, outlives its stop.
///
/// Each sign of a change has everything read anew. A reading that fails or makes no sense changes
/// nothing, and so does UPower's end.
/// Adapters are "usb <name>" where UPower's name for them speaks of USB, else "external <name>".
class UPowerSources final : public PowerSources, private BusFollower {
  public:
    /// More devices than that are taken for nonsense.
    static constexpr std::size_t kMostDevices = 64;

    explicit UPowerSources(BusThread& bus);
    ~UPowerSources() override;

    Observation observeSources(
        const WorkQueue& queue,
        std::function<void(const std::shared_ptr<PowerSource>&)> handler) override;
    bool hasExternalPower() const override { return hasExternalPower_; }
    Observation observeExternalPower(const WorkQueue& queue, Task changed) override;

  private:
    class Source;
    struct Device;
    struct Snapshot;

    const char* service() const override;
    void becameAvailable() override { reader_.read(); }
    void becameUnavailable() override;
    void received(sd_bus_message* signal) override;

    void beginReading();
    void readDevices(sd_bus_message* list);
    void tell();
    void setExternalPower(bool connected);

    // Only on the bus thread.
    BusReader reader_;
    std::unique_ptr<Snapshot> snapshot_;
    bool isKnown_ = false;  ///< A reading has succeeded once.

    std::atomic<bool> hasExternalPower_ = false;
    Observers<> externalChanged_;

    std::mutex mutex_;  ///< Holds back the appearance while somebody begins to observe.
    std::shared_ptr<Source> source_;
    Observers<std::shared_ptr<PowerSource>> appeared_;
};

}  // namespace keepsakes
