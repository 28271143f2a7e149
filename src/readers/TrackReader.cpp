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

#include "readers/Position.h"
#include "readers/ReaderLimits.h"
#include "readers/StatedPlaces.h"
#include "readers/TextFolding.h"
#include "readers/TrackSummary.h"

namespace keepsakes {

namespace {

/// The elements that matter, by where they stand. Everything else is `ignored`, with all in it.
enum class Place : std::uint8_t {
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
    Place parent;
    std::string_view name;
    Place child;
};

// GPX 1.0 and 1.1: routes are no recordings; waypoints are places that the owner named. TCX v2:
// courses and workout plans are none either.
constexpr auto kSteps = std::to_array<Step>({
    {Place::gpxPoint, "time", Place::pointTime},
    {Place::gpxSegment, "trkpt", Place::gpxPoint},
    {Place::gpxTrack, "trkseg", Place::gpxSegment},
    {Place::gpxTrack, "type", Place::gpxType},
    {Place::gpx, "trk", Place::gpxTrack},
    {Place::gpx, "wpt", Place::waypoint},
    {Place::waypoint, "name", Place::waypointName},
    {Place::waypoint, "type", Place::waypointWord},
    {Place::waypoint, "sym", Place::waypointWord},
    {Place::document, "gpx", Place::gpx},
    {Place::tcxPoint, "Time", Place::pointTime},
    {Place::tcxPoint, "Position", Place::tcxPosition},
    {Place::tcxPoint, "DistanceMeters", Place::tcxDistance},
    {Place::tcxPosition, "LatitudeDegrees", Place::latitude},
    {Place::tcxPosition, "LongitudeDegrees", Place::longitude},
    {Place::tcxTrack, "Trackpoint", Place::tcxPoint},
    {Place::lap, "Track", Place::tcxTrack},
    {Place::lap, "TotalTimeSeconds", Place::lapSeconds},
    {Place::activity, "Lap", Place::lap},
    {Place::activities, "Activity", Place::activity},
    {Place::activities, "MultiSportSession", Place::multiSport},
    {Place::multiSport, "FirstSport", Place::sportOfMany},
    {Place::multiSport, "NextSport", Place::sportOfMany},
    {Place::sportOfMany, "Activity", Place::activity},
    {Place::tcx, "Activities", Place::activities},
    {Place::document, "TrainingCenterDatabase", Place::tcx},
});

Place placeOf(Place parent, std::string_view name) {
    const auto* const found = std::ranges::find_if(
        kSteps, [&](const Step& step) { return step.parent == parent && step.name == name; });
    return found == kSteps.end() ? Place::ignored : found->child;
}

bool holdsValue(Place place) {
    switch (place) {
        case Place::gpxType:
        case Place::waypointName:
        case Place::waypointWord:
        case Place::lapSeconds:
        case Place::tcxDistance:
        case Place::latitude:
        case Place::longitude:
        case Place::pointTime:
            return true;
        default:
            return false;
    }
}

std::string_view trimmed(std::string_view text) {
    constexpr std::string_view kBlanks = " \t\r\n";
    const auto first = text.find_first_not_of(kBlanks);
    if (first == std::string_view::npos) return {};
    return text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
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
        const auto parent = path_.empty() ? Place::document : path_.back();
        const auto place = placeOf(parent, name);
        if (path_.empty() && place == Place::ignored) {
            otherRoot_ = std::string(name.substr(0, limits::kLongestValue));
        }
        path_.push_back(place);
        if (place == Place::ignored) return;
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
    void enter(Place place, XmlAttributes attributes) {
        switch (place) {
            case Place::gpxTrack:
                track_.emplace(false);
                break;
            case Place::activity:
                track_.emplace(true);
                if (const auto sport = attributes.find("Sport")) track_->setType(*sport);
                break;
            case Place::gpxSegment:
            case Place::tcxTrack:
                track_->breakLeg();
                break;
            case Place::gpxPoint:
                startPoint();
                point_.position =
                    geoPoint(number(attributes.find("lat")), number(attributes.find("lon")));
                break;
            case Place::tcxPoint:
                startPoint();
                break;
            case Place::waypoint:
                waypoint_ = {};
                waypointPosition_ =
                    geoPoint(number(attributes.find("lat")), number(attributes.find("lon")));
                break;
            case Place::tcxPosition:
                latitude_.reset();
                longitude_.reset();
                break;
            case Place::lap:
                lapStart_ = attributes.find("StartTime") ? time(*attributes.find("StartTime"))
                                                         : std::nullopt;
                lapSeconds_.reset();
                break;
            default:
                break;
        }
    }

    void leave(Place place) {
        switch (place) {
            case Place::gpxType:
                if (auto type = value()) track_->setType(*type);
                break;
            case Place::pointTime:
                pointTime_ = time(value().value_or(""));
                break;
            case Place::tcxDistance:
                point_.distance = number(value());
                break;
            case Place::latitude:
                latitude_ = number(value());
                break;
            case Place::longitude:
                longitude_ = number(value());
                break;
            case Place::tcxPosition:
                point_.position = geoPoint(latitude_, longitude_);
                break;
            case Place::gpxPoint:
            case Place::tcxPoint:
                endPoint();
                break;
            case Place::waypointName:
                waypoint_.name = cleanText(value().value_or(""));
                break;
            case Place::waypointWord:
                // How receivers call the symbol of a house.
                if (value() == "Residence") waypoint_.use = PlaceUse::home;
                if (waypoint_.use == PlaceUse::unknown) {
                    waypoint_.use = useOfPlaceName(value().value_or(""));
                }
                break;
            case Place::waypoint:
                endWaypoint();
                break;
            case Place::lapSeconds:
                lapSeconds_ = number(value());
                break;
            case Place::lap:
                endLap();
                break;
            case Place::gpxTrack:
            case Place::activity:
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
    std::vector<Place> path_;  // as deep as the parser allows
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
