// SPDX-License-Identifier: Apache-2.0
// Property: what a file tells does not depend on how the bytes come in, a part of it tells a part,
// and all of it is such as the index may hold. The first two bytes choose the sizes of the blocks.
#include <cstdint>
#include <string>

#include "CheckedPlaces.h"
#include "readers/TrackReader.h"

namespace {

using namespace keepsakes;

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

extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t* data, std::size_t size,
                                               std::size_t most, unsigned seed) {
    const auto text = kSeeds[seed % std::size(kSeeds)];
    return beginOrMutate(chosen(seed, seed >> 8U, text), data, size, most);
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size < 2) return 0;
    const std::string bytes(data + 2, data + size);
    checkReader(readTrack, bytes, data[0] + data[1] * 256U);
    return 0;
}
