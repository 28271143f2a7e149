// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <systemd/sd-bus.h>
#include <systemd/sd-event.h>

#include <memory>

namespace keepsakes::linuxbus {

/// Owners of the bus library's objects. Private to sources: it pulls in the library's headers.
/// The library counts references without locks, so a connection and all its messages belong to
/// one thread.
struct Unref {
    void operator()(sd_bus* bus) const { sd_bus_close_unref(bus); }
    void operator()(sd_bus_slot* slot) const { sd_bus_slot_unref(slot); }
    void operator()(sd_event* event) const { sd_event_unref(event); }
    void operator()(sd_event_source* source) const { sd_event_source_disable_unref(source); }
};

using Connection = std::unique_ptr<sd_bus, Unref>;
using Slot = std::unique_ptr<sd_bus_slot, Unref>;
using Event = std::unique_ptr<sd_event, Unref>;
using EventSource = std::unique_ptr<sd_event_source, Unref>;

}  // namespace keepsakes::linuxbus
