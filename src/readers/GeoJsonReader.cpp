// SPDX-License-Identifier: Apache-2.0
#include "readers/GeoJsonReader.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
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

enum class GeoJsonPlace : std::uint8_t {
    document,  ///< The top object, which may be a feature or a geometry itself.
    ignored,
    feature,
    geometry,
    geometryType,
    coordinates,
    properties,
    coordinateProperties,
    time,
    times,
    accuracy,
    name,
    use,
    location,
};

// RFC 7946 fixes the members of features and geometries. Properties are free; these are the names
// that recording apps and map sites use.
constexpr auto kGeoJsonSteps = std::to_array<JsonStep<GeoJsonPlace>>({
    {GeoJsonPlace::document, "features", GeoJsonPlace::feature},
    {GeoJsonPlace::document, "geometry", GeoJsonPlace::geometry},
    {GeoJsonPlace::document, "properties", GeoJsonPlace::properties},
    {GeoJsonPlace::document, "type", GeoJsonPlace::geometryType},
    {GeoJsonPlace::document, "coordinates", GeoJsonPlace::coordinates},
    {GeoJsonPlace::feature, "geometry", GeoJsonPlace::geometry},
    {GeoJsonPlace::feature, "properties", GeoJsonPlace::properties},
    {GeoJsonPlace::geometry, "type", GeoJsonPlace::geometryType},
    {GeoJsonPlace::geometry, "coordinates", GeoJsonPlace::coordinates},
    {GeoJsonPlace::properties, "time", GeoJsonPlace::time},
    {GeoJsonPlace::properties, "timestamp", GeoJsonPlace::time},
    {GeoJsonPlace::properties, "tst", GeoJsonPlace::time},
    {GeoJsonPlace::properties, "coordTimes", GeoJsonPlace::times},
    {GeoJsonPlace::properties, "times", GeoJsonPlace::times},
    {GeoJsonPlace::properties, "coordinateProperties", GeoJsonPlace::coordinateProperties},
    {GeoJsonPlace::coordinateProperties, "times", GeoJsonPlace::times},
    {GeoJsonPlace::properties, "accuracy", GeoJsonPlace::accuracy},
    {GeoJsonPlace::properties, "horizontal_accuracy", GeoJsonPlace::accuracy},
    {GeoJsonPlace::properties, "name", GeoJsonPlace::name},
    {GeoJsonPlace::properties, "Name", GeoJsonPlace::name},
    {GeoJsonPlace::properties, "title", GeoJsonPlace::name},
    {GeoJsonPlace::properties, "Title", GeoJsonPlace::name},
    {GeoJsonPlace::properties, "use", GeoJsonPlace::use},
    {GeoJsonPlace::properties, "location", GeoJsonPlace::location},
    {GeoJsonPlace::location, "name", GeoJsonPlace::name},
});

struct Feature {
    bool isPoint = false;
    bool isLine = false;
    std::vector<std::optional<GeoPoint>> positions;
    std::vector<std::optional<KSDate>> times;
    std::optional<KSDate> time;
    bool hasTime = false;
    float accuracyMeters = std::numeric_limits<float>::quiet_NaN();
    std::string name;
    std::string use;
};

class GeoJson final : public JsonPlaces<GeoJsonPlace> {
  public:
    GeoJson(const ReaderContext& context, LocationSink& places)
        : times_(context.now), places_(places) {}

    std::expected<FileRecords, std::string> finish() {
        if (tooLong_) {
            return std::unexpected(
                fmt::format("a line of more than {} points", limits::kMostPathPoints));
        }
        if (auto complaint = times_.complaint()) return std::unexpected(std::move(*complaint));
        return FileRecords{};
    }

  protected:
    GeoJsonPlace placeOf(GeoJsonPlace parent, std::string_view name) const override {
        return stepFrom<GeoJsonPlace>(parent, name, kGeoJsonSteps);
    }

    void enter(GeoJsonPlace place) override {
        if (place == GeoJsonPlace::feature || place == GeoJsonPlace::document) feature_ = {};
    }

    void leave(GeoJsonPlace place) override {
        if (place == GeoJsonPlace::feature || place == GeoJsonPlace::document) tell();
        if (place == GeoJsonPlace::feature) feature_ = {};
    }

    void enterArray(GeoJsonPlace place) override {
        if (place == GeoJsonPlace::coordinates) position_.clear();
    }

    /// The innermost arrays are the positions, at any depth.
    void leaveArray(GeoJsonPlace place) override {
        if (place != GeoJsonPlace::coordinates || position_.empty()) return;
        if (hasRoom(feature_.positions)) {
            feature_.positions.push_back(
                position_.size() < 2 ? std::nullopt : geoPoint(position_[1], position_[0]));
        }
        position_.clear();
    }

    void take(GeoJsonPlace place, const JsonScalar& value) override {
        switch (place) {
            case GeoJsonPlace::geometryType:
                feature_.isPoint = value.text == "Point";
                feature_.isLine = value.text == "LineString" || value.text == "MultiLineString" ||
                                  value.text == "MultiPoint";
                break;
            case GeoJsonPlace::coordinates:
                // Longitude, latitude, and an altitude that is not needed.
                if (position_.size() < 2) position_.push_back(value.number);
                break;
            case GeoJsonPlace::time:
                if (!value.text && !value.number) break;
                feature_.hasTime = true;
                feature_.time = timeAt(value);
                break;
            case GeoJsonPlace::times:
                if (hasRoom(feature_.times)) feature_.times.push_back(timeAt(value));
                break;
            case GeoJsonPlace::accuracy:
                feature_.accuracyMeters = accuracyOf(value);
                break;
            case GeoJsonPlace::name:
                if (feature_.name.empty()) feature_.name = nameOf(value);
                break;
            case GeoJsonPlace::use:
                feature_.use = nameOf(value);
                break;
            default:
                break;
        }
    }

  private:
    std::optional<KSDate> timeAt(const JsonScalar& value) {
        const auto time = times_.take(timeOf(value));
        return time ? std::optional(time->date) : std::nullopt;
    }

    bool hasRoom(const auto& list) {
        tooLong_ = tooLong_ || list.size() == limits::kMostPathPoints;
        return !tooLong_;
    }

    void tell() {
        const auto& positions = feature_.positions;
        if (feature_.isPoint && positions.size() == 1 && positions[0]) {
            tellPoint(*positions[0]);
        } else if (feature_.isLine && feature_.times.size() == positions.size()) {
            for (std::size_t i = 0; i < positions.size(); ++i) {
                if (!positions[i] || !feature_.times[i]) continue;
                places_.point({*feature_.times[i], *positions[i], feature_.accuracyMeters});
            }
        }
    }

    void tellPoint(const GeoPoint& position) {
        if (feature_.time) {
            places_.point({*feature_.time, position, feature_.accuracyMeters});
        } else if (!feature_.hasTime && !feature_.name.empty()) {
            times_.addPlace();
            const auto stated = useOfLabel(feature_.use);
            places_.place(
                {.position = position,
                 .name = feature_.name,
                 .use = stated == PlaceUse::unknown ? useOfPlaceName(feature_.name) : stated});
        }
    }

    TimeTally times_;
    LocationSink& places_;
    Feature feature_;
    std::vector<std::optional<double>> position_;  // longitude, latitude
    bool tooLong_ = false;
};

}  // namespace

std::expected<FileRecords, std::string> readGeoJson(const ReadBlock& read,
                                                    const ReaderContext& context,
                                                    LocationSink& places) {
    GeoJson geoJson(context, places);
    if (auto done = readJson(read, geoJson); !done) return std::unexpected(std::move(done.error()));
    return geoJson.finish();
}

std::expected<FileRecords, std::string> readGeoJsonFile(int fd, const ReaderContext& context,
                                                        LocationSink& places) {
    return readGeoJson(readDescriptor(fd), context, places);
}

}  // namespace keepsakes
