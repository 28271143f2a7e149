// SPDX-License-Identifier: Apache-2.0
#include "indexer/StayRule.h"

#include <algorithm>
#include <utility>

namespace keepsakes {

namespace {

bool isReachable(const TrackPoint& from, const TrackPoint& to) {
    const double seconds = std::max(to.time - from.time, kShortestMove);
    return distanceBetween(from.position, to.position) <= kFastestMove * seconds;
}

/// Whether the point in the middle is away from two neighbours that are close to each other.
bool isJump(const TrackPoint& before, const TrackPoint& point, const TrackPoint& after) {
    if (after.time - before.time > kLongestJump) return false;
    const double away = std::min(distanceBetween(before.position, point.position),
                                 distanceBetween(point.position, after.position));
    return away > kStayRadius && distanceBetween(before.position, after.position) < away / 2;
}

bool isInside(const GeoPoint& center, const TrackPoint& point) {
    return distanceBetween(center, point.position) <= kStayRadius;
}

double coveredBetween(KSDate from, KSDate to) { return to - from <= kUnbrokenGap ? to - from : 0; }

double blend(double a, double b, double shareOfB) { return a + (b - a) * shareOfB; }

/// The mean of two means; a stay on the date line may have points on both sides of it.
GeoPoint blend(const GeoPoint& a, GeoPoint b, double shareOfB) {
    if (b.longitude - a.longitude > 180) b.longitude -= 360;
    if (b.longitude - a.longitude < -180) b.longitude += 360;
    GeoPoint mean{.latitude = blend(a.latitude, b.latitude, shareOfB),
                  .longitude = blend(a.longitude, b.longitude, shareOfB)};
    if (mean.longitude > 180) mean.longitude -= 360;
    if (mean.longitude < -180) mean.longitude += 360;
    return mean;
}

}  // namespace

double Stay::confidence() const {
    const double share = span.duration() > 0 ? std::min(1.0, covered / span.duration()) : 0;
    const bool isSure = covered >= kShortestStay && share >= kLeastCoveredShare;
    return (isSure ? 0.5 : 0) + 0.5 * share;
}

void StayDetector::add(const TrackPoint& point) {
    if (point.accuracyMeters > kWorstUsedAccuracy) return;
    if (held_ && !(last_ && isJump(*last_, *held_, point))) keep(*held_);
    held_ = point;
}

void StayDetector::keep(const TrackPoint& point) {
    if (last_ && !isReachable(*last_, point)) {
        agreeing_ = doubted_ && isReachable(*doubted_, point) ? agreeing_ + 1 : 1;
        doubted_ = point;
        if (agreeing_ < kAgreeingPoints) return;
    }
    doubted_.reset();
    agreeing_ = 0;
    last_ = point;
    follow(point);
}

void StayDetector::follow(const TrackPoint& point) {
    if (current_) {
        if (point.time - current_->span.end <= kLongestSilence &&
            isInside(current_->center, point)) {
            include(point);
            return;
        }
        endStay();
    }
    extendCandidate(point);
}

void StayDetector::extendCandidate(const TrackPoint& point) {
    if (!candidate_.empty() && point.time - candidate_.back().time > kLongestSilence) {
        candidate_.clear();
    }
    candidate_.push_back(point);
    // The first point that has all that follow within reach.
    while (!std::ranges::all_of(candidate_, [this](const TrackPoint& other) {
        return isInside(candidate_.front().position, other);
    })) {
        candidate_.pop_front();
    }
    if (point.time - candidate_.front().time >= kShortestStay) beginStay();
}

void StayDetector::beginStay() {
    for (const auto& point : std::exchange(candidate_, {})) include(point);
}

void StayDetector::include(const TrackPoint& point) {
    if (!current_) {
        current_ = Stay{.span = {point.time, point.time}, .center = point.position, .points = 1};
        return;
    }
    auto& stay = *current_;
    ++stay.points;
    stay.center = blend(stay.center, point.position, 1.0 / stay.points);
    stay.covered += coveredBetween(stay.span.end, point.time);
    stay.span.end = point.time;
}

void StayDetector::endStay() {
    auto ended = *std::exchange(current_, std::nullopt);
    if (previous_ && ended.span.start - previous_->span.end <= kShortestAbsence &&
        distanceBetween(previous_->center, ended.center) <= kStayRadius) {
        const auto points = previous_->points + ended.points;
        previous_->center =
            blend(previous_->center, ended.center, static_cast<double>(ended.points) / points);
        previous_->points = points;
        previous_->covered += ended.covered + coveredBetween(previous_->span.end, ended.span.start);
        previous_->span.end = ended.span.end;
        return;
    }
    settle(true);
    previous_ = ended;
}

/// Hands out the stay before; `isOver` says that nothing can be joined to it.
void StayDetector::settle(bool isOver) {
    if (!previous_) return;
    previous_->isOpen = !isOver;
    found_(*std::exchange(previous_, std::nullopt));
}

void StayDetector::interrupt() {
    if (held_) keep(*held_);
    if (current_) endStay();
    settle(true);
    candidate_.clear();
    held_.reset();
    last_.reset();
    doubted_.reset();
}

void StayDetector::finish() {
    if (held_) keep(*held_);
    if (current_) endStay();
    if (previous_) settle(!last_ || last_->time - previous_->span.end > kShortestAbsence);
    interrupt();
}

}  // namespace keepsakes
