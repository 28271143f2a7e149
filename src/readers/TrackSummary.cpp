// SPDX-License-Identifier: Apache-2.0
#include "readers/TrackSummary.h"

#include <algorithm>
#include <cmath>

#include "platform/ActivityCatalogue.h"
#include "readers/ReaderLimits.h"

namespace keepsakes {

namespace {

constexpr double kShortestLeg = 5;    // seconds
constexpr double kLongestLeg = 300;   // seconds
constexpr double kSlowestMove = 0.5;  // m/s; slower is standing, with the receiver's noise

/// Less of the measured time than this in movement is a day's log, not an activity.
constexpr double kLeastMoving = 0.15;

// Medians of moving speed, in m/s.
constexpr double kFastestWalk = 2.0;     // 7.2 km/h
constexpr double kFastestRun = 4.2;      // 15 km/h
constexpr double kFastestRide = 12.5;    // 45 km/h
constexpr double kFastestSprint = 16.0;  // 58 km/h, for a tenth of the moving time

std::optional<double> legLength(const TrackSample& from, const TrackSample& to) {
    if (from.position && to.position) return distanceBetween(*from.position, *to.position);
    if (from.distance && to.distance) return std::abs(*to.distance - *from.distance);
    return std::nullopt;
}

}  // namespace

void SpeedProfile::add(const TrackSample& point) {
    if (!point.position && !point.distance) return;
    if (!from_) {
        from_ = point;
        return;
    }
    const double duration = point.time - from_->time;
    if (duration >= 0 && duration < kShortestLeg) return;
    const auto length = legLength(*from_, point);
    from_ = point;
    if (!length || duration < 0 || duration > kLongestLeg) return;
    measured_ += duration;
    const double speed = *length / duration;
    if (speed < kSlowestMove) return;
    const auto bin = std::min(speed / kBinWidth, static_cast<double>(kBins - 1));
    seconds_[static_cast<std::size_t>(bin)] += static_cast<float>(duration);
    moving_ += duration;
}

std::optional<double> SpeedProfile::quantile(double share) const {
    if (moving_ <= 0) return std::nullopt;
    double below = 0;
    for (std::size_t bin = 0; bin < kBins; ++bin) {
        below += static_cast<double>(seconds_[bin]);
        if (below >= share * moving_) return (static_cast<double>(bin) + 0.5) * kBinWidth;
    }
    return static_cast<double>(kBins) * kBinWidth;
}

std::optional<double> SpeedProfile::movingShare() const {
    return measured_ > 0 ? std::optional(moving_ / measured_) : std::nullopt;
}

std::optional<int> activityOfSpeed(const SpeedProfile& speed) {
    const auto moving = speed.movingShare();
    if (!moving) return activityCode("Other");
    if (*moving < kLeastMoving) return std::nullopt;
    if (*speed.quantile(0.9) >= kFastestSprint) return std::nullopt;
    const double median = *speed.quantile(0.5);
    if (median < kFastestWalk) return activityCode("Walking");
    if (median < kFastestRun) return activityCode("Running");
    if (median < kFastestRide) return activityCode("Cycling");
    return std::nullopt;
}

void TrackSummary::addPoint(const TrackSample& point) {
    widen(points_, {point.time, point.time});
    // UTC is what most files are written in, wherever the owner was: it tells no zone.
    if (point.offsetSeconds && *point.offsetSeconds != 0) {
        addZone(point.time, *point.offsetSeconds);
    }
    if (type_.meaning == ActivityWord::Meaning::silent) speed_.add(point);
}

void TrackSummary::addLap(KSDateInterval lap) { widen(laps_, lap); }

std::optional<WorkoutSample> TrackSummary::workout() const {
    const auto hasLength = [](const std::optional<KSDateInterval>& span) {
        return span && span->duration() > 0;
    };
    const auto& span = hasLength(points_) ? points_ : laps_;
    if (!hasLength(span) || span->duration() > limits::kLongestWorkout) return std::nullopt;
    std::optional<int> activity;
    switch (type_.meaning) {
        case ActivityWord::Meaning::transport:
            break;
        case ActivityWord::Meaning::activity:
            activity = type_.code;
            break;
        case ActivityWord::Meaning::silent:
            activity = activityOfSpeed(speed_);
            if (!activity && isActivity_) activity = activityCode("Other");
            break;
    }
    if (!activity) return std::nullopt;
    return WorkoutSample{span->start, span->end, *activity};
}

void TrackSummary::widen(std::optional<KSDateInterval>& span, KSDateInterval by) {
    if (!span) {
        span = by;
        return;
    }
    span->start = std::min(span->start, by.start);
    span->end = std::max(span->end, by.end);
}

void TrackSummary::addZone(KSDate time, int offsetSeconds) {
    if (!limits::isOffset(offsetSeconds)) return;
    if (!zones_.empty() && zones_.back().offsetSeconds == offsetSeconds) {
        auto& span = zones_.back().span;
        span.start = std::min(span.start, time);
        span.end = std::max(span.end, time);
    } else if (zones_.size() < limits::kMostZoneSpans) {
        zones_.push_back({{time, time}, offsetSeconds});
    }
}

}  // namespace keepsakes
