// SPDX-License-Identifier: Apache-2.0
#include "linux/UPowerSources.h"

#include <fmt/format.h>
#include <systemd/sd-bus.h>

#include <algorithm>
#include <cctype>
#include <list>
#include <string>
#include <utility>

#include "linux/BusProperties.h"

namespace keepsakes {

// Names and numbers: UPower Reference Manual, org.freedesktop.UPower and .Device.
namespace {

constexpr const char* kPowerService = "org.freedesktop.UPower";
constexpr const char* kPowerPath = "/org/freedesktop/UPower";
constexpr const char* kPowerInterface = "org.freedesktop.UPower";
constexpr const char* kPowerDevice = "org.freedesktop.UPower.Device";

enum Type : std::uint32_t { kLinePower = 1, kBattery = 2, kUps = 3 };
constexpr std::uint32_t kFullyCharged = 4;

/// The kernel's names of supplies that are fed over USB, as UPower's native paths show them.
constexpr std::string_view kUsbWords[] = {"usb", "ucsi", "tcpm"};

}  // namespace

class UPowerSources::Source final : public PowerSource {
  public:
    PowerSourceProperties properties() const override {
        const std::lock_guard lock(mutex_);
        return properties_;
    }
    Observation observe(const WorkQueue& queue,
                        std::function<void(std::uint32_t)> handler) override {
        return observers_.add(queue, std::move(handler));
    }
    /// Tells the observers when they differ.
    void set(PowerSourceProperties properties) {
        {
            const std::lock_guard lock(mutex_);
            if (properties == properties_) return;
            properties_ = std::move(properties);
        }
        observers_.notify(kBatteryStatusHasChanged);
    }

  private:
    mutable std::mutex mutex_;
    PowerSourceProperties properties_;
    Observers<std::uint32_t> observers_;
};

struct UPowerSources::Device {
    std::string path;
    std::optional<std::uint32_t> type;
    std::optional<std::uint32_t> state;
    std::optional<bool> powerSupply;
    std::optional<bool> isPresent;
    std::optional<bool> online;
    std::optional<double> energy;
    std::optional<double> energyFull;
    std::optional<double> percentage;
    std::optional<std::string> nativePath;
    std::optional<std::string> model;

    bool isLinePower() const { return type == kLinePower; }
    bool isBattery() const {
        return (type == kBattery || type == kUps) && powerSupply.value_or(false) &&
               isPresent.value_or(true);
    }
    bool makesSense() const {
        const auto isAmount = [](const std::optional<double>& value) {
            return !value || (*value >= 0 && *value < 1e9);
        };
        return isAmount(energy) && isAmount(energyFull) && isAmount(percentage);
    }
    std::string description() const;
    /// False for properties that make no sense.
    bool read(sd_bus_message* message);
};

bool UPowerSources::Device::read(sd_bus_message* message) {
    return bus::readProperties(message, {{"Type", bus::into(type)},
                                         {"State", bus::into(state)},
                                         {"PowerSupply", bus::into(powerSupply)},
                                         {"IsPresent", bus::into(isPresent)},
                                         {"Online", bus::into(online)},
                                         {"Energy", bus::into(energy)},
                                         {"EnergyFull", bus::into(energyFull)},
                                         {"Percentage", bus::into(percentage)},
                                         {"NativePath", bus::into(nativePath)},
                                         {"Model", bus::into(model)}}) &&
           makesSense();
}

std::string UPowerSources::Device::description() const {
    auto name = nativePath.value_or("");
    if (name.empty()) name = path.substr(path.rfind('/') + 1);
    auto small = name;
    std::ranges::transform(small, small.begin(),
                           [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    const bool isUsb = std::ranges::any_of(
        kUsbWords, [&small](std::string_view word) { return small.find(word) != small.npos; });
    return fmt::format("{} {}", isUsb ? "usb" : "external",
                       model.value_or("").empty() ? name : *model);
}

/// One look at everything.
struct UPowerSources::Snapshot {
    std::optional<bool> onBattery;
    std::list<Device> devices;

    PowerSourceProperties properties() const;
    bool hasExternalPower() const;
    bool tellsOfSource() const {
        return std::ranges::any_of(
            devices, [](const Device& one) { return one.isBattery() || one.isLinePower(); });
    }
};

// Line power knows best: "on battery" follows it a little later, and not where a battery neither
// charges nor discharges.
bool UPowerSources::Snapshot::hasExternalPower() const {
    const auto isLine = [](const Device& device) { return device.isLinePower(); };
    if (std::ranges::none_of(devices, isLine)) return !onBattery.value_or(false);
    return std::ranges::any_of(devices, [](const Device& device) {
        return device.isLinePower() && device.online.value_or(false);
    });
}

PowerSourceProperties UPowerSources::Snapshot::properties() const {
    PowerSourceProperties properties;
    properties.externalConnected = hasExternalPower();
    double energy = 0;
    double energyFull = 0;
    double percentages = 0;
    int batteries = 0;
    bool allTellEnergy = true;
    bool allFull = true;
    for (const auto& device : devices) {
        if (device.isLinePower() && device.online.value_or(false) && !properties.adapterDetails) {
            properties.adapterDetails = {device.description()};
        }
        if (!device.isBattery()) continue;
        ++batteries;
        energy += device.energy.value_or(0);
        energyFull += device.energyFull.value_or(0);
        percentages += device.percentage.value_or(0);
        allTellEnergy = allTellEnergy && device.energy && device.energyFull.value_or(0) > 0;
        allFull = allFull && device.state == kFullyCharged;
    }
    if (batteries == 0) return properties;
    properties.fullyCharged = allFull;
    // Some drivers tell a share and no energy; several batteries then count alike.
    properties.currentCapacity = allTellEnergy ? energy : percentages;
    properties.maxCapacity = allTellEnergy ? energyFull : 100.0 * batteries;
    return properties;
}

UPowerSources::UPowerSources(BusThread& bus)
    : reader_(
          bus, kPowerService, [this] { beginReading(); }, [this] { tell(); },
          [this] { becameUnavailable(); }),
      snapshot_(std::make_unique<Snapshot>()) {
    bus.follow(*this);
}
UPowerSources::~UPowerSources() = default;

Observation UPowerSources::observeSources(
    const WorkQueue& queue, std::function<void(const std::shared_ptr<PowerSource>&)> handler) {
    const std::lock_guard lock(mutex_);
    auto observation = appeared_.add(queue, std::move(handler));
    if (source_) appeared_.notifyOnly(observation, source_);
    return observation;
}

Observation UPowerSources::observeExternalPower(const WorkQueue& queue, Task changed) {
    return externalChanged_.add(queue, std::move(changed));
}

const char* UPowerSources::service() const { return kPowerService; }

void UPowerSources::becameUnavailable() {
    reader_.abandon();
    if (!isKnown_) setExternalPower(true);
}

void UPowerSources::received(sd_bus_message* signal) {
    const bool matters =
        sd_bus_message_is_signal(signal, kPowerInterface, "DeviceAdded") > 0 ||
        sd_bus_message_is_signal(signal, kPowerInterface, "DeviceRemoved") > 0 ||
        (bus::pathOf(signal) == kPowerPath &&
         bus::tellsOfChange(signal, kPowerInterface, {"OnBattery"})) ||
        bus::tellsOfChange(signal, kPowerDevice,
                           {"Type", "State", "PowerSupply", "IsPresent", "Online", "Energy",
                            "EnergyFull", "Percentage", "NativePath", "Model"});
    if (matters) reader_.read();
}

void UPowerSources::beginReading() {
    *snapshot_ = {};
    reader_.askProperties(kPowerPath, kPowerInterface, [this](sd_bus_message* answer) {
        if (!bus::readProperties(answer, {{"OnBattery", bus::into(snapshot_->onBattery)}})) {
            reader_.fail("properties that make no sense");
        }
    });
    reader_.ask(kPowerPath, kPowerInterface, "EnumerateDevices", nullptr,
                [this](sd_bus_message* list) { readDevices(list); });
}

void UPowerSources::readDevices(sd_bus_message* list) {
    const auto paths = bus::readPaths(list, kMostDevices);
    if (!paths) {
        reader_.fail("a list of devices that makes no sense");
        return;
    }
    for (const auto& path : *paths) {
        auto& device = snapshot_->devices.emplace_back(Device{.path = path});
        reader_.askProperties(
            path, kPowerDevice,
            [this, &device](sd_bus_message* answer) {
                if (!device.read(answer)) reader_.fail(device.path + " makes no sense");
            },
            [] {});  // taken away meanwhile
    }
}

void UPowerSources::tell() {
    isKnown_ = true;
    setExternalPower(snapshot_->hasExternalPower());
    if (source_) {
        source_->set(snapshot_->properties());
    } else if (snapshot_->tellsOfSource()) {
        const auto source = std::make_shared<Source>();
        source->set(snapshot_->properties());
        const std::lock_guard lock(mutex_);
        source_ = source;
        appeared_.notify(source_);
    }
}

void UPowerSources::setExternalPower(bool connected) {
    if (hasExternalPower_.exchange(connected) != connected) externalChanged_.notify();
}

}  // namespace keepsakes
