// SPDX-License-Identifier: Apache-2.0
#include "readers/LocationHistoryReader.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdint>
#include <limits>
#include <optional>
#include <utility>
#include <vector>

#include "readers/JsonStream.h"
#include "readers/Position.h"
#include "readers/ReaderLimits.h"
#include "readers/StatedPlaces.h"

namespace keepsakes {

namespace {

/// The members that matter, by where they stand.
enum class Place : std::uint8_t {
    document,
    ignored,
    // Objects with a position and, most of them, a time: spots.
    record,
    rawPoint,
    signal,
    pathPoint,
    stayedAt,
    from,
    to,
    waypoint,
    favourite,
    // Spans of time: stays and ways.
    timelineObject,
    stay,
    way,
    segment,
    // Parts of those.
    duration,
    rawPath,
    waypointPath,
    visit,
    activity,
    rawSignal,
    profile,
    // Values of a spot.
    latitudeE7,
    longitudeE7,
    degrees,
    accuracy,
    time,
    minutesFromStart,
    name,
    address,
    label,
    placeConfidence,
    // Values of a span.
    start,
    end,
    startOffset,
    endOffset,
    visitConfidence,
    visitProbability,
    hierarchyLevel,
};

// Raw records, semantic history ("timelineObjects"), and the history that a device exports
// ("semanticSegments", or an array of segments), whose positions are texts.
constexpr auto kSteps = std::to_array<JsonStep<Place>>({
    {Place::document, "locations", Place::record},
    {Place::document, "timelineObjects", Place::timelineObject},
    {Place::document, "semanticSegments", Place::segment},
    {Place::document, "rawSignals", Place::rawSignal},
    {Place::document, "userLocationProfile", Place::profile},

    {Place::timelineObject, "placeVisit", Place::stay},
    {Place::timelineObject, "activitySegment", Place::way},
    {Place::stay, "location", Place::stayedAt},
    {Place::stay, "duration", Place::duration},
    {Place::stay, "simplifiedRawPath", Place::rawPath},
    {Place::stay, "visitConfidence", Place::visitConfidence},
    {Place::way, "startLocation", Place::from},
    {Place::way, "endLocation", Place::to},
    {Place::way, "duration", Place::duration},
    {Place::way, "simplifiedRawPath", Place::rawPath},
    {Place::way, "waypointPath", Place::waypointPath},
    {Place::waypointPath, "waypoints", Place::waypoint},
    {Place::rawPath, "points", Place::rawPoint},
    {Place::duration, "startTimestamp", Place::start},
    {Place::duration, "startTimestampMs", Place::start},
    {Place::duration, "endTimestamp", Place::end},
    {Place::duration, "endTimestampMs", Place::end},

    {Place::segment, "startTime", Place::start},
    {Place::segment, "endTime", Place::end},
    {Place::segment, "startTimeTimezoneUtcOffsetMinutes", Place::startOffset},
    {Place::segment, "endTimeTimezoneUtcOffsetMinutes", Place::endOffset},
    {Place::segment, "visit", Place::visit},
    {Place::segment, "activity", Place::activity},
    {Place::segment, "timelinePath", Place::pathPoint},
    {Place::visit, "probability", Place::visitProbability},
    {Place::visit, "hierarchyLevel", Place::hierarchyLevel},
    {Place::visit, "topCandidate", Place::stayedAt},
    {Place::activity, "start", Place::from},
    {Place::activity, "end", Place::to},
    {Place::rawSignal, "position", Place::signal},
    {Place::profile, "frequentPlaces", Place::favourite},
});

/// The values that a spot of any kind may have.
constexpr auto kSpotValues = std::to_array<std::pair<std::string_view, Place>>({
    {"latitudeE7", Place::latitudeE7},
    {"latE7", Place::latitudeE7},
    {"longitudeE7", Place::longitudeE7},
    {"lngE7", Place::longitudeE7},
    {"accuracy", Place::accuracy},
    {"accuracyMeters", Place::accuracy},
    {"accuracyMetres", Place::accuracy},
    {"timestamp", Place::time},
    {"timestampMs", Place::time},
    {"time", Place::time},
    {"latLng", Place::degrees},
    {"LatLng", Place::degrees},
    {"point", Place::degrees},
    {"placeLocation", Place::degrees},
    {"durationMinutesOffsetFromStartTime", Place::minutesFromStart},
    {"name", Place::name},
    {"address", Place::address},
    {"semanticType", Place::label},
    {"label", Place::label},
    {"locationConfidence", Place::placeConfidence},
});

bool isSpot(Place place) { return place >= Place::record && place <= Place::favourite; }
bool isSpan(Place place) {
    return place == Place::stay || place == Place::way || place == Place::segment;
}

/// Some histories hold degrees west and south as though the 32 bits had no sign.
std::optional<double> degreesOfE7(std::optional<double> e7, double most) {
    constexpr double kE7 = 1e7;
    constexpr double kWrap = 4294967296.0;
    if (!e7) return std::nullopt;
    return (*e7 > most * kE7 ? *e7 - kWrap : *e7) / kE7;
}

/// Of an address, which is written over several lines or with commas, what tells the place best.
std::string firstPart(const JsonScalar& address) {
    const auto text = address.text.value_or("");
    return nameOf({.text = text.substr(0, text.find_first_of(",\n"))});
}

struct Spot {
    std::optional<double> latitude;
    std::optional<double> longitude;
    std::optional<GeoPoint> stated;  ///< A position written as text.
    std::optional<ParsedDate> time;
    std::optional<double> minutesFromStart;
    float accuracyMeters = std::numeric_limits<float>::quiet_NaN();
    std::string name;
    std::string address;  ///< The first part of it.
    PlaceUse use = PlaceUse::unknown;
    std::optional<double> confidence;  ///< In percent.

    std::optional<GeoPoint> position() const {
        return stated ? stated : geoPoint(latitude, longitude);
    }
};

/// A stay or a way, with what has to wait until its times are known.
struct Span {
    std::optional<ParsedDate> start;
    std::optional<ParsedDate> end;
    std::optional<double> startOffset;  ///< Minutes.
    std::optional<double> endOffset;
    Spot stayedAt;
    Spot from;
    Spot to;
    std::optional<GeoPoint> firstWaypoint;  ///< Waypoints between the ends have no time.
    std::optional<GeoPoint> lastWaypoint;
    std::vector<std::pair<GeoPoint, double>> path;  ///< Minutes from the start.
    std::optional<double> percent;
    std::optional<double> probability;
    std::optional<double> level;
    bool isStay = false;
};

class LocationHistory final : public JsonPlaces<Place> {
  public:
    LocationHistory(const ReaderContext& context, LocationSink& places)
        : times_(context.now), now_(context.now), places_(places) {}

    std::expected<FileRecords, std::string> finish() {
        if (tooLong_) {
            return std::unexpected(
                fmt::format("a path of more than {} points", limits::kMostPathPoints));
        }
        if (auto complaint = times_.complaint()) return std::unexpected(std::move(*complaint));
        return std::move(records_);
    }

  protected:
    Place placeOf(Place parent, std::string_view name) const override {
        if (isSpot(parent) || parent == Place::degrees) {
            const auto* const value =
                std::ranges::find(kSpotValues, name, &std::pair<std::string_view, Place>::first);
            return value == kSpotValues.end() ? Place::ignored : value->second;
        }
        return stepFrom<Place>(parent, name, kSteps);
    }

    Place elementOfDocument() const override { return Place::segment; }

    void enter(Place place) override {
        if (isSpan(place)) span_ = {};
        if (isSpot(place)) {
            spot_ = spotAt(place);
            *spot_ = {};
        }
        if (place == Place::stay || place == Place::visit) span_.isStay = true;
    }

    void leave(Place place) override {
        switch (place) {
            case Place::record:
            case Place::rawPoint:
            case Place::signal:
                tellPoint(loose_.position(), loose_.time, loose_.accuracyMeters);
                break;
            case Place::pathPoint:
                endPathPoint();
                break;
            case Place::waypoint:
                if (!span_.firstWaypoint) span_.firstWaypoint = loose_.position();
                span_.lastWaypoint = loose_.position();
                break;
            case Place::favourite:
                tellFavourite();
                break;
            case Place::stay:
            case Place::way:
            case Place::segment:
                endSpan();
                break;
            default:
                break;
        }
    }

    void take(Place place, const JsonScalar& value) override {
        switch (place) {
            case Place::latitudeE7:
                spot_->latitude = degreesOfE7(value.asNumber(), 90);
                break;
            case Place::longitudeE7:
                spot_->longitude = degreesOfE7(value.asNumber(), 180);
                break;
            case Place::degrees:
                spot_->stated = positionOfText(value.text.value_or(""));
                break;
            case Place::accuracy:
                spot_->accuracyMeters = accuracyOf(value);
                break;
            case Place::time:
                spot_->time = times_.take(timeOf(value));
                break;
            case Place::minutesFromStart:
                spot_->minutesFromStart = value.asNumber();
                break;
            case Place::name:
                spot_->name = nameOf(value);
                break;
            case Place::address:
                spot_->address = firstPart(value);
                break;
            case Place::label:
                spot_->use = useOfLabel(value.text.value_or(""));
                break;
            case Place::placeConfidence:
                spot_->confidence = value.asNumber();
                break;
            // The ends of a way may be texts themselves.
            case Place::from:
            case Place::to:
                spotAt(place)->stated = positionOfText(value.text.value_or(""));
                break;
            default:
                takeOfSpan(place, value);
        }
    }

  private:
    Spot* spotAt(Place place) {
        switch (place) {
            case Place::stayedAt:
                return &span_.stayedAt;
            case Place::from:
                return &span_.from;
            case Place::to:
                return &span_.to;
            default:
                return &loose_;
        }
    }

    void takeOfSpan(Place place, const JsonScalar& value) {
        switch (place) {
            case Place::start:
                span_.start = times_.take(timeOf(value));
                break;
            case Place::end:
                span_.end = times_.take(timeOf(value));
                break;
            case Place::startOffset:
                span_.startOffset = value.asNumber();
                break;
            case Place::endOffset:
                span_.endOffset = value.asNumber();
                break;
            case Place::visitConfidence:
                span_.percent = value.asNumber();
                break;
            case Place::visitProbability:
                span_.probability = value.asNumber();
                break;
            case Place::hierarchyLevel:
                span_.level = value.asNumber();
                break;
            default:
                break;
        }
    }

    void tellPoint(std::optional<GeoPoint> position, const std::optional<ParsedDate>& time,
                   float accuracyMeters = std::numeric_limits<float>::quiet_NaN()) {
        if (position && time) places_.point({time->date, *position, accuracyMeters});
    }

    /// A point of a path has a time of its own, or minutes from a start that may follow it.
    void endPathPoint() {
        if (loose_.time) return tellPoint(loose_.position(), loose_.time);
        const auto position = loose_.position();
        if (!position || !loose_.minutesFromStart) return;
        if (span_.path.size() == limits::kMostPathPoints) {
            tooLong_ = true;
            return;
        }
        span_.path.emplace_back(*position, *loose_.minutesFromStart);
    }

    void tellFavourite() {
        const auto position = loose_.position();
        if (!position || loose_.use == PlaceUse::unknown) return;
        times_.addPlace();
        places_.place({.position = *position,
                       .name = loose_.use == PlaceUse::home ? "Home" : "Work",
                       .use = loose_.use});
    }

    void endSpan() {
        const auto from = span_.from.position();
        tellPoint(from ? from : span_.firstWaypoint, span_.start);
        for (const auto& [position, minutes] : span_.path) {
            if (!span_.start) break;
            const auto time = span_.start->date + minutes * 60;
            if (limits::isSane(time, now_)) tellPoint(position, ParsedDate{time, {}});
        }
        const auto to = span_.to.position();
        tellPoint(to ? to : span_.lastWaypoint, span_.end);
        if (!span_.start || !span_.end) return;
        const KSDateInterval interval{span_.start->date, span_.end->date};
        if (!(interval.duration() > 0) || interval.duration() > limits::kLongestStay) return;
        if (span_.startOffset && span_.startOffset == span_.endOffset &&
            std::abs(*span_.startOffset) < 1440) {
            addZone(records_.zones, interval, static_cast<int>(*span_.startOffset) * 60);
        }
        // A stay within a stay (a shop of a shopping centre) is told by the outer one.
        if (span_.isStay && span_.level.value_or(0) == 0) tellVisit(interval);
    }

    void tellVisit(KSDateInterval interval) {
        const auto position = span_.stayedAt.position();
        if (!position) return;
        const auto percent = span_.percent ? span_.percent : span_.stayedAt.confidence;
        const double confidence = span_.probability.value_or(percent.value_or(100) / 100);
        const auto& place = span_.stayedAt;
        places_.visit({.stay = interval,
                       .position = *position,
                       .name = place.name.empty() ? place.address : place.name,
                       .use = place.use,
                       .confidence = std::clamp(confidence, 0.0, 1.0)});
    }

    TimeTally times_;
    KSDate now_;
    LocationSink& places_;
    FileRecords records_;
    Span span_;
    Spot loose_;            // of what is no part of a span
    Spot* spot_ = &loose_;  // the one whose values come
    bool tooLong_ = false;
};

}  // namespace

std::expected<FileRecords, std::string> readLocationHistory(const ReadBlock& read,
                                                            const ReaderContext& context,
                                                            LocationSink& places) {
    LocationHistory history(context, places);
    if (auto done = readJson(read, history); !done) return std::unexpected(std::move(done.error()));
    return history.finish();
}

std::expected<FileRecords, std::string> readLocationHistoryFile(int fd,
                                                                const ReaderContext& context,
                                                                LocationSink& places) {
    return readLocationHistory(readDescriptor(fd), context, places);
}

}  // namespace keepsakes
