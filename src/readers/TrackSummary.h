// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <array>
#include <cstddef>
#include <optional>
#include <string_view>
#include <vector>

#include "core/KSDate.h"
#include "readers/ActivityWords.h"
#include "readers/FileRecords.h"

namespace keepsakes {

/// One recorded point, with what of it could be read.
struct TrackSample {
    KSDate time;
    std::optional<int> offsetSeconds;  ///< Absent when the timestamp names no zone.
    std::optional<GeoPoint> position;
    std::optional<double> distance;  ///< Metres from the start of the activity.
};

/// How fast a track moved: seconds of movement by speed, in bins, so that a track of any length
/// takes the same memory.
class SpeedProfile {
  public:
    /// Legs are measured between points some seconds apart: closer ones tell the receiver's noise,
    /// farther ones a pause.
    void add(const TrackSample& point);

    /// The next point is not reached from the last one.
    void breakLeg() { from_.reset(); }

    /// The speed in m/s below which the owner moved for `share` (0 to 1) of the moving time;
    /// nothing when nothing moved.
    std::optional<double> quantile(double share) const;

    /// The share (0 to 1) of the measured time that was movement; nothing when no leg was measured.
    std::optional<double> movingShare() const;

  private:
    static constexpr double kBinWidth = 0.1;
    static constexpr std::size_t kBins = 1000;

    std::optional<TrackSample> from_;
    std::array<float, kBins> seconds_{};
    double moving_ = 0;    // seconds
    double measured_ = 0;  // seconds
};

/// The activity that a speed profile looks like, for a track without a type: Walking, Running or
/// Cycling; nothing for a vehicle and for the log of a day that was mostly spent in one place;
/// Other when no speed can be told.
std::optional<int> activityOfSpeed(const SpeedProfile& speed);

/// Gathers one track or activity while it is read, in flat memory.
class TrackSummary {
  public:
    /// Whether the file says itself that this is an activity (TCX), not just a recorded track.
    explicit TrackSummary(bool isActivity) : isActivity_(isActivity) {}

    void setType(std::string_view type) { type_ = activityOfWord(type); }
    void breakLeg() { speed_.breakLeg(); }

    /// Only points whose time is sane.
    void addPoint(const TrackSample& point);

    /// A lap's span, used where fewer than two points have a time of their own.
    void addLap(KSDateInterval lap);

    /// Nothing without a span of time, for a span too long, and for what was no effort of the
    /// owner's.
    std::optional<WorkoutSample> workout() const;

    const std::vector<ZoneSpan>& zones() const { return zones_; }

  private:
    void widen(std::optional<KSDateInterval>& span, KSDateInterval by);
    void addZone(KSDate time, int offsetSeconds);

    bool isActivity_;
    ActivityWord type_;
    std::optional<KSDateInterval> points_;
    std::optional<KSDateInterval> laps_;
    SpeedProfile speed_;
    std::vector<ZoneSpan> zones_;
};

}  // namespace keepsakes
