// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <cstdlib>
#include <ctime>
#include <set>
#include <string>
#include <vector>

#include "SampleFiles.h"
#include "readers/PhotoWords.h"

namespace keepsakes {
namespace {

class PhotoReader : public testing::Test {
  protected:
    void SetUp() override {
        ::setenv("TZ", "Europe/Vienna", 1);  // NOLINT(concurrency-mt-unsafe): one thread
        ::tzset();
    }
    void TearDown() override {
        ::unsetenv("TZ");  // NOLINT(concurrency-mt-unsafe): one thread
        ::tzset();
    }
};

SampleMetadata taken(std::string offset = "+02:00") {
    SampleMetadata metadata;
    metadata.time = "2024:06:15 10:02:03";
    metadata.offset = std::move(offset);
    return metadata;
}

std::string withXmp(const std::string& xmp) {
    auto metadata = taken();
    metadata.xmp = xmp;
    return told(readBytes(photo(metadata)));
}

std::string bag(const std::string& element, const std::string& item) {
    return "<" + element + "><rdf:Bag><rdf:li>" + item + "</rdf:li></rdf:Bag></" + element + ">";
}

const std::string kTaken = "2024-06-15T08:02:03Z by offset, local 2024-06-15T10:02:03Z";

TEST_F(PhotoReader, TakesTheOffsetFromTheBestSource) {
    auto gps = taken("");
    gps.gpsDay = "2024:06:15";
    gps.gpsTime = "1/1 1/1 30/1";
    auto both = gps;
    both.offset = "+02:00";
    auto stale = gps;
    stale.gpsTime = "1/1 55/1 0/1";
    auto broken = gps;
    broken.gpsTime = "1/0 1/1 30/1";
    SampleMetadata xmp;
    xmp.xmp = "<exif:DateTimeOriginal>2024-06-15T10:02:03-04:00</exif:DateTimeOriginal>";
    SampleMetadata created;
    created.xmp = "<photoshop:DateCreated>2024-06-15T10:02:03</photoshop:DateCreated>";
    const std::vector<std::tuple<std::string, SampleMetadata, std::string>> cases{
        {"its own offset", both, kTaken},
        {"GPS time", gps, "2024-06-15T01:02:03Z by gps, local 2024-06-15T10:02:03Z"},
        {"an old fix", stale, "2024-06-15T08:02:03Z by owner, local 2024-06-15T10:02:03Z"},
        {"no number", broken, "2024-06-15T08:02:03Z by owner, local 2024-06-15T10:02:03Z"},
        {"XMP", xmp, "2024-06-15T14:02:03Z by offset, local 2024-06-15T10:02:03Z"},
        {"XMP without", created, "2024-06-15T08:02:03Z by owner, local 2024-06-15T10:02:03Z"},
    };
    for (const auto& [what, metadata, expected] : cases) {
        EXPECT_EQ(told(readBytes(photo(metadata))), expected + "\n") << what;
    }
}

TEST_F(PhotoReader, KeepsItsKeywordsFoldedWithTheirWordsApart) {
    auto metadata = taken();
    metadata.xmp = bag("dc:subject", "Café–Bar am See, &amp; mehr") +
                   bag("lr:hierarchicalSubject", "Freizeit|Trail_Running");
    const auto records = readBytes(photo(metadata));
    ASSERT_TRUE(records);
    EXPECT_EQ(records->photos.at(0).keywords,
              (std::vector<std::string>{"cafebar am see mehr", "freizeit", "trail running"}));
}

TEST_F(PhotoReader, ReadsEveryImageForm) {
    auto metadata = taken();
    metadata.latitude = "47/1 30/1 0/1";
    metadata.longitude = "15/1 0/1 3600/100";
    metadata.xmp = bag("dc:subject", "Strand");
    for (const auto form : {ImageForm::jpeg, ImageForm::png, ImageForm::heif}) {
        EXPECT_EQ(told(readBytes(photo(metadata, form))), kTaken + ", at 47.5000 15.0100, beach\n");
    }
}

TEST_F(PhotoReader, TakesNoPositionThatCannotBeOne) {
    const std::vector<std::pair<std::string, std::string>> angles{
        {"0/1 0/1 0/1", "0/1 0/1 0/1"}, {"91/1 0/1 0/1", "15/1 0/1 0/1"}, {"1/0 0/1 0/1", "2/1"}};
    for (const auto& [latitude, longitude] : angles) {
        auto metadata = taken();
        metadata.latitude = latitude;
        metadata.longitude = longitude;
        EXPECT_EQ(told(readBytes(photo(metadata))), kTaken + "\n") << latitude;
    }
}

TEST_F(PhotoReader, FindsInferencesWhereverKeywordsStand) {
    const std::vector<std::pair<std::string, std::string>> cases{
        {bag("dc:subject", "Berge"), ", mountain"},
        {bag("lr:hierarchicalSubject", "Sport|Randonnée"), ", Activity, Hiking"},
        {bag("digiKam:TagsList", "Orte/Freizeitpark"), ", AmusementPark"},
        {bag("MicrosoftPhoto:LastKeywordXMP", "Feste/Geburtstag"), ", Birthday"},
        {bag("dc:subject", "Weihnachten"), ", HolidayEvent, holiday Christmas"},
        {bag("dc:subject", "Mountain View"), ""},
    };
    for (const auto& [xmp, expected] : cases) EXPECT_EQ(withXmp(xmp), kTaken + expected + "\n");

    auto iptc = taken();
    iptc.keyword = "K\xF6ln, S\xE4ugling";  // one keyword of a Latin-1 editor, no word of the table
    EXPECT_EQ(told(readBytes(photo(iptc))), kTaken + "\n");
    iptc.keyword = "S\xE4ugling";
    iptc.xmp = bag("dc:subject", "baby");
    EXPECT_EQ(told(readBytes(photo(iptc))), kTaken + ", baby\n");
}

TEST_F(PhotoReader, NamesPeopleAndEvents) {
    const std::string region =
        "<mwg-rs:Regions rdf:parseType='Resource'><mwg-rs:RegionList><rdf:Bag>"
        "<rdf:li mwg-rs:Name='Ada' mwg-rs:Type='Face'/><rdf:li mwg-rs:Name='Rex' "
        "mwg-rs:Type='Pet'/><rdf:li mwg-rs:Type='Face'/></rdf:Bag></mwg-rs:RegionList>"
        "</mwg-rs:Regions>";
    const std::string people =
        "<MP:RegionInfo rdf:parseType='Resource'><MPRI:Regions><rdf:Bag>"
        "<rdf:li MPReg:PersonDisplayName='Grace'/></rdf:Bag></MPRI:Regions></MP:RegionInfo>";
    EXPECT_EQ(withXmp(region + people + bag("Iptc4xmpExt:PersonInImage", "Ada")),
              kTaken + ", pet, person Grace, person Ada\n");
    EXPECT_EQ(withXmp("<Iptc4xmpExt:Event><rdf:Alt><rdf:li xml:lang='x-default'>Danube Island "
                      "Festival</rdf:li></rdf:Alt></Iptc4xmpExt:Event>"),
              kTaken + ", event Danube Island Festival\n");
}

TEST_F(PhotoReader, FindsEveryInferenceUnderItsOwnWord) {
    const std::set<std::string_view> words{"baby",
                                           "pet",
                                           "trip",
                                           "nature",
                                           "mountain",
                                           "beach",
                                           "home",
                                           "work",
                                           "Activity",
                                           "Hiking",
                                           "Climbing",
                                           "Beaching",
                                           "Diving",
                                           "WinterSport",
                                           "Museum",
                                           "Performance",
                                           "AmusementPark",
                                           "Entertainment",
                                           "Concert",
                                           "Festival",
                                           "Theater",
                                           "Dance",
                                           "SportEvent",
                                           "NightOut",
                                           "Birthday",
                                           "Celebration",
                                           "Wedding",
                                           "Anniversary",
                                           "HolidayEvent",
                                           "Gathering",
                                           "frequentLocation"};
    ASSERT_EQ(words.size(), 31U);
    for (const auto word : words) EXPECT_EQ(inferenceOfKeyword(word), word);
}

}  // namespace
}  // namespace keepsakes
