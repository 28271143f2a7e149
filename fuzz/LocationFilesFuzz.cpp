// SPDX-License-Identifier: Apache-2.0
// Property: blocks change nothing, a cut file tells a beginning of the places, and every record is
// one that the index may hold. The first two bytes choose the reader, the blocks and the cut.
#include <cstdint>
#include <iterator>
#include <string>

#include "CheckedPlaces.h"
#include "readers/GeoJsonReader.h"
#include "readers/LocationHistoryReader.h"
#include "readers/OwnTracksReader.h"

namespace {

using namespace keepsakes;

struct Target {
    PlacesReader reader;
    std::string_view seed;
    bool inLines = false;
};

const Target kTargets[] = {
    {readLocationHistory,
     R"({"locations":[{"latitudeE7":470000000,"longitudeE7":3084029361,"accuracy":5,)"
     R"("timestampMs":"1718433147000"}],"timelineObjects":[{"placeVisit":{"location":)"
     R"({"latitudeE7":470000000,"longitudeE7":155000000,"address":"Ring 1, Graz",)"
     R"("semanticType":"TYPE_HOME","locationConfidence":9},"duration":{"startTimestamp":)"
     R"("2024-06-15T06:00:00Z","endTimestamp":"2024-06-15T07:00:00Z"}}},{"activitySegment":)"
     R"({"startLocation":{"latitudeE7":1,"longitudeE7":1},"waypointPath":{"waypoints":)"
     R"([{"latE7":9,"lngE7":9}]},"duration":{"startTimestamp":"2024-06-15T06:00:00Z",)"
     R"("endTimestamp":"2024-06-15T07:00:00Z"}}}]})"},
    {readLocationHistory,
     R"([{"visit":{"hierarchyLevel":"0","probability":"0.75","topCandidate":{"semanticType":)"
     R"("Home","placeLocation":{"latLng":"47.0°, 15.5°"}}},"startTime":)"
     R"("2024-06-15T08:00:00+02:00","endTime":"2024-06-15T09:00:00+02:00",)"
     R"("startTimeTimezoneUtcOffsetMinutes":120,"endTimeTimezoneUtcOffsetMinutes":120},)"
     R"({"timelinePath":[{"point":"geo:47,15.5","durationMinutesOffsetFromStartTime":"4"}],)"
     R"("activity":{"start":"geo:1,2","end":{"latLng":"1°, 2°"}},)"
     R"("startTime":"2024-06-15T08:00:00Z","endTime":"2024-06-15T09:00:00Z"}])"},
    {readGeoJson,
     R"({"type":"FeatureCollection","features":[{"type":"Feature","properties":{"time":)"
     R"("2024-06-15T08:00:00Z"},"geometry":{"type":"Point","coordinates":[15.5,47,3]}},)"
     R"({"type":"Feature","properties":{"name":"Home","use":"work"},"geometry":{"type":"Point",)"
     R"("coordinates":[15.5,47]}},{"type":"Feature","properties":{"coordTimes":)"
     R"(["2024-06-15T08:00:00Z",1718433147]},"geometry":{"type":"LineString",)"
     R"("coordinates":[[1,2],[3,4]]}}]})"},
    {readOwnTracks,
     "2024-06-15T08:00:05Z\t*  \t{\"_type\":\"location\",\"tst\":1718438400,\"lat\":47.0,"
     "\"lon\":15.5,\"acc\":8}\n2024-06-15T08:00:05Z\t*\t{\"_type\":\"waypoint\",\"desc\":"
     "\"Work\",\"lat\":47.2,\"lon\":15.5}\n",
     true},
};

}  // namespace

extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t* data, std::size_t size,
                                               std::size_t most, unsigned seed) {
    const auto text = kTargets[seed % std::size(kTargets)].seed;
    return beginOrMutate(chosen(seed, seed >> 8U, text), data, size, most);
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size < 2) return 0;
    const std::string bytes(data + 2, data + size);
    const auto& target = kTargets[data[0] % std::size(kTargets)];
    checkReader(target.reader, bytes, data[0] + static_cast<std::size_t>(data[1]) * 256U,
                target.inLines);
    return 0;
}
