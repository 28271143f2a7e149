// SPDX-License-Identifier: Apache-2.0
// Property: the records do not depend on how the bytes come in, and every workout is a span of
// believable times. The first two bytes choose the sizes of the blocks.
#include <cmath>
#include <cstdint>
#include <cstring>
#include <string>
#include <utility>
#include <vector>

#include "Check.h"
#include "platform/ActivityCatalogue.h"
#include "readers/TrackReader.h"

namespace {

using namespace keepsakes;

/// What the sink gets, and that it is on earth.
struct Places final : LocationSink {
    std::vector<std::pair<double, GeoPoint>> points;
    std::vector<NamedPlace> named;

    void point(const TrackPoint& point) override {
        check(limits::isSane(point.time, kFuzzNow.now), "a point has a sane time");
        points.emplace_back(point.time.seconds, onEarth(point.position));
    }
    void visit(StatedVisit) override { check(false, "tracks state no visits"); }
    void place(NamedPlace place) override {
        check(!place.name.empty(), "a place has a name");
        onEarth(place.position);
        named.push_back(std::move(place));
    }
    static GeoPoint onEarth(GeoPoint position) {
        check(std::abs(position.latitude) <= 90 && std::abs(position.longitude) <= 180,
              "a position is on earth");
        return position;
    }
    friend bool operator==(const Places& a, const Places& b) {
        return a.points == b.points && a.named == b.named;
    }
};

constexpr std::string_view kSeeds[] = {
    "<gpx><wpt lat=\"47.05\" "
    "lon=\"15.4\"><name>Home</name></wpt><trk><type>hiking</type><trkseg><trkpt lat=\"47\" "
    "lon=\"15\"><time>2024-06-15T10:00:00"
    "+02:00</time></trkpt><trkpt lat=\"47.1\" lon=\"15\"><time>2024-06-15T10:04:00Z</time></trkpt>"
    "</trkseg></trk></gpx>",
    "<TrainingCenterDatabase><Activities><Activity Sport=\"Other\"><Lap StartTime=\"2024-06-12T16:"
    "00:00Z\"><TotalTimeSeconds>600</TotalTimeSeconds><Track><Trackpoint><Time>2024-06-12T16:00:02"
    "Z</Time><Position><LatitudeDegrees>4</LatitudeDegrees><LongitudeDegrees>1</LongitudeDegrees>"
    "</Position><DistanceMeters>3</DistanceMeters></Trackpoint></Track></Lap></Activity>"
    "</Activities></TrainingCenterDatabase>",
    "<!DOCTYPE gpx [<!ENTITY a 'ha'>]><gpx><trk>&a;</trk></gpx>",
};

}  // namespace

extern "C" std::size_t LLVMFuzzerMutate(std::uint8_t* data, std::size_t size, std::size_t most);

extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t* data, std::size_t size,
                                               std::size_t most, unsigned seed) {
    const auto text = kSeeds[seed % std::size(kSeeds)];
    if (size < 16 && text.size() + 2 <= most) {
        data[0] = static_cast<std::uint8_t>(seed);
        data[1] = static_cast<std::uint8_t>(seed >> 8U);
        std::memcpy(data + 2, text.data(), text.size());
        return text.size() + 2;
    }
    return LLVMFuzzerMutate(data, size, most);
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size < 2) return 0;
    const std::string bytes(data + 2, data + size);
    Places places;
    Places samePlaces;
    const auto whole = readTrack(inBlocks(bytes, 0), kFuzzNow, places);
    const auto pieces =
        readTrack(inBlocks(bytes, 1U + data[0] + data[1] * 256U), kFuzzNow, samePlaces);
    check(whole.has_value() == pieces.has_value(), "blocks do not decide whether a file is read");
    if (!whole) {
        check(!whole.error().empty(), "a refusal has a reason");
        return 0;
    }
    check(*whole == *pieces, "blocks do not change the records");
    check(places == samePlaces, "blocks do not change the places");
    const auto sane = [](KSDateInterval span) {
        return span.start <= span.end && limits::isSane(span.start, kFuzzNow.now) &&
               limits::isSane(span.end, kFuzzNow.now);
    };
    for (const auto& workout : whole->workouts) {
        check(sane({workout.start, workout.end}), "a workout is a span of sane times");
        check(activityName(workout.activityType).has_value(), "an activity of the catalogue");
    }
    for (const auto& zone : whole->zones) {
        check(sane(zone.span) && limits::isOffset(zone.offsetSeconds), "a zone is a sane span");
    }
    return 0;
}
