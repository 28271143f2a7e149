// SPDX-License-Identifier: Apache-2.0
#include "indexer/LocationWriter.h"

#include <algorithm>
#include <cmath>
#include <cstdlib>

#include "readers/ReaderLimits.h"
#include "readers/StatedPlaces.h"

namespace keepsakes {

namespace {

constexpr std::uint64_t kPointsPerSign = 65536;

bool isOnEarth(const GeoPoint& point) {
    return std::abs(point.latitude) <= 90 && std::abs(point.longitude) <= 180;
}

bool isBelievable(KSDate time) {
    return time >= limits::kEarliestTime && time < KSDate::distantFuture();
}

}  // namespace

void LocationWriter::begin(std::int64_t file) {
    file_ = file;
    days_.clear();
    visits_ = 0;
    namedPlaces_ = 0;
    failure_ = nullptr;
    index_.removeLocations(file);
}

void LocationWriter::finish() {
    guarded([this] {
        for (auto& day : days_) write(day);
    });
    days_.clear();
    if (failure_) std::rethrow_exception(failure_);
}

template <class Work>
void LocationWriter::guarded(const Work& work) {
    if (failure_) return;
    try {
        work();
    } catch (const std::exception&) {
        failure_ = std::current_exception();
    }
}

void LocationWriter::point(const TrackPoint& point) {
    if (!isOnEarth(point.position) || !isBelievable(point.time)) return;
    if (++points_ % kPointsPerSign == 0) alive_();
    guarded([this, &point] { dayOf(point.time).add(point); });
}

DayPoints& LocationWriter::dayOf(KSDate time) {
    const auto day = utcDayOf(time);
    if (!days_.empty() && days_.front().day == day) return days_.front().points;
    const auto open = std::ranges::find(days_, day, &OpenDay::day);
    if (open != days_.end()) {
        days_.splice(days_.begin(), days_, open);
        return days_.front().points;
    }
    if (days_.size() == kMostOpenDays) {
        write(days_.back());
        days_.pop_back();
    }
    days_.push_front({.day = day, .points = {}});
    return days_.front().points;
}

void LocationWriter::write(OpenDay& day) {
    index_.putPoints(file_, day.day, encodePoints(day.day, day.points.take()));
}

void LocationWriter::visit(StatedVisit visit) {
    const double length = visit.stay.duration();
    if (!isOnEarth(visit.position) || !isBelievable(visit.stay.start) ||
        !(length > 0 && length <= kLongestStatedVisit) || ++visits_ > kMostStatedVisits) {
        return;
    }
    guarded([this, &visit] {
        index_.putStatedVisit(file_, visit, utcDayOf(visit.stay.start), utcDayOf(visit.stay.end));
    });
}

void LocationWriter::place(NamedPlace place) {
    if (!isOnEarth(place.position) || place.name.empty() || ++namedPlaces_ > kMostNamedPlaces) {
        return;
    }
    if (place.use == PlaceUse::unknown && place.origin == NamedPlace::Origin::owner) {
        place.use = useOfPlaceName(place.name);
    }
    guarded([this, &place] { index_.putNamedPlace(file_, place); });
}

}  // namespace keepsakes
