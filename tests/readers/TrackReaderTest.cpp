// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "PlaceFiles.h"
#include "SampleFiles.h"
#include "platform/ActivityCatalogue.h"
#include "readers/ActivityWords.h"

namespace keepsakes {
namespace {

std::string gpx(const std::string& inside) { return "<gpx version='1.1'>" + inside + "</gpx>"; }

std::string tcx(const std::string& inside) {
    return "<TrainingCenterDatabase><Activities>" + inside +
           "</Activities></TrainingCenterDatabase>";
}

std::string point(const std::string& time, double latitude = 47) {
    return fmt::format("<trkpt lat='{}' lon='15'><time>{}</time></trkpt>", latitude, time);
}

std::string track(const std::string& type, const std::string& points) {
    return "<trk><type>" + type + "</type><trkseg>" + points + "</trkseg></trk>";
}

const std::string kTwoPoints = point("2024-06-15T08:00:00Z") + point("2024-06-15T09:00:00Z");
const std::string kHike = "Hiking 2024-06-15T08:00:00Z 2024-06-15T09:00:00Z\n";

struct TrackCase {
    std::string what;
    std::string file;
    std::string told;
};

void checkTracks(const std::vector<TrackCase>& cases) {
    for (const auto& [what, file, expected] : cases) {
        EXPECT_EQ(told(readBytes(file)), expected) << what;
    }
}

TEST(TrackReader, HandsOnPointsAndTheOwnersWaypoints) {
    const auto file = gpx(
        "<wpt lat='47.07' lon='15.44'><name> Grandma&apos;s </name></wpt>"
        "<wpt lat='47.08' lon='15.45'><name>Flat</name><sym>Residence</sym></wpt>"
        "<wpt lat='47.09' lon='15.46'><type>Work</type><name>Tower</name></wpt>"
        "<wpt lat='1' lon='2'><name>LAP001</name></wpt><wpt lat='1' lon='2'><name>12</name></wpt>"
        "<wpt lat='1' lon='2'><desc>nameless</desc></wpt><wpt lat='91' lon='2'><name>Off</name>"
        "</wpt><rte><rtept lat='1' lon='2'><name>Turn</name></rtept></rte>" +
        track("driving", point("2024-06-15T08:00:00Z", 47.1) + point("1970-01-01T00:00:00Z") +
                             "<trkpt lat='47' lon='15'/>" +
                             "<trkpt><time>2024-06-15T08:00:05Z</time></trkpt>" +
                             point("2024-06-15T08:01:00Z", 47.2)));
    EXPECT_EQ(toldPlaces(file),
              "place 47.0700 15.4400 'Grandma's'\nplace 47.0800 15.4500 'Flat' home\n"
              "place 47.0900 15.4600 'Tower' work\n2024-06-15T08:00:00Z 47.1000 15.0000\n"
              "2024-06-15T08:01:00Z 47.2000 15.0000\n");
    EXPECT_EQ(brokenCut(file), "");
    EXPECT_EQ(toldPlaces(tcx("<Activity Sport='Biking'><Lap><Track><Trackpoint><Time>2024-06-15T08:"
                             "00:00Z</Time><Position><LatitudeDegrees>47</LatitudeDegrees>"
                             "<LongitudeDegrees>15</LongitudeDegrees></Position></Trackpoint>"
                             "</Track></Lap></Activity>")),
              "2024-06-15T08:00:00Z 47.0000 15.0000\n");
}

TEST(TrackReader, ReadsOneWorkoutForEachTrackOfAGpxFile) {
    checkTracks({
        {"1.0 with a namespace and a prefix",
         "<?xml version='1.0'?><!-- <x> --><g:gpx version='1.0' "
         "xmlns:g='http://www.topografix.com/GPX/1/0'><g:trk><g:type>hiking</g:type><g:trkseg>"
         "<g:trkpt lat='1' lon='2'><g:time>2024-06-15T08:00:00Z</g:time></g:trkpt>"
         "<g:trkpt lat='1' lon='2'><g:time>2024-06-15T09:00:00Z</g:time></g:trkpt>"
         "</g:trkseg></g:trk></g:gpx>",
         kHike},
        {"two tracks, the second in two segments and out of order, type last",
         gpx(track("hike", kTwoPoints) + "<trk><trkseg>" + point("2024-06-15T12:00:00Z") +
             "</trkseg><trkseg>" + point("2024-06-15T11:00:00Z") + point("2024-06-15T11:00:00Z") +
             "</trkseg><type>Running</type></trk>"),
         kHike + "Running 2024-06-15T11:00:00Z 2024-06-15T12:00:00Z\n"},
        {"without a zone, which is UTC, and in pieces",
         gpx(track("hiking", point("2024-06-15T08:00:00") +
                                 point("\n2024-06-15<!-- -->T<![CDATA[09]]>:00:00Z "))),
         kHike},
        {"times of extensions, waypoints and routes are none of the track's",
         gpx("<wpt lat='1' lon='1'><time>2024-06-14T00:00:00Z</time></wpt><rte><rtept lat='1' "
             "lon='1'><time>2024-06-13T00:00:00Z</time></rtept></rte>" +
             track("hiking", kTwoPoints + "<trkpt lat='1' lon='1'><extensions><time>"
                                          "2024-06-16T00:00:00Z</time></extensions></trkpt>")),
         kHike},
        {"insane and unreadable times among sane ones",
         gpx(track("hiking", point("1970-01-01T00:00:00Z") + point("2099-01-01T00:00:00Z") +
                                 point("now") + kTwoPoints + "<trkpt lat='1' lon='1'/>")),
         kHike},
        {"no workout: no times, one time, no duration, 40 days, an empty file",
         gpx(track("hiking", "<trkpt lat='1' lon='1'/>") +
             track("hiking", point("2024-06-15T08:00:00Z")) +
             track("hiking", point("2024-06-15T08:00:00Z") + point("2024-06-15T08:00:00Z")) +
             track("hiking", point("2024-05-01T08:00:00Z") + point("2024-06-10T08:00:00Z"))),
         ""},
    });
    std::string wide("\xFF\xFE", 2);
    for (char c : "<?xml version='1.0' encoding='UTF-16'?>" + gpx(track("hiking", kTwoPoints))) {
        wide += c;
        wide += '\0';
    }
    checkTracks({{"UTF-16", wide, kHike}});
}

TEST(TrackReader, TellsTheZoneOfTimestampsThatNameOne) {
    checkTracks(
        {{"seven hours, in a taxi, then home and UTC",
          gpx(track("taxi",
                    point("2024-06-15T15:00:00+07:00") + point("2024-06-15T16:00:00+07:00") +
                        point("2024-06-15T11:30:00+02:00") + point("2024-06-15T10:00:00Z"))),
          "zone 25200 2024-06-15T08:00:00Z 2024-06-15T09:00:00Z\n"
          "zone 7200 2024-06-15T09:30:00Z 2024-06-15T09:30:00Z\n"}});
}

TEST(TrackReader, ReadsActivitiesOfATcxFile) {
    const std::string points =
        "<Lap StartTime='2024-06-12T16:00:00Z'><TotalTimeSeconds>600</TotalTimeSeconds><Track>"
        "<Trackpoint><Time>2024-06-12T16:00:02Z</Time></Trackpoint></Track><Track>"
        "<Trackpoint><Time>2024-06-12T16:30:00Z</Time></Trackpoint></Track></Lap>";
    const std::string laps =
        "<Lap StartTime='2024-06-12T16:00:00Z'><TotalTimeSeconds>600</TotalTimeSeconds></Lap>"
        "<Lap StartTime='2024-06-12T16:10:00Z'><TotalTimeSeconds>300.5</TotalTimeSeconds></Lap>";
    checkTracks({
        {"by its points", tcx("<Activity Sport='Running'>" + points + "</Activity>"),
         "Running 2024-06-12T16:00:02Z 2024-06-12T16:30:00Z\n"},
        {"by its laps, and without any speed",
         tcx("<Activity Sport='Other'>" + laps + "</Activity>"),
         "Other 2024-06-12T16:00:00Z 2024-06-12T16:15:00.500Z\n"},
        {"each sport of a triathlon",
         tcx("<MultiSportSession><FirstSport><Activity Sport='Biking'>" + points +
             "</Activity></FirstSport><NextSport><Activity Sport='Running'>" + laps +
             "</Activity></NextSport></MultiSportSession>"),
         "Cycling 2024-06-12T16:00:02Z 2024-06-12T16:30:00Z\n"
         "Running 2024-06-12T16:00:00Z 2024-06-12T16:15:00.500Z\n"},
        {"a course is none",
         "<TrainingCenterDatabase><Courses><Course>" + points +
             "</Course></Courses></TrainingCenterDatabase>",
         ""},
    });
}

/// A straight track of an hour with a point every ten seconds, at `speed` m/s, of which the first
/// `share` is spent moving.
std::string moving(double speed, double share = 1) {
    constexpr double kMetresPerDegree = 111195;
    std::string points;
    double metres = 0;
    for (int second = 0; second < 3600; second += 10) {
        points += point(fmt::format("2024-06-13T10:{:02}:{:02}Z", second / 60, second % 60),
                        40 + metres / kMetresPerDegree);
        if (second < 3600 * share) metres += speed * 10;
    }
    return points;
}

TEST(TrackReader, TellsTheActivityFromSpeedWhereNoTypeDoes) {
    const std::string span = " 2024-06-13T10:00:00Z 2024-06-13T10:59:50Z\n";
    checkTracks({
        {"walk", gpx("<trk><trkseg>" + moving(1.5) + "</trkseg></trk>"), "Walking" + span},
        {"a walk with rests", gpx(track("", moving(1.5, 0.3))), "Walking" + span},
        {"run", gpx(track("Other", moving(3))), "Running" + span},
        {"ride", gpx(track("Lieblingsrunde", moving(7))), "Cycling" + span},
        {"drive", gpx(track("", moving(20))), ""},
        {"a day at home with a walk", gpx(track("", moving(1.5, 0.1))), ""},
        {"the type outweighs the speed", gpx(track("hiking", moving(20))), "Hiking" + span},
        {"a walk, then the car",
         gpx(track("", moving(1.5, 0.8) + "</trkseg><trkseg>" + moving(30, 0.3))), ""},
    });
}

TEST(TrackReader, KnowsTheWordsForActivities) {
    const std::vector<std::pair<std::string_view, std::string_view>> words{
        {"Trail_Running", "Trail Running"},
        {"trail running", "Trail Running"},
        {"9", "Running"},
        {"mtb", "Mountain Biking"},
        {"Randonnée", "Hiking"},
        {"road-biking", "Cycling"},
        {"LAP_SWIMMING", "Swimming"},
        {"Stand-Up Paddling", "Stand-Up Paddling"},
    };
    for (const auto& [word, name] : words) {
        EXPECT_EQ(activityOfWord(word),
                  (ActivityWord{ActivityWord::Meaning::activity, activityCode(name).value()}))
            << word;
    }
    for (const auto* word : {"taxi", "In Vehicle", "Driving", "airplane", "BUS"}) {
        EXPECT_EQ(activityOfWord(word).meaning, ActivityWord::Meaning::transport) << word;
    }
    for (const auto* word : {"", "Other", "unknown", "T", "9000"}) {
        EXPECT_EQ(activityOfWord(word), ActivityWord{}) << word;
    }
}

}  // namespace
}  // namespace keepsakes
