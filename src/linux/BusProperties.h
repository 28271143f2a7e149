// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <functional>
#include <initializer_list>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

struct sd_bus_message;

namespace keepsakes::bus {

inline constexpr const char* kPropertiesInterface = "org.freedesktop.DBus.Properties";

/// Reads the content of a property's variant; false when it has another type, or too much of it.
using PropertyReader = std::function<bool(sd_bus_message*)>;

PropertyReader into(std::optional<bool>& target);
PropertyReader into(std::optional<std::uint32_t>& target);
/// A finite number.
PropertyReader into(std::optional<double>& target);
PropertyReader into(std::optional<std::string>& target);

/// Appends the object path of a structure that begins with `before` and ends with the path, such as
/// "so"; "/" stands for none.
PropertyReader pathInto(std::vector<std::string>& paths, std::string before);
/// As `pathInto` for each structure of an array.
PropertyReader pathsInto(std::vector<std::string>& paths, std::string before);

using PropertyReaders = std::map<std::string_view, PropertyReader>;

/// Reads the a{sv} that GetAll answers; what is not asked for is passed over. False for a message
/// that is none, or a property of another type than expected.
bool readProperties(sd_bus_message* message, const PropertyReaders& readers);

/// Reads an ao of at most `most` paths.
std::optional<std::vector<std::string>> readPaths(sd_bus_message* message, std::size_t most);

/// Whether the signal says that one of the properties of `interface` changed.
bool tellsOfChange(sd_bus_message* signal, std::string_view interface,
                   std::initializer_list<std::string_view> properties);

/// "" where the message has none.
std::string_view pathOf(sd_bus_message* message);
std::string_view memberOf(sd_bus_message* message);

}  // namespace keepsakes::bus
