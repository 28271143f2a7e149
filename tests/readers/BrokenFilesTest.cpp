// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "PlaceFiles.h"
#include "SampleFiles.h"
#include "readers/TrackReader.h"

namespace keepsakes {
namespace {

using testing::HasSubstr;

const std::string kGpx =
    "<?xml version='1.0'?><gpx><trk><type>hiking</type><trkseg>"
    "<trkpt lat='47' lon='15'><time>2024-06-15T10:00:00+02:00</time></trkpt>"
    "<trkpt lat='47' lon='15'><time>2024-06-15T11:00:00+02:00</time></trkpt>"
    "</trkseg></trk></gpx>";
const std::string kTcx =
    "<?xml version='1.0'?><TrainingCenterDatabase><Activities><Activity Sport='Running'>"
    "<Lap StartTime='2024-06-12T16:00:00Z'><TotalTimeSeconds>600</TotalTimeSeconds></Lap>"
    "</Activity></Activities></TrainingCenterDatabase>";

SampleMetadata everyField() {
    SampleMetadata metadata;
    metadata.time = "2024:06:15 10:02:03";
    metadata.offset = "+02:00";
    metadata.latitude = "47/1 30/1 0/1";
    metadata.longitude = "15/1 0/1 0/1";
    metadata.xmp = "<dc:subject><rdf:Bag><rdf:li>mountain</rdf:li></rdf:Bag></dc:subject>";
    metadata.keyword = "Wandern";
    return metadata;
}

/// Whether `cut` says nothing that `whole` does not say. A photo cut within its offset may tell
/// its instant by the owner's zone, which is UTC in this test.
bool isPart(const FileRecords& cut, const FileRecords& whole) {
    if (cut.workouts.size() + cut.photos.size() + cut.zones.size() == 0) return true;
    if (whole.photos.empty()) return cut == whole;
    const auto& part = cut.photos.at(0);
    const auto& all = whole.photos.at(0);
    const auto within = [](const auto& some, const auto& every) {
        return std::ranges::all_of(some, [&every](const auto& one) {
            return std::ranges::find(every, one) != every.end();
        });
    };
    return part.localTime == all.localTime && within(part.inferences, all.inferences) &&
           within(part.persons, all.persons) && (!part.position || part.position == all.position);
}

TEST(BrokenFiles, AFileCutAnywhereTellsAPartOfItOrAReason) {
    const std::vector<std::pair<std::string_view, std::string>> files{
        {"GPX", kGpx},
        {"TCX", kTcx},
        {"JPEG", photo(everyField(), ImageForm::jpeg)},
        {"PNG", photo(everyField(), ImageForm::png)},
        {"HEIF", photo(everyField(), ImageForm::heif)},
    };
    for (const auto& [name, bytes] : files) {
        const auto whole = readBytes(bytes);
        ASSERT_TRUE(whole) << name << ": " << whole.error();
        ASSERT_EQ(whole->workouts.size() + whole->photos.size(), 1U) << name;
        for (std::size_t length = 0; length < bytes.size(); ++length) {
            const auto cut = readBytes(std::string_view(bytes).substr(0, length));
            if (cut) {
                EXPECT_TRUE(isPart(*cut, *whole)) << name << " cut at " << length << told(cut);
            } else {
                EXPECT_FALSE(cut.error().empty()) << name << " cut at " << length;
            }
        }
    }
}

TEST(BrokenFiles, AreRefusedWithTheReason) {
    const auto nested = [](std::size_t depth) {
        std::string xml = "<gpx>";
        for (std::size_t i = 0; i < depth; ++i) xml += "<a>";
        return xml;
    };
    std::string laughs = "<!DOCTYPE gpx [<!ENTITY a 'ha'>";
    for (char c = 'b'; c <= 'k'; ++c) {
        laughs += std::string("<!ENTITY ") + c + " '";
        for (int i = 0; i < 10; ++i) laughs += std::string("&") + static_cast<char>(c - 1) + ";";
        laughs += "'>";
    }
    laughs += "]><gpx><trk><name>&k;</name></trk></gpx>";
    SampleMetadata early = everyField();
    early.time = "1980:01:01 00:00:00";
    SampleMetadata never = everyField();
    never.time = "    :  :     :  :  ";
    const std::string heif(
        "\0\0\0\x14"
        "ftypmif1\0\0\0\0mif1",
        20);
    std::string manyTracks = "<gpx>";
    for (int i = 0; i <= 10000; ++i) {
        manyTracks +=
            "<trk><type>run</type><trkseg><trkpt><time>2024-06-15T10:00:00Z</time></trkpt>"
            "<trkpt><time>2024-06-15T10:00:01Z</time></trkpt></trkseg></trk>";
    }
    const std::vector<std::pair<std::string, std::string>> cases{
        {"", "no element found"},
        {"error: no such track\n", "line 1: syntax error"},
        {kGpx.substr(0, 100), "no element found"},
        {"<?xml version='1.0' encoding='UTF-8'?>\n<gpx><trk><name>caf\xE9</name></trk></gpx>",
         "line 2: not well-formed"},
        {"<?xml version='1.0' encoding='klingon'?><gpx/>", "unknown encoding"},
        {laughs, "the document declares entities"},
        {nested(200), "elements are nested too deep"},
        {"<gpx><!--" + std::string(4U << 20U, 'x') + "--></gpx>", "a token is too long"},
        {"<kml/>", "the root element <kml> is neither GPX nor TCX"},
        {"<gpx><trk><trkseg><trkpt><time>1970-01-01T00:00:00Z</time></trkpt></trkseg></trk></gpx>",
         "no timestamp lies between"},
        {"<gpx><trk><trkseg><trkpt><time>noon</time></trkpt></trkseg></trk></gpx>",
         "no timestamp can be read"},
        {manyTracks + "</gpx>", "more than 10000 workouts"},
        {photo(SampleMetadata{}), "no capture time"},
        {heif + std::string("\x7F\xFF\xFF\xFFmeta", 8), "the meta box is too large"},
        {heif + std::string("\0\0\0\0mdat", 8), "no meta box"},
        {heif + std::string("\0\0\0\x2Cmeta\0\0\0\0\0\0\0\x0Eiinf\0\0\0\0\0\0"
                            "\0\0\0\x12iloc\2\0\0\0\0\0\xFF\xFF\xFF\xFF",
                            44),
         "a box ends within a field"},
        {photo(never), "no capture time"},
        {photo(early), "1979-12-31T22:00:00Z as capture time is not believed"},
    };
    for (const auto& [bytes, reason] : cases) {
        const auto records = readBytes(bytes);
        ASSERT_FALSE(records) << reason << ": " << told(records);
        EXPECT_THAT(records.error(), HasSubstr(reason));
    }
}

TEST(BrokenFiles, AFailingReadIsTheReason) {
    const ReadBlock fails = [](std::span<char>) -> std::expected<std::size_t, std::string> {
        return std::unexpected("read: Input/output error");
    };
    PlaceLines places;
    EXPECT_EQ(readTrack(fails, kReadOn, places).error(), "read: Input/output error");
    EXPECT_EQ(readPhotoFile(-1, kReadOn).error(), "stat: Bad file descriptor");
}

TEST(FileKind, IsToldByContent) {
    const std::vector<std::pair<std::string, FileKind>> heads{
        {kGpx, FileKind::track},
        {"\xEF\xBB\xBF\n" + kTcx, FileKind::track},
        {"<!-- <gpx> --><kml>", FileKind::unknown},
        {"a text about <gpx>", FileKind::unknown},
        {std::string("\0\0\0\x18"
                     "ftypisom\0\0\0\0isommp42",
                     24),
         FileKind::unknown},
        {std::string("\0\0\0\x18"
                     "ftypisom\0\0\0\0isomavif",
                     24),
         FileKind::photo},
        {photo({}, ImageForm::png), FileKind::photo},
        {std::string("\x0E\x10\x8C\0\0\0\0\0.FIT", 12), FileKind::fit},
        {"2024-06-15T08:00:00Z\t*   \t{}", FileKind::ownTracks},
        {"2024-06-15T08:00:00Z\tno kind", FileKind::unknown},
        {" {\"locations\": [{\"latitudeE7\": 5, \"cut", FileKind::locationHistory},
        {"\xEF\xBB\xBF{\"semanticSegments\": []}", FileKind::locationHistory},
        {"{\"locations\": [{\"city\": \"Graz\"}]}", FileKind::unknown},
        {"[{\"startTime\": \"\", \"visit\": {", FileKind::locationHistory},
        {"{\"visit\": 7}", FileKind::unknown},
        {"{\"name\": \"x\", \"type\": \"FeatureCollection\", ", FileKind::geoJson},
        {"{\"features\": [{\"type\": \"Feature\", \"geometry\": {", FileKind::geoJson},
        {"{\"type\": \"Topology\", \"objects\": {\"type\": \"Point\"}}", FileKind::unknown},
        {"[1, 2, {\"type\": 3}]", FileKind::unknown},
        {"", FileKind::unknown},
    };
    for (const auto& [head, kind] : heads) {
        EXPECT_EQ(kindOf(std::as_bytes(std::span(head))), kind) << head.substr(0, 40);
    }
}

}  // namespace
}  // namespace keepsakes
