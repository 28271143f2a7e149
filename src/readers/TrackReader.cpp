// SPDX-License-Identifier: Apache-2.0
#include "readers/TrackReader.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <cstdint>
#include <optional>
#include <utility>
#include <vector>

#include "core/Text.h"
#include "readers/Position.h"
#include "readers/ReaderLimits.h"
#include "readers/StatedPlaces.h"
#include "readers/TextFolding.h"
#include "readers/TrackSummary.h"

namespace keepsakes {

namespace {

/// The elements that matter, by where they stand. Everything else is `ignored`, with all in it.
enum class TrackPlace : std::uint8_t {
    document,
    ignored,
    gpx,
    gpxTrack,
    gpxType,
    gpxSegment,
    gpxPoint,
    waypoint,
    waypointWord,
    waypointName,
    tcx,
    activities,
    multiSport,
    sportOfMany,
    activity,
    lap,
    lapSeconds,
    tcxTrack,
    tcxPoint,
    tcxDistance,
    tcxPosition,
    latitude,
    longitude,
    pointTime,
};

struct Step {
    TrackPlace parent;
    std::string_view name;
    TrackPlace child;
};

// GPX 1.0 and 1.1: routes are no recordings; waypoints are places that the owner named. TCX v2:
// courses and workout plans are none either.
constexpr auto kTrackSteps = std::to_array<Step>({
    {TrackPlace::gpxPoint, "time", TrackPlace::pointTime},
    {TrackPlace::gpxSegment, "trkpt", TrackPlace::gpxPoint},
    {TrackPlace::gpxTrack, "trkseg", TrackPlace::gpxSegment},
    {TrackPlace::gpxTrack, "type", TrackPlace::gpxType},
    {TrackPlace::gpx, "trk", TrackPlace::gpxTrack},
    {TrackPlace::gpx, "wpt", TrackPlace::waypoint},
    {TrackPlace::waypoint, "name", TrackPlace::waypointName},
    {TrackPlace::waypoint, "type", TrackPlace::waypointWord},
    {TrackPlace::waypoint, "sym", TrackPlace::waypointWord},
    {TrackPlace::document, "gpx", TrackPlace::gpx},
    {TrackPlace::tcxPoint, "Time", TrackPlace::pointTime},
    {TrackPlace::tcxPoint, "Position", TrackPlace::tcxPosition},
    {TrackPlace::tcxPoint, "DistanceMeters", TrackPlace::tcxDistance},
    {TrackPlace::tcxPosition, "LatitudeDegrees", TrackPlace::latitude},
    {TrackPlace::tcxPosition, "LongitudeDegrees", TrackPlace::longitude},
    {TrackPlace::tcxTrack, "Trackpoint", TrackPlace::tcxPoint},
    {TrackPlace::lap, "Track", TrackPlace::tcxTrack},
    {TrackPlace::lap, "TotalTimeSeconds", TrackPlace::lapSeconds},
    {TrackPlace::activity, "Lap", TrackPlace::lap},
    {TrackPlace::activities, "Activity", TrackPlace::activity},
    {TrackPlace::activities, "MultiSportSession", TrackPlace::multiSport},
    {TrackPlace::multiSport, "FirstSport", TrackPlace::sportOfMany},
    {TrackPlace::multiSport, "NextSport", TrackPlace::sportOfMany},
    {TrackPlace::sportOfMany, "Activity", TrackPlace::activity},
    {TrackPlace::tcx, "Activities", TrackPlace::activities},
    {TrackPlace::document, "TrainingCenterDatabase", TrackPlace::tcx},
});

TrackPlace placeOf(TrackPlace parent, std::string_view name) {
    const auto* const found = std::ranges::find_if(
        kTrackSteps, [&](const Step& step) { return step.parent == parent && step.name == name; });
    return found == kTrackSteps.end() ? TrackPlace::ignored : found->child;
}

bool holdsValue(TrackPlace place) {
    switch (place) {
        case TrackPlace::gpxType:
        case TrackPlace::waypointName:
        case TrackPlace::waypointWord:
        case TrackPlace::lapSeconds:
        case TrackPlace::tcxDistance:
        case TrackPlace::latitude:
        case TrackPlace::longitude:
        case TrackPlace::pointTime:
            return true;
        default:
            return false;
    }
}

std::optional<double> number(std::optional<std::string_view> text) {
    if (!text) return std::nullopt;
    const auto digits = trimmed(*text);
    double value = 0;
    const auto [end, error] = std::from_chars(digits.data(), digits.data() + digits.size(), value);
    if (error != std::errc() || end != digits.data() + digits.size() || !std::isfinite(value)) {
        return std::nullopt;
    }
    return value;
}

/// Names that devices give by themselves ("LAP001", "WPT 12", "7") are no names of the owner's; nor
/// is none.
bool isNumberedByDevice(std::string_view name) {
    constexpr auto kWords = std::to_array<std::string_view>(
        {"", "lap", "wpt", "waypoint", "point", "poi", "marker", "photo"});
    auto folded = foldWord(name);
    while (!folded.empty() && folded.back() >= '0' && folded.back() <= '9') folded.pop_back();
    return std::ranges::find(kWords, folded) != kWords.end();
}

class TrackFile final : public XmlHandler {
  public:
    TrackFile(const ReaderContext& context, LocationSink& places)
        : now_(context.now), places_(places), times_(context.now) {}

    void startElement(std::string_view name, XmlAttributes attributes) override {
        const auto parent = path_.empty() ? TrackPlace::document : path_.back();
        const auto place = placeOf(parent, name);
        if (path_.empty() && place == TrackPlace::ignored) {
            otherRoot_ = std::string(name.substr(0, limits::kLongestValue));
        }
        path_.push_back(place);
        if (place == TrackPlace::ignored) return;
        value_.clear();
        enter(place, attributes);
    }

    void endElement() override {
        leave(path_.back());
        path_.pop_back();
    }

    void text(std::string_view piece) override {
        if (path_.empty() || !holdsValue(path_.back())) return;
        // One byte beyond the limit is kept: it tells that the text is no value.
        value_ += piece.substr(0, limits::kLongestValue + 1 - value_.size());
    }

    std::expected<FileRecords, std::string> finish() {
        if (!otherRoot_.empty()) {
            return std::unexpected(
                fmt::format("the root element <{}> is neither GPX nor TCX", otherRoot_));
        }
        if (tooMany_) {
            return std::unexpected(fmt::format("more than {} workouts", limits::kMostWorkouts));
        }
        if (auto complaint = times_.complaint()) return std::unexpected(std::move(*complaint));
        return std::move(records_);
    }

  private:
    void enter(TrackPlace place, XmlAttributes attributes) {
        switch (place) {
            case TrackPlace::gpxTrack:
                track_.emplace(false);
                break;
            case TrackPlace::activity:
                track_.emplace(true);
                if (const auto sport = attributes.find("Sport")) track_->setType(*sport);
                break;
            case TrackPlace::gpxSegment:
            case TrackPlace::tcxTrack:
                track_->breakLeg();
                break;
            case TrackPlace::gpxPoint:
                startPoint();
                point_.position =
                    geoPoint(number(attributes.find("lat")), number(attributes.find("lon")));
                break;
            case TrackPlace::tcxPoint:
                startPoint();
                break;
            case TrackPlace::waypoint:
                waypoint_ = {};
                waypointPosition_ =
                    geoPoint(number(attributes.find("lat")), number(attributes.find("lon")));
                break;
            case TrackPlace::tcxPosition:
                latitude_.reset();
                longitude_.reset();
                break;
            case TrackPlace::lap:
                lapStart_ = attributes.find("StartTime") ? time(*attributes.find("StartTime"))
                                                         : std::nullopt;
                lapSeconds_.reset();
                break;
            default:
                break;
        }
    }

    void leave(TrackPlace place) {
        switch (place) {
            case TrackPlace::gpxType:
                if (auto type = value()) track_->setType(*type);
                break;
            case TrackPlace::pointTime:
                pointTime_ = time(value().value_or(""));
                break;
            case TrackPlace::tcxDistance:
                point_.distance = number(value());
                break;
            case TrackPlace::latitude:
                latitude_ = number(value());
                break;
            case TrackPlace::longitude:
                longitude_ = number(value());
                break;
            case TrackPlace::tcxPosition:
                point_.position = geoPoint(latitude_, longitude_);
                break;
            case TrackPlace::gpxPoint:
            case TrackPlace::tcxPoint:
                endPoint();
                break;
            case TrackPlace::waypointName:
                waypoint_.name = cleanText(value().value_or(""));
                break;
            case TrackPlace::waypointWord:
                // How receivers call the symbol of a house.
                if (value() == "Residence") waypoint_.use = PlaceUse::home;
                if (waypoint_.use == PlaceUse::unknown) {
                    waypoint_.use = useOfPlaceName(value().value_or(""));
                }
                break;
            case TrackPlace::waypoint:
                endWaypoint();
                break;
            case TrackPlace::lapSeconds:
                lapSeconds_ = number(value());
                break;
            case TrackPlace::lap:
                endLap();
                break;
            case TrackPlace::gpxTrack:
            case TrackPlace::activity:
                endTrack();
                break;
            default:
                break;
        }
    }

    void startPoint() {
        point_ = {};
        pointTime_.reset();
    }

    void endPoint() {
        if (!pointTime_) return;
        point_.time = pointTime_->date;
        point_.offsetSeconds = pointTime_->offsetSeconds;
        track_->addPoint(point_);
        if (point_.position) places_.point({.time = point_.time, .position = *point_.position});
    }

    void endWaypoint() {
        if (!waypointPosition_ || isNumberedByDevice(waypoint_.name)) return;
        waypoint_.position = *waypointPosition_;
        places_.place(std::move(waypoint_));
    }

    void endLap() {
        if (!lapStart_ || !lapSeconds_) return;
        if (*lapSeconds_ < 0 || *lapSeconds_ > limits::kLongestWorkout) return;
        const auto end = lapStart_->date + *lapSeconds_;
        if (limits::isSane(end, now_)) track_->addLap({lapStart_->date, end});
    }

    void endTrack() {
        if (const auto workout = track_->workout()) {
            tooMany_ = tooMany_ || records_.workouts.size() == limits::kMostWorkouts;
            if (!tooMany_) records_.workouts.push_back(*workout);
        }
        for (const auto& zone : track_->zones()) {
            if (records_.zones.size() < limits::kMostZoneSpans) records_.zones.push_back(zone);
        }
        track_.reset();
    }

    /// A timestamp without a zone is UTC, as both schemas ask.
    std::optional<ParsedDate> time(std::string_view text) {
        return times_.take(parseISO8601(trimmed(text)));
    }

    std::optional<std::string_view> value() const {
        if (value_.size() > limits::kLongestValue) return std::nullopt;
        return value_;
    }

    KSDate now_;
    LocationSink& places_;
    FileRecords records_;
    std::vector<TrackPlace> path_;  // as deep as the parser allows
    std::string otherRoot_;
    std::string value_;
    bool tooMany_ = false;
    TimeTally times_;

    std::optional<TrackSummary> track_;
    TrackSample point_;
    std::optional<ParsedDate> pointTime_;
    NamedPlace waypoint_;
    std::optional<GeoPoint> waypointPosition_;
    std::optional<double> latitude_;
    std::optional<double> longitude_;
    std::optional<ParsedDate> lapStart_;
    std::optional<double> lapSeconds_;
};

}  // namespace

std::expected<FileRecords, std::string> readTrack(const ReadBlock& read,
                                                  const ReaderContext& context,
                                                  LocationSink& places) {
    TrackFile file(context, places);
    if (auto done = readXml(read, file); !done) return std::unexpected(std::move(done.error()));
    return file.finish();
}

std::expected<FileRecords, std::string> readTrackFile(int fd, const ReaderContext& context,
                                                      LocationSink& places) {
    return readTrack(readDescriptor(fd), context, places);
}

}  // namespace keepsakes
