// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <systemd/sd-bus.h>

#include <memory>
#include <string_view>

namespace keepsakes::bus {

/// Owners of the bus library's objects. Private to sources: it pulls in the library's header.
/// The library counts references without locks, so a connection and all that came of it, messages
/// and slots, belong to one thread.
struct Unref {
    void operator()(sd_bus* bus) const { sd_bus_close_unref(bus); }
    void operator()(sd_bus_message* message) const { sd_bus_message_unref(message); }
    void operator()(sd_bus_slot* slot) const { sd_bus_slot_unref(slot); }
};

using Connection = std::unique_ptr<sd_bus, Unref>;
using Message = std::unique_ptr<sd_bus_message, Unref>;
using Slot = std::unique_ptr<sd_bus_slot, Unref>;

/// A text of the library's, which gives none as a null pointer.
inline std::string_view view(const char* text) { return text ? text : ""; }

/// The library counts time in microseconds.
inline constexpr double kMicroseconds = 1e6;

}  // namespace keepsakes::bus
