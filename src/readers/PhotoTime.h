// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string_view>

#include "core/KSDate.h"
#include "readers/FileRecords.h"

namespace keepsakes {

/// A receiver's time: seconds since UTC midnight, and the day's midnight where it was stamped.
struct GpsTime {
    double secondsOfDay = 0;
    std::optional<KSDate> day;

    friend bool operator==(const GpsTime&, const GpsTime&) = default;
};

/// When a photo was taken, as its file tells it.
struct CameraTime {
    KSDate local;  ///< What the clock showed, as though it were UTC.
    std::optional<int> offsetSeconds;
    std::optional<GpsTime> gps;
};

struct CaptureTime {
    KSDate taken;
    TimeSource source = TimeSource::ownerZone;
};

/// "2024:06:15 10:02:03" (Exif 2.32, 4.6.5), also with hyphens or a T as editors write it. Nothing
/// for the blanks and zeros that stand for an unknown time.
std::optional<ParsedDate> parseExifTime(std::string_view text);

/// "+02:00", as Exif 2.31 has it beside a time.
std::optional<int> parseExifOffset(std::string_view text);

/// The offset by which `local` is ahead of the receiver's time, to 15 minutes; nothing when the two
/// do not agree to within `limits::kLargestClockError`. The stamped day may be one off, as some
/// cameras write it: the time of day decides, and the day only between -12..-10 and +12..+14.
std::optional<int> offsetByGps(KSDate local, const GpsTime& gps);

/// By the offset, else by GPS, else by the owner's zone.
CaptureTime resolveCaptureTime(const CameraTime& camera);

}  // namespace keepsakes
