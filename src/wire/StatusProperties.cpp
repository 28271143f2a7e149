// SPDX-License-Identifier: Apache-2.0
#include "wire/StatusProperties.h"

#include <fmt/format.h>
#include <systemd/sd-bus.h>

#include <algorithm>
#include <array>
#include <cerrno>

#include "core/Text.h"
#include "wire/BusNames.h"

namespace keepsakes {

namespace {

using Status = DaemonStatus;

int append(sd_bus_message* out, const std::string& value) {
    return sd_bus_message_append(out, "s", plainUtf8(value).c_str());
}
int append(sd_bus_message* out, bool value) {
    return sd_bus_message_append(out, "b", static_cast<int>(value));
}
int append(sd_bus_message* out, double value) { return sd_bus_message_append(out, "d", value); }
int append(sd_bus_message* out, std::uint64_t value) {
    return sd_bus_message_append(out, "t", value);
}
int append(sd_bus_message* out, const std::vector<std::string>& value) {
    int result = sd_bus_message_open_container(out, 'a', "s");
    for (const auto& item : value) {
        if (result >= 0) result = append(out, item);
    }
    return result < 0 ? result : sd_bus_message_close_container(out);
}

struct Property {
    std::string_view name;
    const char* type;
    int (*append)(sd_bus_message*, const Status&);
};

template <auto Member>
constexpr auto kAppend =
    [](sd_bus_message* out, const Status& status) { return append(out, status.*Member); };

constexpr auto kProperties = std::to_array<Property>({
    {"Version", "s", kAppend<&Status::version>},
    {"DatabaseAvailable", "b", kAppend<&Status::databaseAvailable>},
    {"LastCollection", "d", kAppend<&Status::lastCollection>},
    {"CollectEnabled", "b", kAppend<&Status::collectEnabled>},
    {"ComputeEnabled", "b", kAppend<&Status::computeEnabled>},
    {"PurgeEnabled", "b", kAppend<&Status::purgeEnabled>},
    {"EventCount", "t", kAppend<&Status::eventCount>},
    {"BundleCount", "t", kAppend<&Status::bundleCount>},
    {"FilesIndexed", "t", kAppend<&Status::filesIndexed>},
    {"FilesRefused", "t", kAppend<&Status::filesRefused>},
    {"Problems", "as", kAppend<&Status::problems>},
});

int appendVariant(sd_bus_message* out, const Property& property, const Status& status) {
    int result = sd_bus_message_open_container(out, 'v', property.type);
    if (result >= 0) result = property.append(out, status);
    return result < 0 ? result : sd_bus_message_close_container(out);
}

int appendAll(sd_bus_message* out, const Status& status) {
    int result = sd_bus_message_open_container(out, 'a', "{sv}");
    for (const auto& property : kProperties) {
        if (result >= 0) result = sd_bus_message_open_container(out, 'e', "sv");
        if (result >= 0) result = sd_bus_message_append_basic(out, 's', property.name.data());
        if (result >= 0) result = appendVariant(out, property, status);
        if (result >= 0) result = sd_bus_message_close_container(out);
    }
    return result < 0 ? result : sd_bus_message_close_container(out);
}

int appendNone(sd_bus_message* out) { return sd_bus_message_append(out, "a{sv}", 0); }

Admission refuse(const char* name, std::string text) { return {name, std::move(text)}; }

Admission callGet(sd_bus_message* message, StatusSource& source, Respond respond) {
    const char* interface = nullptr;
    const char* name = nullptr;
    if (sd_bus_message_read(message, "ss", &interface, &name) < 0) {
        return refuse(bus::kInvalidArgs, "Get takes an interface and a property");
    }
    const bool ours = *interface == 0 || std::string_view(interface) == bus::kStatusInterface;
    const auto* property = std::ranges::find(kProperties, name, &Property::name);
    if (!ours || property == kProperties.end()) {
        return refuse(SD_BUS_ERROR_UNKNOWN_PROPERTY,
                      fmt::format("no property \"{}\" of \"{}\"", name, interface));
    }
    source.status([respond = std::move(respond), property](Status status) {
        respond({.body = [property, status = std::move(status)](sd_bus_message* out) {
            return appendVariant(out, *property, status);
        }});
    });
    return {};
}

Admission callGetAll(sd_bus_message* message, StatusSource& source, Respond respond) {
    const char* interface = nullptr;
    if (sd_bus_message_read(message, "s", &interface) < 0) {
        return refuse(bus::kInvalidArgs, "GetAll takes an interface");
    }
    const std::string_view asked = interface;
    if (asked == bus::kConduitInterface) {
        respond({.body = appendNone});
        return {};
    }
    if (!asked.empty() && asked != bus::kStatusInterface) {
        return refuse(SD_BUS_ERROR_UNKNOWN_INTERFACE, fmt::format("no interface \"{}\"", asked));
    }
    source.status([respond = std::move(respond)](Status status) {
        respond({.body = [status = std::move(status)](sd_bus_message* out) {
            return appendAll(out, status);
        }});
    });
    return {};
}

}  // namespace

Admission callProperties(sd_bus_message* message, StatusSource& source, Respond respond) {
    const std::string_view member = sd_bus_message_get_member(message);
    const std::string_view signature = sd_bus_message_get_signature(message, 1);
    if (member == "Get" && signature == "ss") return callGet(message, source, std::move(respond));
    if (member == "GetAll" && signature == "s") {
        return callGetAll(message, source, std::move(respond));
    }
    if (member == "Set" && signature == "ssv") {
        return refuse(SD_BUS_ERROR_PROPERTY_READ_ONLY, "the status can only be read");
    }
    if (member == "Get" || member == "GetAll" || member == "Set") {
        return refuse(bus::kInvalidArgs,
                      fmt::format("{} does not take arguments of type \"{}\"", member, signature));
    }
    return refuse(SD_BUS_ERROR_UNKNOWN_METHOD, fmt::format("no method \"{}\"", member));
}

}  // namespace keepsakes
