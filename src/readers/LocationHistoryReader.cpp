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
enum class HistoryPlace : std::uint8_t {
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
constexpr auto kHistorySteps = std::to_array<JsonStep<HistoryPlace>>({
    {HistoryPlace::document, "locations", HistoryPlace::record},
    {HistoryPlace::document, "timelineObjects", HistoryPlace::timelineObject},
    {HistoryPlace::document, "semanticSegments", HistoryPlace::segment},
    {HistoryPlace::document, "rawSignals", HistoryPlace::rawSignal},
    {HistoryPlace::document, "userLocationProfile", HistoryPlace::profile},

    {HistoryPlace::timelineObject, "placeVisit", HistoryPlace::stay},
    {HistoryPlace::timelineObject, "activitySegment", HistoryPlace::way},
    {HistoryPlace::stay, "location", HistoryPlace::stayedAt},
    {HistoryPlace::stay, "duration", HistoryPlace::duration},
    {HistoryPlace::stay, "simplifiedRawPath", HistoryPlace::rawPath},
    {HistoryPlace::stay, "visitConfidence", HistoryPlace::visitConfidence},
    {HistoryPlace::way, "startLocation", HistoryPlace::from},
    {HistoryPlace::way, "endLocation", HistoryPlace::to},
    {HistoryPlace::way, "duration", HistoryPlace::duration},
    {HistoryPlace::way, "simplifiedRawPath", HistoryPlace::rawPath},
    {HistoryPlace::way, "waypointPath", HistoryPlace::waypointPath},
    {HistoryPlace::waypointPath, "waypoints", HistoryPlace::waypoint},
    {HistoryPlace::rawPath, "points", HistoryPlace::rawPoint},
    {HistoryPlace::duration, "startTimestamp", HistoryPlace::start},
    {HistoryPlace::duration, "startTimestampMs", HistoryPlace::start},
    {HistoryPlace::duration, "endTimestamp", HistoryPlace::end},
    {HistoryPlace::duration, "endTimestampMs", HistoryPlace::end},

    {HistoryPlace::segment, "startTime", HistoryPlace::start},
    {HistoryPlace::segment, "endTime", HistoryPlace::end},
    {HistoryPlace::segment, "startTimeTimezoneUtcOffsetMinutes", HistoryPlace::startOffset},
    {HistoryPlace::segment, "endTimeTimezoneUtcOffsetMinutes", HistoryPlace::endOffset},
    {HistoryPlace::segment, "visit", HistoryPlace::visit},
    {HistoryPlace::segment, "activity", HistoryPlace::activity},
    {HistoryPlace::segment, "timelinePath", HistoryPlace::pathPoint},
    {HistoryPlace::visit, "probability", HistoryPlace::visitProbability},
    {HistoryPlace::visit, "hierarchyLevel", HistoryPlace::hierarchyLevel},
    {HistoryPlace::visit, "topCandidate", HistoryPlace::stayedAt},
    {HistoryPlace::activity, "start", HistoryPlace::from},
    {HistoryPlace::activity, "end", HistoryPlace::to},
    {HistoryPlace::rawSignal, "position", HistoryPlace::signal},
    {HistoryPlace::profile, "frequentPlaces", HistoryPlace::favourite},
});

/// The values that a spot of any kind may have.
constexpr auto kSpotValues = std::to_array<std::pair<std::string_view, HistoryPlace>>({
    {"latitudeE7", HistoryPlace::latitudeE7},
    {"latE7", HistoryPlace::latitudeE7},
    {"longitudeE7", HistoryPlace::longitudeE7},
    {"lngE7", HistoryPlace::longitudeE7},
    {"accuracy", HistoryPlace::accuracy},
    {"accuracyMeters", HistoryPlace::accuracy},
    {"accuracyMetres", HistoryPlace::accuracy},
    {"timestamp", HistoryPlace::time},
    {"timestampMs", HistoryPlace::time},
    {"time", HistoryPlace::time},
    {"latLng", HistoryPlace::degrees},
    {"LatLng", HistoryPlace::degrees},
    {"point", HistoryPlace::degrees},
    {"placeLocation", HistoryPlace::degrees},
    {"durationMinutesOffsetFromStartTime", HistoryPlace::minutesFromStart},
    {"name", HistoryPlace::name},
    {"address", HistoryPlace::address},
    {"semanticType", HistoryPlace::label},
    {"label", HistoryPlace::label},
    {"locationConfidence", HistoryPlace::placeConfidence},
});

bool isSpot(HistoryPlace place) {
    return place >= HistoryPlace::record && place <= HistoryPlace::favourite;
}
bool isSpan(HistoryPlace place) {
    return place == HistoryPlace::stay || place == HistoryPlace::way ||
           place == HistoryPlace::segment;
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

class LocationHistory final : public JsonPlaces<HistoryPlace> {
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
    HistoryPlace placeOf(HistoryPlace parent, std::string_view name) const override {
        if (isSpot(parent) || parent == HistoryPlace::degrees) {
            const auto* const value = std::ranges::find(
                kSpotValues, name, &std::pair<std::string_view, HistoryPlace>::first);
            return value == kSpotValues.end() ? HistoryPlace::ignored : value->second;
        }
        return stepFrom<HistoryPlace>(parent, name, kHistorySteps);
    }

    HistoryPlace elementOfDocument() const override { return HistoryPlace::segment; }

    void enter(HistoryPlace place) override {
        if (isSpan(place)) span_ = {};
        if (isSpot(place)) {
            spot_ = spotAt(place);
            *spot_ = {};
        }
        if (place == HistoryPlace::stay || place == HistoryPlace::visit) span_.isStay = true;
    }

    void leave(HistoryPlace place) override {
        switch (place) {
            case HistoryPlace::record:
            case HistoryPlace::rawPoint:
            case HistoryPlace::signal:
                tellPoint(loose_.position(), loose_.time, loose_.accuracyMeters);
                break;
            case HistoryPlace::pathPoint:
                endPathPoint();
                break;
            case HistoryPlace::waypoint:
                if (!span_.firstWaypoint) span_.firstWaypoint = loose_.position();
                span_.lastWaypoint = loose_.position();
                break;
            case HistoryPlace::favourite:
                tellFavourite();
                break;
            case HistoryPlace::stay:
            case HistoryPlace::way:
            case HistoryPlace::segment:
                endSpan();
                break;
            default:
                break;
        }
    }

    void take(HistoryPlace place, const JsonScalar& value) override {
        switch (place) {
            case HistoryPlace::latitudeE7:
                spot_->latitude = degreesOfE7(value.asNumber(), 90);
                break;
            case HistoryPlace::longitudeE7:
                spot_->longitude = degreesOfE7(value.asNumber(), 180);
                break;
            case HistoryPlace::degrees:
                spot_->stated = positionOfText(value.text.value_or(""));
                break;
            case HistoryPlace::accuracy:
                spot_->accuracyMeters = accuracyOf(value);
                break;
            case HistoryPlace::time:
                spot_->time = times_.take(timeOf(value));
                break;
            case HistoryPlace::minutesFromStart:
                spot_->minutesFromStart = value.asNumber();
                break;
            case HistoryPlace::name:
                spot_->name = nameOf(value);
                break;
            case HistoryPlace::address:
                spot_->address = firstPart(value);
                break;
            case HistoryPlace::label:
                spot_->use = useOfLabel(value.text.value_or(""));
                break;
            case HistoryPlace::placeConfidence:
                spot_->confidence = value.asNumber();
                break;
            // The ends of a way may be texts themselves.
            case HistoryPlace::from:
            case HistoryPlace::to:
                spotAt(place)->stated = positionOfText(value.text.value_or(""));
                break;
            default:
                takeOfSpan(place, value);
        }
    }

  private:
    Spot* spotAt(HistoryPlace place) {
        switch (place) {
            case HistoryPlace::stayedAt:
                return &span_.stayedAt;
            case HistoryPlace::from:
                return &span_.from;
            case HistoryPlace::to:
                return &span_.to;
            default:
                return &loose_;
        }
    }

    void takeOfSpan(HistoryPlace place, const JsonScalar& value) {
        switch (place) {
            case HistoryPlace::start:
                span_.start = times_.take(timeOf(value));
                break;
            case HistoryPlace::end:
                span_.end = times_.take(timeOf(value));
                break;
            case HistoryPlace::startOffset:
                span_.startOffset = value.asNumber();
                break;
            case HistoryPlace::endOffset:
                span_.endOffset = value.asNumber();
                break;
            case HistoryPlace::visitConfidence:
                span_.percent = value.asNumber();
                break;
            case HistoryPlace::visitProbability:
                span_.probability = value.asNumber();
                break;
            case HistoryPlace::hierarchyLevel:
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
