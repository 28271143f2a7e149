// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <deque>
#include <functional>
#include <optional>

#include "readers/LocationRecords.h"

namespace keepsakes {

// Where a stream of points stays. The rule is the stay point of Li, Zheng, Xie, Chen, Liu and Ma,
// "Mining User Similarity Based on Location History" (ACM GIS 2008): points of at least some
// minutes that all lie within a radius. docs/device-data.md tells what is added to it, and why.

/// Points of a stay lie within so many metres: of its first point until it is one, then of the mean
/// of its points.
inline constexpr double kStayRadius = 100;
/// A stay lasts so many seconds.
inline constexpr double kShortestStay = 300;
/// Two points of one place so many seconds apart leave no doubt that the owner stayed between them.
inline constexpr double kUnbrokenGap = 2700;
/// Of less than this share of a stay so covered, too little is known to be sure of it.
inline constexpr double kLeastCoveredShare = 0.1;
/// After a silence of more seconds, nothing is known to go on.
inline constexpr double kLongestSilence = 43200;
/// Who is back at a place after so many seconds never left it.
inline constexpr double kShortestAbsence = 600;

/// A point less accurate than so many metres tells no place.
inline constexpr float kWorstUsedAccuracy = 200;
/// Nobody moves faster, in m/s (an airliner with the wind); measured over a minute at least, since
/// some files tell times in whole minutes.
inline constexpr double kFastestMove = 340;
inline constexpr double kShortestMove = 60;
/// A point out of reach is believed once so many agree with it.
inline constexpr int kAgreeingPoints = 5;
/// A point away from both its neighbours, which are at most so many seconds apart, is a jump.
inline constexpr double kLongestJump = 120;

struct Stay {
    KSDateInterval span;
    GeoPoint center;  ///< The mean of its points.
    /// Seconds between points at most `kUnbrokenGap` apart.
    double covered = 0;
    std::uint32_t points = 0;
    /// Whether it may go on: no point tells of the owner's leaving for good.
    bool isOpen = false;

    /// 0 to 1. Five covered minutes that are a tenth of the stay are worth a half, the covered
    /// share the rest; a stay without them, of which little but silence is known, stays below the
    /// half.
    double confidence() const;

    friend bool operator==(const Stay&, const Stay&) = default;
};

/// Finds the stays of points that come in the order of time, in flat memory. What it finds from a
/// stay's first point on does not depend on the points before, so that it can begin there.
class StayDetector {
  public:
    explicit StayDetector(std::function<void(const Stay&)> found) : found_(std::move(found)) {}

    void add(const TrackPoint& point);

    /// Nothing goes on from the points before to those that follow.
    void interrupt();

    /// The end of the points.
    void finish();

  private:
    void keep(const TrackPoint& point);
    void follow(const TrackPoint& point);
    void extendCandidate(const TrackPoint& point);
    void beginStay();
    void include(const TrackPoint& point);
    void endStay();
    void settle(bool isOver);

    const std::function<void(const Stay&)> found_;

    // Of the points that are told from jumps.
    std::optional<TrackPoint> held_;  ///< Waits for its next neighbour.
    std::optional<TrackPoint> last_;  ///< The last one kept.
    std::optional<TrackPoint> doubted_;
    int agreeing_ = 0;

    // Of the stays.
    std::deque<TrackPoint> candidate_;  ///< All within the radius of the first; less than a stay.
    std::optional<Stay> current_;
    std::optional<Stay> previous_;  ///< Goes on in the next one, or is found.
};

}  // namespace keepsakes
