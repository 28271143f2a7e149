// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cmath>
#include <functional>
#include <variant>
#include <vector>

#include "ReaderCheck.h"
#include "platform/ActivityCatalogue.h"
#include "readers/LocationRecords.h"
#include "readers/TextFolding.h"

namespace keepsakes {

/// Keeps what a reader tells of places; each must be one that the index may hold.
class CheckedPlaces final : public LocationSink {
  public:
    void point(const TrackPoint& point) override {
        check(limits::isSane(point.time, kFuzzNow.now), "a point at a sane time");
        checkPosition(point.position);
        const auto accuracy = point.accuracyMeters;
        check(std::isnan(accuracy) || (accuracy > 0 && std::isfinite(accuracy)), "an accuracy");
        // A number that is none equals nothing.
        told_.emplace_back(
            TrackPoint{point.time, point.position, std::isnan(accuracy) ? -1.0F : accuracy});
    }

    void visit(StatedVisit visit) override {
        check(visit.stay.start < visit.stay.end && limits::isSane(visit.stay.start, kFuzzNow.now) &&
                  limits::isSane(visit.stay.end, kFuzzNow.now),
              "a visit is a span of sane times");
        checkPosition(visit.position);
        check(visit.confidence >= 0 && visit.confidence <= 1, "a confidence from 0 to 1");
        check(cleanText(visit.name) == visit.name, "a clean name");
        told_.emplace_back(std::move(visit));
    }

    void place(NamedPlace place) override {
        checkPosition(place.position);
        check(!place.name.empty() && cleanText(place.name) == place.name, "a clean name");
        told_.emplace_back(std::move(place));
    }

    bool isBeginningOf(const CheckedPlaces& whole) const {
        return told_.size() <= whole.told_.size() &&
               std::equal(told_.begin(), told_.end(), whole.told_.begin());
    }

    friend bool operator==(const CheckedPlaces& a, const CheckedPlaces& b) {
        return a.told_ == b.told_;
    }

  private:
    static void checkPosition(const GeoPoint& position) {
        check(std::abs(position.latitude) <= 90 && std::abs(position.longitude) <= 180,
              "a position on earth");
    }

    std::vector<std::variant<TrackPoint, StatedVisit, NamedPlace>> told_;
};

using PlacesReader = std::function<std::expected<FileRecords, std::string>(
    const ReadBlock&, const ReaderContext&, LocationSink&)>;

/// Ends the run unless the bytes tell the same in small blocks, a beginning of it when they are
/// cut, and only records that the index may hold. A format of lines is cut at their ends: with
/// something behind its message a line is none, and cut before that it is one.
inline void checkReader(const PlacesReader& reader, std::string_view bytes, std::size_t seed,
                        bool inLines = false) {
    CheckedPlaces whole;
    CheckedPlaces pieces;
    CheckedPlaces part;
    const auto records = reader(inBlocks(bytes, 0), kFuzzNow, whole);
    const auto fromPieces = reader(inBlocks(bytes, 1 + seed), kFuzzNow, pieces);
    // The XML parser words its reason by how much of a broken token it holds.
    const bool sameOutcome = records ? records == fromPieces : !fromPieces;
    check(sameOutcome && whole == pieces, "blocks change nothing");
    auto length = bytes.empty() ? 0 : seed * 31 % bytes.size();
    if (inLines) length = bytes.substr(0, length).rfind('\n') + 1;
    const auto cut = reader(inBlocks(bytes.substr(0, length), 0), kFuzzNow, part);
    check(part.isBeginningOf(whole), "a part tells a part");
    check(cut || !cut.error().empty(), "a refusal has a reason");
    if (!records) return check(!records.error().empty(), "a refusal has a reason");
    const auto sane = [](KSDateInterval span) {
        return span.start <= span.end && limits::isSane(span.start, kFuzzNow.now) &&
               limits::isSane(span.end, kFuzzNow.now);
    };
    for (const auto& workout : records->workouts) {
        check(sane({workout.start, workout.end}), "a workout is a span of sane times");
        check(activityName(workout.activityType).has_value(), "an activity of the catalogue");
    }
    for (const auto& zone : records->zones) {
        check(sane(zone.span) && limits::isOffset(zone.offsetSeconds), "a zone is a sane span");
    }
}

}  // namespace keepsakes
