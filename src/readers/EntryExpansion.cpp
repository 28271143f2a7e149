// SPDX-License-Identifier: Apache-2.0
#include "readers/EntryExpansion.h"

#include <fmt/format.h>

#include <algorithm>
#include <cmath>
#include <utility>

#include "core/KSDate.h"
#include "readers/ReaderLimits.h"

namespace keepsakes {

namespace {

/// "20240615", or "20240615T080000Z" of an instant.
std::string stampOf(KSDate time, bool isDate) {
    auto stamp = formatISO8601(time);
    std::erase_if(stamp, [](char c) { return c == '-' || c == ':'; });
    if (isDate) stamp.resize(std::min<std::size_t>(stamp.size(), 8));
    return stamp;
}

KSDate startOfLocalDay(KSDate local) { return {std::floor(local.seconds / kDay) * kDay}; }

}  // namespace

KSDate EntryExpansion::instant(const CalendarTime& time) {
    return time.isUtc ? time.local : zones_.instantOf(time.local, time.zone);
}

EntryExpansion::Placed EntryExpansion::place(const CalendarEntry& entry, const CalendarTime& start,
                                             std::optional<double> seconds) {
    Placed placed{.start = instant(start), .end = {}, .local = start.local};
    if (seconds) {
        placed.end = placed.start + *seconds;
        return placed;
    }
    // Days are counted on the clocks, so that one of 23 or 25 hours is a day.
    auto end = start;
    if (entry.end && entry.start && (start.isDate || entry.end->isDate)) {
        end.local = start.local + (entry.end->local - entry.start->local);
    } else if (entry.end && entry.start) {
        placed.end = placed.start + (instant(*entry.end) - instant(*entry.start));
        placed.end = std::max(placed.end, placed.start);
        return placed;
    } else if (entry.duration) {
        const double days = std::floor(*entry.duration / kDay) * kDay;
        end.local = start.local + days;
        placed.end = instant(end) + (*entry.duration - days);
        return placed;
    } else if (start.isDate) {
        end.local = start.local + kDay;
    }
    if (start.isDate && end.local <= start.local) end.local = start.local + kDay;
    placed.end = std::max(instant(end), placed.start);
    return placed;
}

EntryExpansion::Occurrences EntryExpansion::occurrencesOf(const CalendarEntry& entry) {
    Occurrences occurrences;
    const auto add = [&](const CalendarTime& time, std::optional<double> seconds) {
        const auto placed = place(entry, time, seconds);
        occurrences.insert_or_assign(placed.start, placed);
    };
    add(*entry.start, std::nullopt);
    for (const auto& rule : entry.rules) {
        // Local time differs from UTC by a day at most.
        const auto& zone = entry.start->zone;
        const auto found =
            recurrences(rule, *entry.start, {window_.start - kDay, window_.end + kDay},
                        [this, &zone](KSDate instant) { return zones_.localOf(instant, zone); });
        if (!found) {
            leaveOut(found.error());
            continue;
        }
        for (const auto local : *found) {
            auto time = *entry.start;
            time.local = local;
            add(time, std::nullopt);
        }
    }
    for (const auto& date : entry.extraDates) add(date.time, date.seconds);
    removeExceptions(entry, occurrences);
    if (!entry.rules.empty() || !entry.extraDates.empty()) {
        std::erase_if(occurrences, [this](const auto& one) {
            return one.second.end < window_.start || one.second.start > window_.end;
        });
    }
    return occurrences;
}

void EntryExpansion::removeExceptions(const CalendarEntry& entry, Occurrences& occurrences) {
    std::vector<KSDate> days;
    for (const auto& exception : entry.exceptions) {
        if (exception.isDate && !entry.start->isDate) {
            days.push_back(exception.local);
        } else {
            occurrences.erase(instant(exception));
        }
    }
    if (days.empty()) return;
    // Some programs except the day on which a timed entry begins.
    std::ranges::sort(days);
    std::erase_if(occurrences, [&days](const auto& one) {
        return std::ranges::binary_search(days, startOfLocalDay(one.second.local));
    });
}

void EntryExpansion::put(const CalendarEntry& entry, const Placed& placed, std::string identifier,
                         bool recurs, const std::string& calendar, FileRecords& records) {
    if (placed.start < limits::kEarliestTime || placed.start > latest_ ||
        placed.end - placed.start > limits::kLongestEntry) {
        leaveOut("a date that is not believed");
        return;
    }
    if (recurs && records.occurrences.size() >= limits::kMostOccurrencesOfFile) {
        leaveOut("an occurrence beyond those that a file may have");
        return;
    }
    CalendarOccurrence occurrence{.identifier = std::move(identifier),
                                  .start = placed.start,
                                  .end = placed.end,
                                  .isAllDay = entry.start->isDate,
                                  .recurs = recurs,
                                  .title = entry.title,
                                  .location = entry.location,
                                  .calendar = calendar,
                                  .attendees = entry.attendees,
                                  .recognition = entry.recognition};
    // Hours that data tell once hold for no other occurrence.
    if (recurs && occurrence.recognition) occurrence.recognition->span.reset();
    records.occurrences.push_back(std::move(occurrence));
}

void EntryExpansion::addSeries(const CalendarEntry& entry,
                               const std::vector<CalendarEntry>& overrides,
                               const std::string& calendar, FileRecords& records) {
    const bool recurs = !entry.rules.empty() || !entry.extraDates.empty();
    recurs_ = recurs_ || !entry.rules.empty();
    struct Ranged {
        KSDate from;
        const CalendarEntry* entry;
        double shift;
    };
    std::map<KSDate, const CalendarEntry*> single;
    std::vector<Ranged> ranged;
    for (const auto& override : overrides) {
        const auto from = instant(*override.recurrenceId);
        if (override.andFuture) {
            ranged.push_back({from, &override, instant(*override.start) - from});
        } else {
            single[from] = &override;
        }
    }
    std::ranges::stable_sort(ranged, {}, &Ranged::from);
    const auto identifierAt = [&entry](const Placed& placed) {
        const bool isDate = entry.start->isDate;
        return fmt::format("{}/{}", entry.uid,
                           stampOf(isDate ? placed.local : placed.start, isDate));
    };
    for (const auto& [start, placed] : occurrencesOf(entry)) {
        if (single.contains(start)) continue;
        const auto identifier = recurs ? identifierAt(placed) : entry.uid;
        const auto later = std::ranges::find_if(
            ranged.rbegin(), ranged.rend(), [&](const Ranged& one) { return one.from <= start; });
        if (later == ranged.rend()) {
            put(entry, placed, identifier, recurs, calendar, records);
        } else if (!later->entry->isCancelled) {
            auto moved = place(*later->entry, *later->entry->start, std::nullopt);
            const double length = moved.end - moved.start;
            moved.start = placed.start + later->shift;
            moved.end = moved.start + length;
            put(*later->entry, moved, identifier, recurs, calendar, records);
        }
    }
    for (const auto& [from, override] : single) {
        if (override->isCancelled) continue;
        const Placed was{.start = from, .end = from, .local = override->recurrenceId->local};
        put(*override, place(*override, *override->start, std::nullopt), identifierAt(was), true,
            calendar, records);
    }
}

void EntryExpansion::add(std::vector<CalendarEntry> entries, const std::string& calendar,
                         FileRecords& records) {
    std::ranges::stable_sort(entries, {}, &CalendarEntry::sequence);
    const CalendarEntry* main = nullptr;
    std::vector<CalendarEntry> overrides;
    for (const auto& entry : entries) {
        if (!entry.start) {
            leaveOut("no start that can be read");
        } else if (entry.recurrenceId) {
            overrides.push_back(entry);
        } else {
            main = &entry;
        }
    }
    if (main) {
        if (!main->isCancelled) addSeries(*main, overrides, calendar, records);
    } else {
        // Invitations to single occurrences come without the entry.
        for (auto& override : overrides) {
            if (override.isCancelled) continue;
            const auto id = *override.recurrenceId;
            if (!override.rules.empty() || !override.extraDates.empty()) {
                addSeries(override, {}, calendar, records);
                continue;
            }
            const auto at = id.isDate ? id.local : instant(id);
            put(override, place(override, *override.start, std::nullopt),
                fmt::format("{}/{}", override.uid, stampOf(at, id.isDate)), true, calendar,
                records);
        }
    }
}

void EntryExpansion::finish(FileRecords& records) const {
    if (recurs_) records.recurrencesOver = window_;
    for (const auto& [why, count] : leftOut_) {
        records.remarks.push_back(fmt::format("left out: {} ({})", why, count));
    }
}

}  // namespace keepsakes
