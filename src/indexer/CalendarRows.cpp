// SPDX-License-Identifier: Apache-2.0
#include "indexer/CalendarRows.h"

#include <fmt/format.h>
#include <fmt/ranges.h>

#include "indexer/IndexWriter.h"
#include "readers/ReaderLimits.h"

namespace keepsakes {

void putCalendar(IndexWriter& index, std::int64_t file, const FileRecords& records) {
    if (records.recurrencesOver) {
        SQLite::Statement put(index.database(),
                              "INSERT OR REPLACE INTO recurrenceWindows(file, start, end)"
                              " VALUES(?, ?, ?)");
        put.bind(1, file);
        put.bind(2, records.recurrencesOver->start.seconds);
        put.bind(3, records.recurrencesOver->end.seconds);
        put.exec();
    }
    if (records.occurrences.empty()) return;
    index.setMeta(kMetaTripsStale, 1);
    SQLite::Statement put(index.database(),
                          "INSERT INTO calendarEvents(file, identifier, start, end, allDay, recurs,"
                          " title, location, calendar, attendees, category, suggestion, origin,"
                          " destination) VALUES(?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)");
    for (const auto& occurrence : records.occurrences) {
        const auto& recognition = occurrence.recognition;
        const bool hasHours = recognition && recognition->span;
        const auto span =
            hasHours ? *recognition->span : KSDateInterval{occurrence.start, occurrence.end};
        put.clearBindings();
        put.bind(1, file);
        put.bind(2, occurrence.identifier);
        put.bind(3, span.start.seconds);
        put.bind(4, span.end.seconds);
        put.bind(5, occurrence.isAllDay && !hasHours ? 1 : 0);
        put.bind(6, occurrence.recurs ? 1 : 0);
        put.bind(7, occurrence.title);
        put.bind(8, occurrence.location);
        put.bind(9, occurrence.calendar);
        // Names are lines: they hold no line ends.
        put.bind(10, fmt::format("{}", fmt::join(occurrence.attendees, "\n")));
        if (recognition) {
            put.bind(11, static_cast<int>(recognition->category));
            put.bind(12, recognition->title);
            put.bind(13, recognition->origin);
            put.bind(14, recognition->destination);
        }
        runOnce(put);
    }
}

void rereadUsedUp(IndexWriter& index, KSDate now) {
    SQLite::Statement usedUp(index.database(),
                             "SELECT count(*) FROM recurrenceWindows"
                             " WHERE end < ?1 OR start > ?2");
    usedUp.bind(1, (now + kRecurrenceMargin).seconds);
    usedUp.bind(2, (now - kRecurrenceMargin).seconds);
    if (!usedUp.executeStep() || usedUp.getColumn(0).getInt64() == 0) return;
    index.begin();
    SQLite::Statement reread(index.database(),
                             "UPDATE files SET mtime = -1 WHERE id IN (SELECT file FROM"
                             " recurrenceWindows WHERE end < ?1 OR start > ?2)");
    reread.bind(1, (now + kRecurrenceMargin).seconds);
    reread.bind(2, (now - kRecurrenceMargin).seconds);
    reread.exec();
}

}  // namespace keepsakes
