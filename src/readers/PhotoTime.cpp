// SPDX-License-Identifier: Apache-2.0
#include "readers/PhotoTime.h"

#include <algorithm>
#include <cmath>
#include <string>

#include "core/Calendar.h"
#include "core/Text.h"
#include "readers/ReaderLimits.h"

namespace keepsakes {

namespace {

constexpr std::string_view kPadding{" \0", 2};
constexpr double kOffsetStep = 900;

}  // namespace

std::optional<ParsedDate> parseExifTime(std::string_view text) {
    std::string iso(trimmed(text, kPadding));
    constexpr std::size_t kAfterYear = 4;
    constexpr std::size_t kAfterMonth = 7;
    if (iso.size() <= kAfterMonth || iso.starts_with("0000")) return std::nullopt;
    for (const auto at : {kAfterYear, kAfterMonth}) {
        if (iso[at] == ':') iso[at] = '-';
    }
    // A day alone is no time of capture.
    if (iso.find(':') == std::string::npos) return std::nullopt;
    return parseISO8601(iso);
}

std::optional<int> parseExifOffset(std::string_view text) {
    const auto parsed = parseISO8601("2001-01-01T00:00:00" + std::string(trimmed(text, kPadding)));
    if (!parsed || !parsed->offsetSeconds || !limits::isOffset(*parsed->offsetSeconds)) {
        return std::nullopt;
    }
    return parsed->offsetSeconds;
}

std::optional<int> offsetByGps(KSDate local, const GpsTime& gps) {
    const double midnight = gps.day ? gps.day->seconds : std::floor(local.seconds / kDay) * kDay;
    const double ahead = local.seconds - (midnight + gps.secondsOfDay);
    // Farther off than a day's slip, it is the time of another fix.
    if (ahead < limits::kLowestOffset - kDay || ahead > limits::kHighestOffset + kDay) {
        return std::nullopt;
    }
    double offset = std::round(ahead / kOffsetStep) * kOffsetStep;
    if (std::abs(ahead - offset) > limits::kLargestClockError) return std::nullopt;
    if (offset < limits::kLowestOffset || offset > limits::kHighestOffset) {
        offset -= std::round(offset / kDay) * kDay;
    }
    return static_cast<int>(offset);
}

CaptureTime resolveCaptureTime(const CameraTime& camera) {
    if (camera.offsetSeconds) {
        return {camera.local - *camera.offsetSeconds, TimeSource::offset};
    }
    if (camera.gps) {
        if (const auto offset = offsetByGps(camera.local, *camera.gps)) {
            return {camera.local - *offset, TimeSource::gps};
        }
    }
    return {calendar::fromLocal(camera.local), TimeSource::ownerZone};
}

}  // namespace keepsakes
