// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "core/KSDate.h"
#include "platform/GeoPoint.h"
#include "platform/HealthStore.h"
#include "readers/CalendarRecords.h"

namespace keepsakes {

/// Where the offset of a local time came from, best first.
enum class TimeSource { offset, gps, track, ownerZone };

struct PublicEventRecord {
    std::string name;
    std::vector<std::string> performers;
    std::string venue;

    friend bool operator==(const PublicEventRecord&, const PublicEventRecord&) = default;
};

/// What one photo's metadata says.
struct PhotoRecord {
    KSDate taken;  ///< The instant, by `timeSource`.
    TimeSource timeSource = TimeSource::ownerZone;
    KSDate localTime;  ///< What the camera's clock showed, written as though it were UTC.
    std::optional<GeoPoint> position;
    std::vector<std::string> inferences;  ///< Words of the inference table, distinct.
    std::vector<std::string> persons;     ///< Names, distinct.
    std::vector<std::string> holidays;
    std::vector<PublicEventRecord> publicEvents;
    std::vector<std::string> keywords;  ///< Folded, words apart by blanks; distinct.

    friend bool operator==(const PhotoRecord&, const PhotoRecord&) = default;
};

/// A time for which a track's own timestamps say how far local time is from UTC.
struct ZoneSpan {
    KSDateInterval span;
    int offsetSeconds = 0;

    friend bool operator==(const ZoneSpan&, const ZoneSpan&) = default;
};

/// Everything that one file holds for the index.
struct FileRecords {
    std::vector<WorkoutSample> workouts;
    std::vector<PhotoRecord> photos;
    std::vector<ZoneSpan> zones;
    std::vector<CalendarOccurrence> occurrences{};
    /// The time for which recurring entries were followed; nothing when there are none.
    std::optional<KSDateInterval> recurrencesOver{};
    std::vector<std::string> remarks{};  ///< What was left out of a file that was read, and why.

    friend bool operator==(const FileRecords&, const FileRecords&) = default;
};

}  // namespace keepsakes
