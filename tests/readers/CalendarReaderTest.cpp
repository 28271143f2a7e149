// SPDX-License-Identifier: Apache-2.0
#include "readers/CalendarReader.h"

#include <gmock/gmock.h>

#include <algorithm>

#include "CalendarText.h"
#include "readers/ReaderLimits.h"

namespace keepsakes {
namespace {

using testing::HasSubstr;
using testing::StartsWith;

class CalendarReader : public testing::Test {
  protected:
    static void SetUpTestSuite() {
        ::setenv("TZ", "Europe/Vienna", 1);  // NOLINT(concurrency-mt-unsafe): one thread
    }
};

std::string toldEntry(const std::string& lines) {
    return occurrencesIn(calendarOf(entryOf(lines)));
}

std::size_t countOf(const std::string& text) {
    return static_cast<std::size_t>(std::ranges::count(text, '\n'));
}

constexpr const char* kOddZone =
    "BEGIN:VTIMEZONE\r\nTZID:Home\r\nBEGIN:STANDARD\r\nDTSTART:20001029T030000\r\n"
    "RRULE:FREQ=YEARLY;BYDAY=-1SU;BYMONTH=10\r\nTZOFFSETFROM:+0430\r\nTZOFFSETTO:+0330\r\n"
    "END:STANDARD\r\nBEGIN:DAYLIGHT\r\nDTSTART:20000326T020000\r\n"
    "RRULE:FREQ=YEARLY;BYDAY=-1SU;BYMONTH=3\r\nTZOFFSETFROM:+0330\r\nTZOFFSETTO:+0430\r\n"
    "END:DAYLIGHT\r\nEND:VTIMEZONE\r\n";

TEST_F(CalendarReader, KnowsTheZonesOfTimes) {
    const std::vector<std::tuple<std::string, std::string, std::string>> cases{
        {"UTC", "", "2024-06-10T10:00:00Z"},
        {"a place", "Europe/Lisbon", "2024-06-10T09:00:00Z"},
        {"behind a prefix", "/x.org/2020/Europe/Vienna", "2024-06-10T08:00:00Z"},
        {"quoted, by Windows", "\"W. Europe Standard Time\"", "2024-06-10T08:00:00Z"},
        {"defined by the file", "Home", "2024-06-10T05:30:00Z"},
        {"an offset", "\"UTC-3:30\"", "2024-06-10T13:30:00Z"},
        {"nobody knows: the owner's", "Sea of Tranquility", "2024-06-10T08:00:00Z"},
    };
    for (const auto& [what, zone, expected] : cases) {
        const auto start = zone.empty() ? "DTSTART:20240610T100000Z\r\n"
                                        : "DTSTART;TZID=" + zone + ":20240610T100000\r\n";
        EXPECT_EQ(occurrencesIn(calendarOf(entryOf(start + "SUMMARY:a\r\n") + kOddZone)),
                  fmt::format("u {0}..{0} a\n", expected))
            << what;
    }
    EXPECT_EQ(occurrencesIn(calendarOf(
                  "BEGIN:VTIMEZONE\r\nTZID:Odd\r\nBEGIN:STANDARD\r\nDTSTART:20000101T000000\r\n"
                  "RRULE:FREQ=SECONDLY;BYMONTH=2;BYMONTHDAY=30\r\nTZOFFSETFROM:+0100\r\n"
                  "TZOFFSETTO:+0100\r\nEND:STANDARD\r\nEND:VTIMEZONE\r\n" +
                  entryOf("DTSTART;TZID=Odd:20240610T100000\r\n"))),
              "u 2024-06-10T08:00:00Z..2024-06-10T08:00:00Z \n")
        << "a zone that changes each second";
}

TEST_F(CalendarReader, KnowsWhenEntriesEnd) {
    const std::vector<std::tuple<std::string, std::string, std::string>> cases{
        {"floating", "DTSTART:20240610T100000\r\nDTEND:20240610T113000\r\n",
         "2024-06-10T08:00:00Z..2024-06-10T09:30:00Z"},
        {"over zones",
         "DTSTART;TZID=Europe/Helsinki:20170920T150500\r\n"
         "DTEND;TZID=Europe/Berlin:20170920T160000\r\n",
         "2017-09-20T12:05:00Z..2017-09-20T14:00:00Z"},
        {"a day of 23 hours", "DTSTART;VALUE=DATE:20240331\r\n",
         "2024-03-30T23:00:00Z..2024-03-31T22:00:00Z day"},
        {"two days", "DTSTART;VALUE=DATE:20240610\r\nDTEND;VALUE=DATE:20240612\r\n",
         "2024-06-09T22:00:00Z..2024-06-11T22:00:00Z day"},
        {"a day that ends as it begins",
         "DTSTART;VALUE=DATE:20240610\r\nDTEND;VALUE=DATE:20240610\r\n",
         "2024-06-09T22:00:00Z..2024-06-10T22:00:00Z day"},
        {"a duration", "DTSTART:20240330T220000Z\r\nDURATION:P1DT2H\r\n",
         "2024-03-30T22:00:00Z..2024-04-01T00:00:00Z"},
        {"an end before the start", "DTSTART:20240610T100000Z\r\nDTEND:20240610T090000Z\r\n",
         "2024-06-10T10:00:00Z..2024-06-10T10:00:00Z"},
    };
    for (const auto& [what, lines, expected] : cases) {
        EXPECT_EQ(toldEntry(lines), "u " + expected + " \n") << what;
    }
}

TEST_F(CalendarReader, FollowsRecurrences) {
    const std::string weekly =
        "SUMMARY:a\r\nDTSTART;TZID=Europe/Vienna:20240318T180000\r\nDURATION:PT1H\r\n"
        "RRULE:FREQ=WEEKLY;COUNT=3\r\n";
    const std::string first = "u/20240318T170000Z 2024-03-18T17:00:00Z..2024-03-18T18:00:00Z a\n";
    const std::string second = "u/20240325T170000Z 2024-03-25T17:00:00Z..2024-03-25T18:00:00Z a\n";
    // Six o'clock is an hour earlier in summer.
    const std::string third = "u/20240401T160000Z 2024-04-01T16:00:00Z..2024-04-01T17:00:00Z a\n";
    EXPECT_EQ(toldEntry(weekly), first + second + third);
    EXPECT_EQ(
        toldEntry("SUMMARY:a\r\nDTSTART;TZID=Europe/Vienna:20240318T180000\r\nDURATION:PT1H\r\n"
                  "RRULE:FREQ=WEEKLY;UNTIL=20240325T170000Z\r\n"),
        first + second)
        << "until the instant of the last";
    EXPECT_EQ(toldEntry(weekly + "EXDATE;TZID=Europe/Vienna:20240325T180000\r\n"), first + third);
    EXPECT_EQ(toldEntry(weekly + "EXDATE;VALUE=DATE:20240318,20240325\r\n"), third);
    EXPECT_EQ(toldEntry(weekly + "RDATE;VALUE=PERIOD:20240402T100000Z/PT2H\r\n"),
              first + second + third +
                  "u/20240402T100000Z 2024-04-02T10:00:00Z..2024-04-02T12:00:00Z a\n");
    const auto with = [&](const std::string& lines) {
        // The override comes before what it overrides.
        return occurrencesIn(calendarOf(entryOf(lines) + entryOf(weekly)));
    };
    EXPECT_EQ(with("RECURRENCE-ID:20240325T170000Z\r\nSUMMARY:b\r\nDTSTART:20240326T080000Z\r\n"),
              first + third + "u/20240325T170000Z 2024-03-26T08:00:00Z..2024-03-26T08:00:00Z b\n");
    EXPECT_EQ(with("RECURRENCE-ID:20240325T170000Z\r\nSTATUS:CANCELLED\r\n"
                   "DTSTART:20240325T170000Z\r\n"),
              first + third);
    EXPECT_EQ(with("RECURRENCE-ID;RANGE=THISANDFUTURE:20240325T170000Z\r\nSUMMARY:b\r\n"
                   "DTSTART:20240325T190000Z\r\n"),
              first + "u/20240325T170000Z 2024-03-25T19:00:00Z..2024-03-25T19:00:00Z b\n" +
                  "u/20240401T160000Z 2024-04-01T18:00:00Z..2024-04-01T18:00:00Z b\n");
    EXPECT_EQ(toldEntry("DTSTART;VALUE=DATE:19900615\r\nRRULE:FREQ=YEARLY\r\nSUMMARY:a\r\n"),
              "u/20220615 2022-06-14T22:00:00Z..2022-06-15T22:00:00Z day a\n"
              "u/20230615 2023-06-14T22:00:00Z..2023-06-15T22:00:00Z day a\n"
              "u/20240615 2024-06-14T22:00:00Z..2024-06-15T22:00:00Z day a\n"
              "u/20250615 2025-06-14T22:00:00Z..2025-06-15T22:00:00Z day a\n");
}

TEST_F(CalendarReader, BoundsWhatRecursForAges) {
    // Two years and more back, one and more ahead.
    EXPECT_EQ(countOf(toldEntry("DTSTART:10240101T100000Z\r\nRRULE:FREQ=DAILY\r\n")), 1200u);
    EXPECT_EQ(countOf(toldEntry("DTSTART:17240101T100000Z\r\nRRULE:FREQ=DAILY;COUNT=109630\r\n")),
              690u)
        << "it ends on 2024-02-26";
    for (const auto* rule :
         {"FREQ=SECONDLY", "FREQ=MINUTELY;BYMONTH=2;BYMONTHDAY=30", "FREQ=HOURLY"}) {
        EXPECT_EQ(toldEntry(std::string("DTSTART:20240610T100000Z\r\nRRULE:") + rule + "\r\n"),
                  "u/20240610T100000Z 2024-06-10T10:00:00Z..2024-06-10T10:00:00Z \n"
                  "! left out: a rule by the hour or more often (1)\n");
    }
    for (const auto* rule : {"FREQ=YEARLY;BYMONTH=2;BYMONTHDAY=30", "FREQ=DAILY;INTERVAL=0",
                             "FREQ=WEEKLY;COUNT=-1", "nonsense"}) {
        EXPECT_THAT(toldEntry(std::string("DTSTART:20240610T100000Z\r\nRRULE:") + rule + "\r\n"),
                    StartsWith("u/20240610T100000Z"))
            << rule;
    }
    std::string many;
    for (int i = 0; i < 84; ++i) {
        many += fmt::format(
            "BEGIN:VEVENT\r\nUID:{}\r\nDTSTART:20200610T100000Z\r\nRRULE:FREQ=DAILY\r\n"
            "END:VEVENT\r\n",
            i);
    }
    const auto text = occurrencesIn(calendarOf(many + entryOf("DTSTART:20240610T100000Z\r\n")));
    EXPECT_THAT(text, HasSubstr("\nu 2024-06-10T10")) << "what happens once is kept";
    EXPECT_THAT(text,
                HasSubstr("! left out: an occurrence beyond those that a file may have (800)"));
}

TEST_F(CalendarReader, LeavesOutWhatIsCancelledOrSaidAnew) {
    const std::string start = "DTSTART:20240610T100000Z\r\n";
    EXPECT_EQ(toldEntry(start + "STATUS:CANCELLED\r\n"), "");
    EXPECT_EQ(occurrencesIn(calendarOf("METHOD:CANCEL\r\n" + entryOf(start))), "");
    EXPECT_EQ(occurrencesIn(calendarOf(entryOf(start + "SEQUENCE:2\r\nSUMMARY:new\r\n") +
                                       entryOf(start + "SEQUENCE:1\r\nSUMMARY:old\r\n"))),
              "u 2024-06-10T10:00:00Z..2024-06-10T10:00:00Z new\n");
    EXPECT_EQ(toldEntry("SUMMARY:a\r\n"), "! left out: no start that can be read (1)\n");
    EXPECT_EQ(toldEntry("DTSTART:99990610T100000Z\r\n"),
              "! left out: a date that is not believed (1)\n");
    EXPECT_THAT(toldEntry("DTSTART:20241399T990000Z\r\n"), HasSubstr("no start"));
}

TEST_F(CalendarReader, ReadsWhatIsOddAndRefusesWhatIsCut) {
    const auto good = calendarOf(entryOf("DTSTART:20240610T100000Z\r\nSUMMARY:a\\, \r\n b\r\n"));
    const std::string expected = "u 2024-06-10T10:00:00Z..2024-06-10T10:00:00Z a, b\n";
    EXPECT_EQ(occurrencesIn(good), expected);
    EXPECT_EQ(occurrencesIn("\xEF\xBB\xBF" + good + good).find("error"), std::string::npos);
    EXPECT_EQ(toldEntry("a broken line\r\nBEGIN:VALARM\r\nSUMMARY:no\r\nEND:VALARM\r\n"
                        "DTSTART:20240610T100000Z\r\nSUMMARY:a\\, b\r\n"),
              expected);
    EXPECT_THAT(occurrencesIn("BEGIN:VCALENDAR\r\nEND:VEVENT\r\n"), StartsWith("error: "));
    for (std::size_t length = 0; length + 2 < good.size(); ++length) {
        EXPECT_THAT(occurrencesIn(good.substr(0, length)), StartsWith("error: ")) << length;
    }
}

TEST_F(CalendarReader, KeepsAnEntryOfAnyLengthSmall) {
    std::string attachment = "ATTACH;ENCODING=BASE64;VALUE=BINARY:";
    for (int i = 0; i < 20000; ++i) attachment += std::string(75, 'A') + "\r\n ";
    const auto read = readCalendar(
        inPieces(calendarOf(entryOf(attachment + "\r\nDTSTART:20240610T100000Z\r\nSUMMARY:" +
                                    std::string(100000, 'x') + "\r\n")),
                 65536),
        kCalendarContext);
    ASSERT_TRUE(read) << read.error();
    ASSERT_EQ(read->occurrences.size(), 1u);
    EXPECT_EQ(read->occurrences[0].title.size(), limits::kLongestName);
}

}  // namespace
}  // namespace keepsakes
