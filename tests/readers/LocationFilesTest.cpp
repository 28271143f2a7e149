// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "PlaceFiles.h"
#include "readers/StatedPlaces.h"

namespace keepsakes {
namespace {

using testing::HasSubstr;

struct LocationCase {
    std::string what;
    std::string file;
    std::string told;
};

void checkPlaces(const std::vector<LocationCase>& cases) {
    for (const auto& [what, file, expected] : cases) {
        EXPECT_EQ(toldPlaces(file), expected) << what;
        EXPECT_EQ(brokenCut(file), "") << what;
    }
}

std::string records(const std::string& inside) { return R"({"locations": [)" + inside + "]}"; }

TEST(LocationHistoryReader, ReadsRawRecords) {
    checkPlaces({
        {"times as text and in milliseconds, one within a guess of the activity",
         records(R"({"latitudeE7": 525121303, "longitudeE7": 134309551, "accuracy": 25,
                     "activity": [{"activity": [{"type": "STILL"}],
                                   "timestamp": "2024-06-01T00:00:00Z"}],
                     "timestamp": "2024-06-15T06:31:26.860Z"},
                    {"timestampMs": "1718433147000", "latitudeE7": 525121303,
                     "longitudeE7": -1134309551, "accuracy": 0})"),
         "2024-06-15T06:31:26.860Z 52.5121 13.4310 25 m\n"
         "2024-06-15T06:32:27Z 52.5121 -113.4310\n"},
        {"degrees that lost their sign", records(R"({"latitudeE7": 3956279596,
             "longitudeE7": 3084029361, "timestamp": "2024-06-15T06:00:00Z"})"),
         "2024-06-15T06:00:00Z -33.8688 -121.0938\n"},
        {"records without a position, a time, or one that is believed", records(R"(
             {"timestamp": "2024-06-15T06:00:00Z", "latitudeE7": 1},
             {"latitudeE7": 910000000, "longitudeE7": 2, "timestamp": "2024-06-15T06:00:00Z"},
             {"latitudeE7": 10000000, "longitudeE7": 20000000},
             {"latitudeE7": null, "longitudeE7": {"longitudeE7": 20000000},
              "timestamp": "2024-06-15T06:00:00Z"},
             {"latitudeE7": 10000000, "longitudeE7": 20000000, "timestamp": "1970-01-01"}, 7)"),
         ""},
        {"none", records("\"latitudeE7\""), "error: of another kind\n"},
    });
}

TEST(LocationHistoryReader, ReadsStaysAndWaysOfTheSemanticForm) {
    checkPlaces({
        {"a stay at home with a stay within and its raw path", R"({"timelineObjects": [
             {"placeVisit": {
                 "location": {"latitudeE7": 470000000, "longitudeE7": 155000000,
                              "address": "Hauptplatz 1, 8010 Graz", "name": "Uhrturm",
                              "semanticType": "TYPE_HOME", "locationConfidence": 90},
                 "duration": {"startTimestamp": "2024-06-15T06:00:00Z",
                              "endTimestamp": "2024-06-15T08:00:00Z"},
                 "visitConfidence": 75,
                 "simplifiedRawPath": {"points": [
                     {"latE7": 470001000, "lngE7": 155000000, "accuracyMeters": 12,
                      "timestamp": "2024-06-15T07:00:00Z"}]},
                 "childVisits": [{"location": {"latitudeE7": 1, "longitudeE7": 1},
                                  "duration": {"startTimestamp": "2024-06-15T06:30:00Z",
                                               "endTimestamp": "2024-06-15T07:00:00Z"}}]}},
             {"placeVisit": {
                 "duration": {"startTimestampMs": "1718438400000", "endTimestampMs": "1718442000000"},
                 "location": {"latitudeE7": 480000000, "longitudeE7": 155000000,
                              "address": "Ring 3\nWien", "locationConfidence": 40}}}]})",
         "2024-06-15T07:00:00Z 47.0001 15.5000 12 m\n"
         "stay 2024-06-15T06:00:00Z 2024-06-15T08:00:00Z 47.0000 15.5000 0.75 'Uhrturm' home\n"
         "stay 2024-06-15T08:00:00Z 2024-06-15T09:00:00Z 48.0000 15.5000 0.4 'Ring 3'\n"},
        {"ways by their ends, else by their waypoints", R"({"timelineObjects": [
             {"activitySegment": {
                 "startLocation": {"latitudeE7": 470000000, "longitudeE7": 155000000},
                 "endLocation": {},
                 "waypointPath": {"waypoints": [{"latE7": 10000000, "lngE7": 10000000},
                                                {"latE7": 20000000, "lngE7": 20000000},
                                                {"latE7": 30000000, "lngE7": 30000000}]},
                 "duration": {"startTimestamp": "2024-06-15T06:00:00Z",
                              "endTimestamp": "2024-06-15T07:00:00Z"}}}]})",
         "2024-06-15T06:00:00Z 47.0000 15.5000\n2024-06-15T07:00:00Z 3.0000 3.0000\n"},
        {"no stay: without an end, backwards, of years", R"({"timelineObjects": [
             {"placeVisit": {"location": {"latitudeE7": 470000000, "longitudeE7": 155000000},
                             "duration": {"startTimestamp": "2024-06-15T06:00:00Z"}}},
             {"placeVisit": {"location": {"latitudeE7": 470000000, "longitudeE7": 155000000},
                             "duration": {"startTimestamp": "2024-06-15T06:00:00Z",
                                          "endTimestamp": "2024-06-15T05:00:00Z"}}},
             {"placeVisit": {"location": {"latitudeE7": 470000000, "longitudeE7": 155000000},
                             "duration": {"startTimestamp": "2001-06-15T06:00:00Z",
                                          "endTimestamp": "2024-06-15T05:00:00Z"}}}]})",
         ""},
    });
}

TEST(LocationHistoryReader, ReadsWhatADeviceExports) {
    checkPlaces({
        {"segments, signals and labelled places", R"({"semanticSegments": [
             {"visit": {"hierarchyLevel": 0, "probability": 0.75, "topCandidate": {
                  "probability": 0.1, "semanticType": "INFERRED_WORK",
                  "placeLocation": {"latLng": "47.0°, 15.5°"}}},
              "startTime": "2024-06-15T08:00:00+02:00", "endTime": "2024-06-15T09:00:00+02:00",
              "startTimeTimezoneUtcOffsetMinutes": 120, "endTimeTimezoneUtcOffsetMinutes": 120},
             {"startTime": "2024-06-15T08:10:00+02:00", "endTime": "2024-06-15T08:50:00+02:00",
              "visit": {"hierarchyLevel": 1, "topCandidate": {
                  "placeLocation": {"latLng": "47.1°, 15.5°"}}}},
             {"startTime": "2024-06-15T09:00:00+02:00", "endTime": "2024-06-15T10:00:00+02:00",
              "startTimeTimezoneUtcOffsetMinutes": 120, "endTimeTimezoneUtcOffsetMinutes": 120,
              "activity": {"start": {"latLng": "47.0°, 15.5°"}, "end": {"latLng": "48.0°, 15.5°"}}},
             {"timelinePath": [{"point": "-47.0°, -15.5°", "time": "2024-06-15T09:30:00+02:00"}]}],
           "rawSignals": [{"wifiScan": {}}, {"position": {"LatLng": "47.0°, 15.5°",
              "accuracyMeters": 11, "timestamp": "2024-06-15T06:31:35+10:00"}}],
           "userLocationProfile": {"frequentPlaces": [
              {"placeLocation": "47.0°, 15.5°", "label": "HOME"},
              {"placeLocation": "48.0°, 15.5°"}]}})",
         "stay 2024-06-15T06:00:00Z 2024-06-15T07:00:00Z 47.0000 15.5000 0.75 '' work\n"
         "2024-06-15T07:00:00Z 47.0000 15.5000\n2024-06-15T08:00:00Z 48.0000 15.5000\n"
         "2024-06-15T07:30:00Z -47.0000 -15.5000\n"
         "2024-06-14T20:31:35Z 47.0000 15.5000 11 m\n"
         "place 47.0000 15.5000 'Home' home\n"
         "zone 7200 2024-06-15T06:00:00Z 2024-06-15T08:00:00Z\n"},
        {"an array, its numbers as texts", R"([
             {"timelinePath": [{"point": "geo:47.0,15.5", "durationMinutesOffsetFromStartTime": "4"},
                               {"durationMinutesOffsetFromStartTime": "99999999",
                                "point": "geo:47.0,15.5"}],
              "endTime": "2024-06-15T10:00:00.000Z", "startTime": "2024-06-15T08:00:00.000Z"},
             {"endTime": "2024-06-15T08:00:00-05:00", "startTime": "2024-06-15T07:00:00-05:00",
              "activity": {"start": "geo:47.0,15.5", "end": "geo:48.0,15.5"}},
             {"endTime": "2024-06-15T09:00:00Z", "startTime": "2024-06-15T08:00:00Z",
              "visit": {"hierarchyLevel": "0", "probability": "7.5",
                        "topCandidate": {"semanticType": "Home",
                                         "placeLocation": "geo:27.5,-97.5"}}},
             {"timelineMemory": {"destinations": [{"identifier": "x"}]}}])",
         "2024-06-15T08:04:00Z 47.0000 15.5000\n"
         "2024-06-15T12:00:00Z 47.0000 15.5000\n2024-06-15T13:00:00Z 48.0000 15.5000\n"
         "stay 2024-06-15T08:00:00Z 2024-06-15T09:00:00Z 27.5000 -97.5000 1 '' home\n"},
    });
}

TEST(GeoJsonReader, ReadsPointsWithATimeAndPlacesWithAName) {
    const auto point = [](const std::string& properties) {
        return R"({"type": "Feature", "properties": {)" + properties +
               R"(}, "geometry": {"type": "Point", "coordinates": [15.5, 47, 350]}})";
    };
    checkPlaces({
        {"points",
         R"({"type": "FeatureCollection", "features": [)" +
             point(R"("time": "2024-06-15T08:00:00Z", "accuracy": 5, "name": "x")") + "," +
             point(R"("timestamp": 1718438400)") + "," +
             point(R"("time": "", "name": "no place either")") + "]}",
         "2024-06-15T08:00:00Z 47.0000 15.5000 5 m\n2024-06-15T08:00:00Z 47.0000 15.5000\n"},
        {"named places, the type of the collection last",
         R"({"features": [)" + point(R"("name": " Zuhause\n")") + "," +
             point(R"("title": "Praxis", "use": "work")") + "," +
             point(R"("time": "?", "name": "no place")") + "," +
             point(R"("date": "2020-01-01", "time": null, "location": {"name": "Uhrturm"})") + "," +
             point("") + R"(], "type": "FeatureCollection"})",
         "place 47.0000 15.5000 'Zuhause' home\nplace 47.0000 15.5000 'Praxis' work\n"
         "place 47.0000 15.5000 'Uhrturm'\n"},
        {"lines with times, and one whose times are too few",
         R"({"type": "FeatureCollection", "features": [
              {"type": "Feature", "properties": {"name": "Ride", "coordTimes": [
                  ["2024-06-15T08:00:00Z", null], ["2024-06-15T08:02:00Z"]]},
               "geometry": {"type": "MultiLineString", "coordinates": [[[1, 2], [3, 4]], [[5, 6]]]}},
              {"type": "Feature", "properties": {"times": ["2024-06-15T08:00:00Z"]},
               "geometry": {"coordinates": [[1, 2], [3, 4]], "type": "LineString"}}]})",
         "2024-06-15T08:00:00Z 2.0000 1.0000\n2024-06-15T08:02:00Z 6.0000 5.0000\n"},
        {"a feature alone", point(R"("name": "Büro")"), "place 47.0000 15.5000 'Büro' work\n"},
        {"no point: polygons, poles beyond the pole, a geometry without a name",
         R"({"type": "FeatureCollection", "features": [
              {"type": "Feature", "properties": {"name": "Park"}, "geometry":
                  {"type": "Polygon", "coordinates": [[[1, 2], [3, 4], [5, 6], [1, 2]]]}},
              {"type": "Feature", "properties": {"name": "x"}, "geometry":
                  {"type": "Point", "coordinates": [2, 91]}},
              {"type": "Feature", "properties": {"name": "x"}, "geometry": null}]})",
         ""},
    });
}

TEST(OwnTracksReader, ReadsLocationsAndWaypoints) {
    const std::string time = "2024-06-15T08:00:05Z\t*                 \t";
    const std::string point =
        time + R"({"_type":"location","tst":1718438400,"lat":47.0,"lon":15.5,"acc":8})"
               "\n";
    const std::string told = "2024-06-15T08:00:00Z 47.0000 15.5000 8 m\n";
    checkPlaces({
        {"locations, transitions and waypoints; the recorder's time where there is no other",
         point + time + R"({"lat":47.1,"_type":"transition","lon":15.5})" + "\r\n" + time +
             R"({"_type":"waypoint","desc":"Büro","lat":47.2,"lon":15.5,"tst":1})" + "\n" +
             "2024-06-15T08:00:05Z\t-\t" + R"({"tst":"1718438400","_type":"lwt"})",
         told + "2024-06-15T08:00:05Z 47.1000 15.5000\nplace 47.2000 15.5000 'Büro' work\n"},
        {"lines that are none, among others",
         point + "\n\n" + time + R"({"_type":"encrypted","data":"x"})" + "\nRESTART\n" + time +
             "{\n" + point,
         told + told},
        {"a message that was cut", point + point.substr(0, 70), told},
    });
    EXPECT_EQ(toldPlaces(point + time + std::string(300'000, 'x') + "\n" + point), told + told)
        << "a line too long";
    EXPECT_EQ(toldPlaces(time + R"({"_type":"location","tst":1,"lat":1,"lon":1})"),
              "error: no timestamp lies between 1990-01-01 and a day from now\n");
}

TEST(LocationFiles, AreRefusedWithTheReason) {
    const auto repeated = [](int count, const std::string& text) {
        std::string all;
        for (int i = 0; i < count; ++i) all += text;
        return all;
    };
    const std::string begin = R"({"locations": [{"latitudeE7": 1)";
    const std::string line = R"({"type":"Feature","geometry":{"type":"LineString","coordinates":[)";
    const std::vector<std::pair<std::string, std::string>> cases{
        {begin, "byte 31: the document ends early"},
        {begin + "}]", "byte 33: the document ends early"},
        {begin + ",}]}", "byte 33: not well-formed JSON"},
        {begin + "}]} x", "byte 36: not well-formed JSON"},
        {begin + "}]}" + std::string(2, '\0'), "bytes follow the document"},
        {begin + ", \"x\": \"\xE4\"}]}", "byte 41: not well-formed JSON"},
        {begin + ", \"x\": " + repeated(100, "["), "elements are nested too deep"},
        {begin + ", \"x\": \"" + std::string(3U << 20U, 'x'), "a value is too long"},
        {begin + ", \"x\": [" + repeated(1U << 20U, "[],"), "a value is too long"},
        {begin + ", \"x\": " + std::string(3U << 20U, '1'), "a value is too long"},
        {begin + ", \"x\": 1e999}]}", "not well-formed JSON"},
        {records(R"({"latitudeE7": 1, "timestamp": "1970-01-01"})"),
         "no timestamp lies between 1990-01-01"},
        {records(R"({"latitudeE7": 1, "timestamp": "noon"})"), "no timestamp can be read"},
        {line + repeated(500'000, "[1,2],") + "[3,4]]}}", "a line of more than 500000 points"},
        {R"([{"visit": 1, "timelinePath": [)" +
             repeated(500'000, R"({"point":"geo:1,2","durationMinutesOffsetFromStartTime":1},)") +
             R"({"point":"geo:1,2","durationMinutesOffsetFromStartTime":1}]}])",
         "a path of more than 500000 points"},
    };
    for (const auto& [bytes, reason] : cases) {
        const auto told = toldPlaces(bytes);
        EXPECT_THAT(told, HasSubstr("error: ")) << reason;
        EXPECT_THAT(told, HasSubstr(reason));
    }
}

TEST(StatedPlaces, ReadPositionsWrittenAsText) {
    const std::vector<std::pair<std::string, std::optional<GeoPoint>>> cases{
        {"geo:48.1,11.5", GeoPoint{48.1, 11.5}},
        {"geo:48.1,-11.5,350;u=35", GeoPoint{48.1, -11.5}},
        {"-48.1°, 11.5°", GeoPoint{-48.1, 11.5}},
        {"48.1,11.5", GeoPoint{48.1, 11.5}},
        {"geo:91,0", std::nullopt},
        {"geo:nan,1", std::nullopt},
        {"0.0°, 0.0°", std::nullopt},
        {"48.1°", std::nullopt},
        {"48.1, 11.5, 7", std::nullopt},
        {"", std::nullopt},
    };
    for (const auto& [text, position] : cases) EXPECT_EQ(positionOfText(text), position) << text;
}

}  // namespace
}  // namespace keepsakes
