// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "core/Observers.h"

namespace keepsakes {

/// What a power source tells of itself; what it does not tell is absent.
struct PowerSourceProperties {
    struct Adapter {
        std::optional<std::string> description;  ///< Begins with its kind: "usb", "external", …
        friend bool operator==(const Adapter&, const Adapter&) = default;
    };

    std::optional<double> currentCapacity;  ///< In the unit of `maxCapacity`.
    std::optional<double> maxCapacity;
    std::optional<bool> externalConnected;
    std::optional<bool> fullyCharged;
    std::optional<Adapter> adapterDetails;  ///< Of the adapter that supplies the device now.

    friend bool operator==(const PowerSourceProperties&, const PowerSourceProperties&) = default;
};

/// One source: a battery together with what charges it. Any thread may call it; nothing waits.
class PowerSource {
  public:
    /// The message type of a changed property. A source may send others.
    static constexpr std::uint32_t kBatteryStatusHasChanged = 0xE0024100;

    virtual ~PowerSource() = default;
    virtual PowerSourceProperties properties() const = 0;
    /// Runs `handler` on `queue` with the type of each message.
    [[nodiscard]] virtual Observation observe(
        const WorkQueue& queue, std::function<void(std::uint32_t messageType)> handler) = 0;
};

/// The device's power sources. Any thread may call it; nothing waits.
class PowerSources {
  public:
    virtual ~PowerSources() = default;

    /// Runs `handler` on `queue` with each source: those that are there, and others as they appear.
    /// A source stays the same object while it comes and goes.
    [[nodiscard]] virtual Observation observeSources(
        const WorkQueue& queue,
        std::function<void(const std::shared_ptr<PowerSource>&)> handler) = 0;

    /// Whether the device is on external power. False until that is known; true on a device where
    /// nothing can tell, since those have no battery.
    virtual bool hasExternalPower() const = 0;
    /// Runs `changed` on `queue` each time the answer of `hasExternalPower` is another one.
    [[nodiscard]] virtual Observation observeExternalPower(const WorkQueue& queue,
                                                           Task changed) = 0;
};

}  // namespace keepsakes
