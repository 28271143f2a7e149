// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "readers/CalendarEntry.h"
#include "readers/CalendarZones.h"
#include "readers/FileRecords.h"

namespace keepsakes {

/// Makes occurrences of a file's entries: recurring ones within the window, others wherever they
/// are believed. Used by one thread; the zones outlive it.
class EntryExpansion {
  public:
    EntryExpansion(CalendarZones& zones, KSDateInterval window, KSDate latest)
        : zones_(zones), window_(window), latest_(latest) {}

    /// The entries of one UID, in whatever order. Of several that say the same, the one with the
    /// highest sequence number counts, and of those the last.
    void add(std::vector<CalendarEntry> entries, const std::string& calendar, FileRecords& records);

    /// Says what was left out, and for which time recurring entries were followed.
    void finish(FileRecords& records) const;

  private:
    struct Placed {
        KSDate start;
        KSDate end;
        KSDate local;  ///< Of the start.
    };
    using Occurrences = std::map<KSDate, Placed>;  ///< By when the rule has them begin.

    KSDate instant(const CalendarTime& time);
    Placed place(const CalendarEntry& entry, const CalendarTime& start,
                 std::optional<double> seconds);
    Occurrences occurrencesOf(const CalendarEntry& entry);
    void removeExceptions(const CalendarEntry& entry, Occurrences& occurrences);
    void addSeries(const CalendarEntry& entry, const std::vector<CalendarEntry>& overrides,
                   const std::string& calendar, FileRecords& records);
    void put(const CalendarEntry& entry, const Placed& placed, std::string identifier, bool recurs,
             const std::string& calendar, FileRecords& records);
    void leaveOut(const std::string& why) { ++leftOut_[why]; }

    CalendarZones& zones_;
    KSDateInterval window_;
    KSDate latest_;
    bool recurs_ = false;
    std::map<std::string, std::uint64_t> leftOut_;
};

}  // namespace keepsakes
