// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <systemd/sd-bus.h>

#include <memory>

namespace keepsakes::bus {

/// Owners of the bus library's objects. Private to sources: it pulls in the library's header. What
/// belongs to a connection is touched by that connection's thread alone.
struct Release {
    void operator()(sd_bus* bus) const { sd_bus_close_unref(bus); }
    void operator()(sd_bus_message* message) const { sd_bus_message_unref(message); }
    void operator()(sd_bus_slot* slot) const { sd_bus_slot_unref(slot); }
};

using OwnedConnection = std::unique_ptr<sd_bus, Release>;
using OwnedMessage = std::unique_ptr<sd_bus_message, Release>;
using OwnedSlot = std::unique_ptr<sd_bus_slot, Release>;

}  // namespace keepsakes::bus
