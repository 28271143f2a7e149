// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <string_view>

#include "core/KSDate.h"

namespace keepsakes {

/// The time zones of one calendar file by the names (TZID) that its times give them. A name is, the
/// first that holds: one of the time zone database, also behind a prefix ("/x/2020/Europe/Berlin");
/// a Windows name; what the file itself defines under it (VTIMEZONE); an offset ("UTC+2"); and of
/// what nobody knows, the owner's zone. Used by one thread.
class CalendarZones {
  public:
    CalendarZones();
    ~CalendarZones();
    CalendarZones(const CalendarZones&) = delete;
    CalendarZones& operator=(const CalendarZones&) = delete;

    /// Takes a zone's definition, the lines of a VTIMEZONE component. One that changes more often
    /// than by the year is none.
    void define(const std::string& name, const std::string& component);

    /// The instant at which clocks in the zone show `local`, which is written as though it were
    /// UTC. In a repeated hour the first one, in a skipped hour as the clocks before it went. An
    /// empty name is the owner's zone.
    KSDate instantOf(KSDate local, const std::string& name);

    /// What clocks in the zone show at that instant, likewise written.
    KSDate localOf(KSDate instant, const std::string& name);

    /// Whether the zone is only taken to be the owner's, since nobody knows its name.
    bool isUnknown(const std::string& name);

  private:
    struct Zone;
    Zone& zoneOf(const std::string& name);

    std::map<std::string, std::string> definitions_;
    std::map<std::string, std::unique_ptr<Zone>> zones_;
};

}  // namespace keepsakes
