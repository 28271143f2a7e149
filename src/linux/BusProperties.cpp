// SPDX-License-Identifier: Apache-2.0
#include "linux/BusProperties.h"

#include <systemd/sd-bus.h>

#include <algorithm>
#include <cmath>
#include <utility>

#include "bus/BusHandles.h"

namespace keepsakes::bus {

namespace {

/// Of one array of structures.
constexpr std::size_t kMostPaths = 64;
/// Of one text.
constexpr std::size_t kLongestText = 1024;

/// A structure of `before` and an object path; 1 when it was read, 0 at the end of an array.
int readPath(sd_bus_message* message, const std::string& before, std::vector<std::string>& paths) {
    const auto content = before + "o";
    const int entered = sd_bus_message_enter_container(message, 'r', content.c_str());
    if (entered <= 0) return entered;
    const char* path = nullptr;
    if (sd_bus_message_skip(message, before.c_str()) < 0) return -1;
    if (sd_bus_message_read_basic(message, 'o', static_cast<void*>(&path)) <= 0) return -1;
    if (paths.size() >= kMostPaths) return -1;
    if (bus::view(path) != "/") paths.emplace_back(path);
    return sd_bus_message_exit_container(message) < 0 ? -1 : 1;
}

}  // namespace

PropertyReader into(std::optional<bool>& target) {
    return [&target](sd_bus_message* message) {
        int read = 0;
        if (sd_bus_message_read_basic(message, 'b', &read) <= 0) return false;
        target = read != 0;
        return true;
    };
}

PropertyReader into(std::optional<std::uint32_t>& target) {
    return [&target](sd_bus_message* message) {
        std::uint32_t read = 0;
        if (sd_bus_message_read_basic(message, 'u', &read) <= 0) return false;
        target = read;
        return true;
    };
}

PropertyReader into(std::optional<double>& target) {
    return [&target](sd_bus_message* message) {
        double read = 0;
        if (sd_bus_message_read_basic(message, 'd', &read) <= 0) return false;
        target = read;
        return std::isfinite(read);
    };
}

PropertyReader into(std::optional<std::string>& target) {
    return [&target](sd_bus_message* message) {
        const char* read = nullptr;
        if (sd_bus_message_read_basic(message, 's', static_cast<void*>(&read)) <= 0) return false;
        target = bus::view(read);
        return target->size() <= kLongestText;
    };
}

PropertyReader pathInto(std::vector<std::string>& paths, std::string before) {
    return [&paths, content = std::move(before)](sd_bus_message* message) {
        return readPath(message, content, paths) > 0;
    };
}

PropertyReader pathsInto(std::vector<std::string>& paths, std::string before) {
    return [&paths, content = std::move(before)](sd_bus_message* message) {
        const auto array = "(" + content + "o)";
        if (sd_bus_message_enter_container(message, 'a', array.c_str()) <= 0) return false;
        int read = 0;
        while ((read = readPath(message, content, paths)) > 0) {
        }
        return read == 0 && sd_bus_message_exit_container(message) >= 0;
    };
}

bool readProperties(sd_bus_message* message, const PropertyReaders& readers) {
    if (sd_bus_message_enter_container(message, 'a', "{sv}") <= 0) return false;
    int entered = 0;
    while ((entered = sd_bus_message_enter_container(message, 'e', "sv")) > 0) {
        const char* name = nullptr;
        if (sd_bus_message_read_basic(message, 's', static_cast<void*>(&name)) <= 0) return false;
        const auto reader = readers.find(bus::view(name));
        if (reader == readers.end()) {
            if (sd_bus_message_skip(message, "v") < 0) return false;
        } else if (sd_bus_message_enter_container(message, 'v', nullptr) <= 0 ||
                   !reader->second(message) || sd_bus_message_exit_container(message) < 0) {
            return false;
        }
        if (sd_bus_message_exit_container(message) < 0) return false;
    }
    return entered == 0;
}

std::optional<std::vector<std::string>> readPaths(sd_bus_message* message, std::size_t most) {
    if (sd_bus_message_enter_container(message, 'a', "o") <= 0) return std::nullopt;
    std::vector<std::string> paths;
    const char* path = nullptr;
    int read = 0;
    while ((read = sd_bus_message_read_basic(message, 'o', static_cast<void*>(&path))) > 0) {
        if (paths.size() >= most) return std::nullopt;
        paths.emplace_back(path);
    }
    if (read < 0) return std::nullopt;
    return paths;
}

bool tellsOfChange(sd_bus_message* signal, std::string_view interface,
                   std::initializer_list<std::string_view> properties) {
    if (!sd_bus_message_is_signal(signal, kPropertiesInterface, "PropertiesChanged")) return false;
    if (sd_bus_message_rewind(signal, 1) < 0) return false;
    const char* named = nullptr;
    if (sd_bus_message_read_basic(signal, 's', static_cast<void*>(&named)) <= 0 ||
        bus::view(named) != interface) {
        return false;
    }
    const auto isWanted = [&properties](const char* name) {
        return std::ranges::find(properties, bus::view(name)) != properties.end();
    };
    const char* name = nullptr;
    if (sd_bus_message_enter_container(signal, 'a', "{sv}") <= 0) return false;
    while (sd_bus_message_enter_container(signal, 'e', "sv") > 0) {
        if (sd_bus_message_read_basic(signal, 's', static_cast<void*>(&name)) <= 0) return false;
        if (isWanted(name)) return true;
        if (sd_bus_message_skip(signal, "v") < 0) return false;
        if (sd_bus_message_exit_container(signal) < 0) return false;
    }
    if (sd_bus_message_exit_container(signal) < 0) return false;
    if (sd_bus_message_enter_container(signal, 'a', "s") <= 0) return false;
    while (sd_bus_message_read_basic(signal, 's', static_cast<void*>(&name)) > 0) {
        if (isWanted(name)) return true;
    }
    return false;
}

std::string_view pathOf(sd_bus_message* message) {
    return bus::view(sd_bus_message_get_path(message));
}
std::string_view memberOf(sd_bus_message* message) {
    return bus::view(sd_bus_message_get_member(message));
}

}  // namespace keepsakes::bus
