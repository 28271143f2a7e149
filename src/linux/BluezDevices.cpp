// SPDX-License-Identifier: Apache-2.0
#include "linux/BluezDevices.h"

#include <fmt/format.h>

#include <cerrno>
#include <functional>
#include <map>
#include <optional>
#include <string_view>
#include <system_error>
#include <utility>

#include "bus/BusHandles.h"
#include "core/Clock.h"
#include "linux/BusProperties.h"

namespace keepsakes {

// Names: org.bluez.Adapter1 and org.bluez.Device1 of BlueZ's D-Bus API.
namespace {

constexpr const char* kBluezService = "org.bluez";
constexpr const char* kAdapterInterface = "org.bluez.Adapter1";
constexpr const char* kBluezDevice = "org.bluez.Device1";
constexpr const char* kObjectManager = "org.freedesktop.DBus.ObjectManager";

std::unexpected<KSError> failure(std::string_view what, int result) {
    return std::unexpected(KSError::make(
        kPosixErrorDomain, -result,
        fmt::format("nearby devices: {}: {}", what, std::generic_category().message(-result))));
}

/// What one look at BlueZ's objects found.
struct Objects {
    std::vector<std::string> poweredAdapters;    ///< Paths.
    std::map<std::string, std::string> devices;  ///< Names of those near, by address.
};

bool readDevice(sd_bus_message* message, Objects& objects) {
    std::optional<bool> isConnected;
    bool hasStrength = false;
    std::optional<std::string> alias;
    std::optional<std::string> name;
    std::optional<std::string> address;
    const auto strength = [&hasStrength](sd_bus_message* variant) {
        std::int16_t read = 0;
        hasStrength = sd_bus_message_read_basic(variant, 'n', &read) > 0;
        return hasStrength;
    };
    if (!bus::readProperties(message, {{"Connected", bus::into(isConnected)},
                                       {"RSSI", strength},
                                       {"Alias", bus::into(alias)},
                                       {"Name", bus::into(name)},
                                       {"Address", bus::into(address)}})) {
        return false;
    }
    if (!address || (!hasStrength && !isConnected.value_or(false))) return true;
    // Several adapters may hear the same device.
    objects.devices[*address] = alias ? *alias : name.value_or("");
    return objects.devices.size() <= BluezDevices::kMostDevices;
}

bool readAdapter(sd_bus_message* message, const char* path, Objects& objects) {
    std::optional<bool> isPowered;
    if (!bus::readProperties(message, {{"Powered", bus::into(isPowered)}})) return false;
    if (isPowered.value_or(false)) objects.poweredAdapters.emplace_back(path);
    return true;
}

/// Reads the a{sa{sv}} of one object.
bool readInterfaces(sd_bus_message* message, const char* path, Objects& objects) {
    if (sd_bus_message_enter_container(message, 'a', "{sa{sv}}") <= 0) return false;
    int entered = 0;
    while ((entered = sd_bus_message_enter_container(message, 'e', "sa{sv}")) > 0) {
        const char* name = nullptr;
        if (sd_bus_message_read_basic(message, 's', static_cast<void*>(&name)) <= 0) return false;
        const std::string_view interface(name);
        bool isRead = true;
        if (interface == kBluezDevice) {
            isRead = readDevice(message, objects) && sd_bus_message_exit_container(message) >= 0;
        } else if (interface == kAdapterInterface) {
            isRead =
                readAdapter(message, path, objects) && sd_bus_message_exit_container(message) >= 0;
        } else {
            isRead = sd_bus_message_skip(message, "a{sv}") >= 0;
        }
        if (!isRead || sd_bus_message_exit_container(message) < 0) return false;
    }
    return entered == 0 && sd_bus_message_exit_container(message) >= 0;
}

bool readObjects(sd_bus_message* message, Objects& objects) {
    if (sd_bus_message_enter_container(message, 'a', "{oa{sa{sv}}}") <= 0) return false;
    int entered = 0;
    while ((entered = sd_bus_message_enter_container(message, 'e', "oa{sa{sv}}")) > 0) {
        const char* path = nullptr;
        if (sd_bus_message_read_basic(message, 'o', static_cast<void*>(&path)) <= 0 ||
            !readInterfaces(message, path, objects) || sd_bus_message_exit_container(message) < 0) {
            return false;
        }
    }
    return entered == 0;
}

std::expected<bus::Message, KSError> call(sd_bus* connection, const char* path,
                                          const char* interface, const char* member) {
    sd_bus_message* made = nullptr;
    int result =
        sd_bus_message_new_method_call(connection, &made, kBluezService, path, interface, member);
    const bus::Message request(made);
    if (result >= 0) result = sd_bus_message_set_auto_start(request.get(), 0);
    if (result < 0) return failure(member, result);
    sd_bus_message* answer = nullptr;
    result = sd_bus_call(
        connection, request.get(),
        static_cast<std::uint64_t>(BluezDevices::kCallLimitSeconds * bus::kMicroseconds), nullptr,
        &answer);
    if (result < 0) return failure(member, result);
    return bus::Message(answer);
}

std::expected<Objects, KSError> readObjects(sd_bus* connection) {
    const auto answer = call(connection, "/", kObjectManager, "GetManagedObjects");
    if (!answer) return std::unexpected(answer.error());
    Objects objects;
    if (!readObjects(answer->get(), objects)) return failure("what BlueZ answers", -EBADMSG);
    return objects;
}

}  // namespace

NearbyDevices::Devices BluezDevices::devicesNear() {
    sd_bus* opened = nullptr;
    const int result = sd_bus_open_system(&opened);
    const bus::Connection connection(opened);
    if (result < 0) return failure("the system bus", result);
    auto objects = readObjects(connection.get());
    if (scan_ && objects && !isStopped_) {
        for (const auto& adapter : objects->poweredAdapters) {
            // One that cannot is none the less asked what it knows. The scan ends with the
            // connection.
            [[maybe_unused]] const auto answer =
                call(connection.get(), adapter.c_str(), kAdapterInterface, "StartDiscovery");
        }
        clock_.wait(stopped_, kScanSeconds);
        objects = readObjects(connection.get());
    }
    if (!objects) return std::unexpected(objects.error());
    std::vector<std::string> names;
    for (auto& [address, name] : objects->devices) names.push_back(std::move(name));
    return names;
}

void BluezDevices::stop() {
    isStopped_ = true;
    stopped_.signal();
}

}  // namespace keepsakes
