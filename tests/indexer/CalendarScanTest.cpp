// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>
#include <fmt/ranges.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>

#include "ScanOnce.h"
#include "devicedata/IndexedCalendarService.h"
#include "devicedata/IndexedProfileEventStore.h"
#include "indexer/ContentReader.h"
#include "indexer/TripRule.h"
#include "support/TemporaryFolder.h"

namespace keepsakes {
namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::IsEmpty;
using enum SuggestionCategory;

KSDate at(const std::string& text) { return parseISO8601(text)->date; }

class OwnerInVienna : public testing::Test {
  protected:
    static void SetUpTestSuite() {
        ::setenv("TZ", "Europe/Vienna", 1);  // NOLINT(concurrency-mt-unsafe): one thread
    }
};

JourneyLeg leg(const std::string& start, const std::string& end, SuggestionCategory category,
               const std::string& from, const std::string& to) {
    return {.identifier = start.substr(6),
            .span = {at("2024-" + start + ":00Z"), at("2024-" + end + ":00Z")},
            .category = category,
            .origin = from,
            .destination = to};
}

/// Each trip as "<title>: <identifiers, parts apart by |>".
std::vector<std::string> trips(std::vector<JourneyLeg> legs) {
    std::vector<std::string> told;
    for (const auto& trip : tripsOf(std::move(legs))) {
        std::vector<std::string> parts;
        for (const auto& part : trip.tripParts) {
            parts.push_back(fmt::format("{}", fmt::join(part.eventIdentifiers, " ")));
        }
        told.push_back(fmt::format("{}: {}", *trip.title, fmt::join(parts, "|")));
    }
    return told;
}

using TripRule = OwnerInVienna;

TEST_F(TripRule, FollowsAJourneyFromLeavingToComingBack) {
    const auto out = leg("05-03T06:00", "05-03T08:00", flight, "Graz", "Frankfurt");
    const auto on = leg("05-03T09:30", "05-03T12:00", flight, "Frankfurt", "Lisbon");
    const auto stay = leg("05-03T14:00", "05-07T10:00", lodging, "", "Lisbon");
    const auto back = leg("05-07T13:00", "05-07T18:00", flight, "Lisbon", "Graz");
    EXPECT_THAT(trips({back, stay, on, out}),
                ElementsAre("Lisbon, 3 to 7 May: 06:00 09:30|14:00|13:00"));
    EXPECT_THAT(trips({out, on, back}), ElementsAre("Lisbon, 3 to 7 May: "
                                                    "06:00 09:30|13:00"));
    // What begins after coming home is another journey, however soon.
    const auto again = leg("05-08T06:00", "05-08T07:00", train, "Graz", "Wien");
    const auto home = leg("05-08T17:00", "05-08T19:00", train, "Wien", "Graz");
    EXPECT_THAT(
        trips({out, on, stay, back, again, home}),
        ElementsAre("Lisbon, 3 to 7 May: 06:00 09:30|14:00|13:00", "Wien, 8 May: 06:00|17:00"));
    const auto porto = leg("05-07T14:00", "05-09T10:00", lodging, "", "Porto");
    EXPECT_THAT(trips({stay, porto}), ElementsAre("Lisbon and Porto, 3 to 9 May: 14:00|14:00"));
}

TEST_F(TripRule, NeedsMoreThanALeg) {
    const auto out = leg("05-03T06:00", "05-03T08:00", train, "Graz", "Wien");
    EXPECT_THAT(trips({}), IsEmpty());
    EXPECT_THAT(trips({out}), IsEmpty());
    EXPECT_THAT(trips({out, leg("05-03T09:00", "05-03T11:00", train, "Wien", "Brno")}), IsEmpty())
        << "one way with a change";
    EXPECT_THAT(trips({out, leg("05-20T09:00", "05-20T11:00", train, "Linz", "Salzburg")}),
                IsEmpty())
        << "two ways with nothing to do with each other";
    EXPECT_THAT(trips({out, leg("05-20T09:00", "05-20T11:00", train, "WIEN", "Graz")}),
                ElementsAre("Wien, 3 to 20 May: 06:00|09:00"));
}

TEST_F(TripRule, TitlesReadAsPeopleSayThem) {
    auto stay = leg("04-28T14:00", "05-02T10:00", lodging, "", "Lisbon");
    auto second = leg("05-02T14:00", "05-03T22:00", lodging, "", "");
    EXPECT_THAT(trips({stay, second}), ElementsAre("Lisbon, 28 April to 3 May: 14:00|14:00"))
        << "checked out by midnight";
    stay.destination.clear();
    stay.span.start = at("2023-12-30T14:00:00Z");
    EXPECT_THAT(trips({stay, second}),
                ElementsAre("Away, 30 December 2023 to 3 May 2024: 14:00|14:00"));
}

class CalendarScan : public OwnerInVienna {
  protected:
    ScanOutcome scan(KSDate now = kNow) {
        return scanOnce({.index = index_,
                         .tracks = {},
                         .photos = {},
                         .calendars = {folder_.path()},
                         .now = now},
                        reader_);
    }

    /// Replaces the file as calendar programs do: under another name first.
    void write(const std::string& name, const std::string& entries) {
        const auto path = folder_ / name;
        fs::create_directories(path.parent_path());
        const auto beside = path.string() + ".part";
        std::ofstream(beside) << "BEGIN:VCALENDAR\r\n" << entries << "END:VCALENDAR\r\n";
        fs::rename(beside, path);
    }

    static std::string entry(const std::string& uid, const std::string& title,
                             const std::string& lines) {
        return fmt::format("BEGIN:VEVENT\r\nUID:{}\r\nSUMMARY:{}\r\n{}END:VEVENT\r\n", uid, title,
                           lines);
    }

    std::vector<std::string> suggestions(const std::string& from, const std::string& to) {
        std::vector<std::string> told;
        const auto error = IndexedProfileEventStore(index_).iterateScoredEvents(
            SuggestedEventQuery{at(from), at(to)}, [&told](const SuggestedEvent& one) {
                told.push_back(fmt::format("{} {} {}", *one.eventIdentifier,
                                           static_cast<int>(one.category), *one.title));
                return true;
            });
        EXPECT_FALSE(error);
        return told;
    }

    std::vector<Trip> allTrips() {
        std::vector<Trip> found;
        const auto error = IndexedProfileEventStore(index_).iterateScoredEvents(
            TripEventQuery{KSDate::distantPast(), KSDate::distantFuture()},
            [&found](const Trip& trip) {
                found.push_back(trip);
                return true;
            });
        EXPECT_FALSE(error);
        return found;
    }

    TemporaryFolder folder_;
    TemporaryFolder cache_;
    const fs::path index_ = cache_ / "deviceData.sqlite";
    ContentReader reader_;
};

TEST_F(CalendarScan, FollowsAFileThatIsReplaced) {
    const std::string evening = "DTSTART:20240614T180000Z\r\nDTEND:20240614T210000Z\r\n";
    write("private/a.ics", entry("a", "Kino: Der dritte Mann", evening + "LOCATION:Graz\r\n"));
    write("work/b.ics", entry("b", "Team meeting", evening));
    // A copy in another calendar is the same entry.
    write("work/c.ics", entry("a", "Kino: Der dritte Mann", evening + "LOCATION:Graz\r\n"));
    EXPECT_THAT(scan().problems, IsEmpty());
    const std::string day = "2024-06-14T00:00:00Z";
    const std::string next = "2024-06-15T00:00:00Z";
    EXPECT_THAT(suggestions(day, next), ElementsAre("a 9 Kino: Der dritte Mann"));
    EXPECT_THAT(suggestions(next, "2024-06-16T00:00:00Z"), IsEmpty());
    EXPECT_FALSE(scan().summary.changed);

    const auto store = IndexedCalendarService(index_).openStore(kCalendarStoreLookUpOnly);
    const auto found = store->eventWithIdentifier("a");
    ASSERT_TRUE(found && *found);
    EXPECT_EQ((*found)->location, "Graz");
    const auto meeting = store->eventWithIdentifier("b");
    ASSERT_TRUE(meeting && *meeting);
    EXPECT_EQ((*meeting)->calendar, "work");
    EXPECT_FALSE(store->eventWithIdentifier("z")->has_value());

    write("private/a.ics", entry("a", "Concert: Die Drei", evening));
    fs::remove(folder_ / "work/c.ics");
    scan();
    EXPECT_THAT(suggestions(day, next), ElementsAre("a 8 Concert: Die Drei"));
    fs::remove(folder_ / "private/a.ics");
    scan();
    EXPECT_THAT(suggestions(day, next), IsEmpty());
}

TEST_F(CalendarScan, PutsTripsTogetherOverFiles) {
    write("a/out.ics", entry("out", "Flight TP 583 from GRZ to LIS",
                             "DTSTART:20240503T060000Z\r\nDTEND:20240503T100000Z\r\n"));
    write("b/stay.ics", entry("stay", "Hotel Tejo",
                              "DTSTART;VALUE=DATE:20240503\r\nDTEND;VALUE=DATE:20240507\r\n"
                              "LOCATION:Rua 1\\, 1100-001 Lisbon\\, Portugal\r\n"));
    write("a/back.ics", entry("back", "Flight TP 584 from LIS to GRZ",
                              "DTSTART:20240507T160000Z\r\nDTEND:20240507T200000Z\r\n"));
    // The way to work is none.
    write("a/work.ics", entry("work", "Zug nach Wien",
                              "DTSTART:20240502T060000Z\r\nRRULE:FREQ=DAILY;COUNT=9\r\n"));
    scan();
    const auto found = allTrips();
    ASSERT_EQ(found.size(), 1u);
    EXPECT_EQ(found[0].title, "Lisbon, 3 to 7 May");
    EXPECT_EQ(found[0].tripParts.size(), 3u);
    EXPECT_EQ(found[0].tripParts.back().eventIdentifiers, std::vector<std::string>{"back"});
    fs::remove(folder_ / "a/out.ics");
    write("b/stay.ics",
          entry("stay", "Hotel Tejo",
                "DTSTART;VALUE=DATE:20240503\r\nDTEND;VALUE=DATE:20240507\r\n"
                "X-R:[{\"@context\":\"http://schema.org\"\\,\"@type\":\"LodgingReservation\"\\,"
                "\"checkinTime\":\"2024-05-03T17:00:00Z\"\\,"
                "\"checkoutTime\":\"2024-05-07T09:00:00Z\"}]\r\n"));
    scan();
    ASSERT_EQ(allTrips().size(), 1u);
    EXPECT_EQ(allTrips()[0].startDate, at("2024-05-03T17:00:00Z")) << "when the owner checks in";
    fs::remove(folder_ / "b/stay.ics");
    fs::remove(folder_ / "a/back.ics");
    scan();
    EXPECT_THAT(allTrips(), IsEmpty());
}

TEST_F(CalendarScan, FollowsRecurrencesAgainWhenTheirTimeIsUsedUp) {
    write("a.ics",
          entry("a", "Annas Geburtstag", "DTSTART;VALUE=DATE:19900614\r\nRRULE:FREQ=YEARLY\r\n"));
    scan();
    const auto in2030 = [this] {
        return suggestions("2030-01-01T00:00:00Z", "2030-12-31T00:00:00Z");
    };
    EXPECT_THAT(in2030(), IsEmpty());
    EXPECT_EQ(scan(kNow + 300 * 86400.0).summary.read, 0u);
    EXPECT_EQ(scan(at("2030-06-15T12:00:00Z")).summary.read, 1u);
    EXPECT_THAT(in2030(), ElementsAre("a/20300614 12 Annas Geburtstag"));
    EXPECT_EQ(scan(at("2030-06-15T12:00:00Z")).summary.read, 0u);
    EXPECT_EQ(scan().summary.read, 1u) << "the clock was set back";
}

TEST_F(CalendarScan, TellsWhatItLeavesOut) {
    write("a.ics", entry("a", "Party", "DTSTART:20240614T180000Z\r\nRRULE:FREQ=SECONDLY\r\n"));
    std::ofstream(folder_ / "b.ics") << "BEGIN:VCALENDAR\r\nBEGIN:VEVENT\r\n";
    const auto reporter = scan();
    ASSERT_EQ(reporter.problems.size(), 2u);
    EXPECT_EQ(reporter.summary.totals.refused, 1u);
    EXPECT_THAT(reporter.problems[0], testing::EndsWith("b.ics: it ends within a calendar"));
    EXPECT_THAT(reporter.problems[1], testing::EndsWith("a rule by the hour or more often (1)"));
}

}  // namespace
}  // namespace keepsakes
