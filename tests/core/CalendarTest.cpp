// SPDX-License-Identifier: Apache-2.0
#include "core/Calendar.h"

#include <gtest/gtest.h>
#include <unicode/locid.h>
#include <unicode/timezone.h>

#include <cmath>
#include <memory>

namespace keepsakes {
namespace {

/// The owner's zone and locale while a test runs.
class CalendarTest : public testing::Test {
  public:
    CalendarTest()
        : zoneBefore_(icu::TimeZone::createDefault()), localeBefore_(icu::Locale::getDefault()) {
        UErrorCode status = U_ZERO_ERROR;
        icu::Locale::setDefault(icu::Locale::getUS(), status);
        setZone("Europe/Vienna");
    }
    ~CalendarTest() override {
        icu::TimeZone::adoptDefault(zoneBefore_.release());
        UErrorCode status = U_ZERO_ERROR;
        icu::Locale::setDefault(localeBefore_, status);
    }
    CalendarTest(const CalendarTest&) = delete;
    CalendarTest& operator=(const CalendarTest&) = delete;

  protected:
    static void setZone(const char* name) {
        icu::TimeZone::adoptDefault(icu::TimeZone::createTimeZone(name));
    }

  private:
    std::unique_ptr<icu::TimeZone> zoneBefore_;
    icu::Locale localeBefore_;
};

KSDate at(const char* text) {
    const auto read = parseISO8601(text);
    if (!read) ADD_FAILURE() << "not a date: " << text;
    return read ? read->date : KSDate{};
}

TEST_F(CalendarTest, ADayBeginsWhereItsZoneSays) {
    struct Case {
        const char* zone;
        const char* instant;
        const char* start;
    };
    const Case cases[] = {
        {"Europe/Vienna", "2024-06-15T10:02:03+02:00", "2024-06-14T22:00:00Z"},
        {"Europe/Vienna", "2024-06-15T00:00:00+02:00", "2024-06-14T22:00:00Z"},
        // 23 hours long: after the change, midnight still has the old offset.
        {"Europe/Vienna", "2024-03-31T12:00:00+02:00", "2024-03-30T23:00:00Z"},
        {"Europe/Vienna", "2024-04-01T12:00:00+02:00", "2024-03-31T22:00:00Z"},
        // 25 hours long, asked in both turns of the repeated hour.
        {"Europe/Vienna", "2024-10-27T02:30:00+02:00", "2024-10-26T22:00:00Z"},
        {"Europe/Vienna", "2024-10-27T02:30:00+01:00", "2024-10-26T22:00:00Z"},
        {"Europe/Vienna", "2024-10-27T23:59:59+01:00", "2024-10-26T22:00:00Z"},
        // Midnight is skipped: the day begins at one.
        {"America/Sao_Paulo", "2018-11-04T12:00:00-02:00", "2018-11-04T03:00:00Z"},
        {"America/Sao_Paulo", "2018-11-04T01:00:00-02:00", "2018-11-04T03:00:00Z"},
        {"America/Sao_Paulo", "2018-11-03T23:59:59-03:00", "2018-11-03T03:00:00Z"},
        // The hour before midnight comes twice; both belong to the day that began before.
        {"America/Sao_Paulo", "2018-02-17T23:30:00-03:00", "2018-02-17T02:00:00Z"},
        {"America/Sao_Paulo", "2018-02-18T00:30:00-03:00", "2018-02-18T03:00:00Z"},
        {"Asia/Kathmandu", "2024-06-15T00:10:00+05:45", "2024-06-14T18:15:00Z"},
        {"Pacific/Kiritimati", "2024-06-15T10:00:00Z", "2024-06-15T10:00:00Z"},
    };
    for (const auto& [zone, instant, start] : cases) {
        setZone(zone);
        EXPECT_EQ(formatISO8601(calendar::startOfDay(at(instant))), start)
            << zone << ' ' << instant;
        EXPECT_EQ(formatISO8601(calendar::startOfDay(at(start))), start) << zone << ' ' << instant;
    }
    for (const double seconds : {INFINITY, -INFINITY}) {
        EXPECT_EQ(calendar::startOfDay({seconds}).seconds, seconds);
    }
    EXPECT_TRUE(std::isnan(calendar::startOfDay({NAN}).seconds));
}

TEST_F(CalendarTest, LocalTimesThatComeTwiceOrNeverHaveOneInstant) {
    struct Case {
        const char* zone;
        const char* local;
        const char* instant;
    };
    const Case cases[] = {
        {"Europe/Vienna", "2024-06-15T10:02:03", "2024-06-15T08:02:03Z"},
        {"Europe/Vienna", "2024-03-31T01:59:59", "2024-03-31T00:59:59Z"},
        {"Europe/Vienna", "2024-03-31T02:30:00", "2024-03-31T01:30:00Z"},
        {"Europe/Vienna", "2024-03-31T03:00:00", "2024-03-31T01:00:00Z"},
        {"Europe/Vienna", "2024-10-27T02:30:00", "2024-10-27T00:30:00Z"},
        {"Europe/Vienna", "2024-10-27T03:00:00", "2024-10-27T02:00:00Z"},
        {"America/Sao_Paulo", "2018-11-04T00:30:00", "2018-11-04T03:30:00Z"},
        {"America/Sao_Paulo", "2018-02-17T23:30:00", "2018-02-18T01:30:00Z"},
        {"Australia/Lord_Howe", "2024-10-06T02:15:00", "2024-10-05T15:45:00Z"},
    };
    for (const auto& [zone, local, instant] : cases) {
        setZone(zone);
        EXPECT_EQ(formatISO8601(calendar::fromLocal(at(local))), instant) << zone << ' ' << local;
    }
    setZone("Europe/Vienna");
    EXPECT_EQ(calendar::offsetAt(at("2024-03-31T00:59:59Z")), 3600);
    EXPECT_EQ(calendar::offsetAt(at("2024-03-31T01:00:00Z")), 7200);
}

TEST_F(CalendarTest, WholeDaysReachFromMidnightToMidnight) {
    const struct {
        const char* start;
        const char* end;
        bool whole;
    } cases[] = {
        {"2024-06-15T00:00:00+02:00", "2024-06-16T00:00:00+02:00", true},
        {"2024-06-15T00:00:00+02:00", "2024-06-15T23:59:59+02:00", true},
        {"2024-03-31T00:00:00+01:00", "2024-04-01T00:00:00+02:00", true},
        {"2024-06-15T00:00:00+02:00", "2024-06-15T23:59:00+02:00", false},
        {"2024-06-15T02:00:00+02:00", "2024-06-16T02:00:00+02:00", false},
        {"2024-06-15T00:00:00+02:00", "2024-06-15T00:00:00+02:00", false},
    };
    for (const auto& [start, end, whole] : cases) {
        EXPECT_EQ(calendar::isWholeDays({at(start), at(end)}), whole) << start << ' ' << end;
    }
}

TEST_F(CalendarTest, DaysByNumberExistAsTheCalendarSays) {
    struct Case {
        const char* zone;
        int year, month, day;
        const char* start;  // null: no such day
    };
    const Case cases[] = {
        {"Europe/Vienna", 1990, 5, 1, "1990-04-30T22:00:00Z"},
        {"Europe/Vienna", 2024, 2, 29, "2024-02-28T23:00:00Z"},
        {"Europe/Vienna", 2023, 2, 29, nullptr},
        {"Europe/Vienna", 1900, 2, 29, nullptr},
        {"Europe/Vienna", 2024, 0, 1, nullptr},
        {"Europe/Vienna", 2024, 13, 1, nullptr},
        {"Europe/Vienna", 2024, 4, 31, nullptr},
        {"Europe/Vienna", 2024, 4, 0, nullptr},
        {"America/Sao_Paulo", 2018, 11, 4, "2018-11-04T03:00:00Z"},
    };
    for (const auto& [zone, year, month, day, start] : cases) {
        setZone(zone);
        const auto found = calendar::dateOfDay(year, month, day);
        ASSERT_EQ(found.has_value(), start != nullptr)
            << zone << year << '-' << month << '-' << day;
        if (found) {
            EXPECT_EQ(formatISO8601(*found), start);
        }
    }
}

TEST_F(CalendarTest, CountsBirthdaysAndNamesTimesAsTheOwnerDoes) {
    const auto born = *calendar::dateOfDay(1990, 5, 1);
    EXPECT_EQ(calendar::yearsBetween(born, at("2024-04-30T23:59:59+02:00")), 33);
    EXPECT_EQ(calendar::yearsBetween(born, at("2024-05-01T00:00:00+02:00")), 34);
    const auto leapling = *calendar::dateOfDay(2000, 2, 29);
    EXPECT_EQ(calendar::yearsBetween(leapling, at("2023-02-28T12:00:00+01:00")), 23);
    EXPECT_EQ(calendar::yearsBetween(leapling, at("2023-02-27T12:00:00+01:00")), 22);
    EXPECT_EQ(calendar::yearsBetween(born, {NAN}), 0);

    const auto morning = at("2024-06-15T10:02:03+02:00");
    EXPECT_EQ(calendar::hours(morning), 10);
    EXPECT_EQ(calendar::minutes(morning), 2);
    // The locale's data put a narrow no-break space (U+202F) before AM since 2022.
    EXPECT_EQ(calendar::fullDateLongTime(morning),
              "Saturday, June 15, 2024 at 10:02:03\u202fAM GMT+2");
    EXPECT_EQ(calendar::shortDateLongTime(morning), "6/15/24, 10:02:03\u202fAM GMT+2");
    EXPECT_EQ(calendar::format(morning, "EEEE HH:mm"), "Saturday 10:02");
    EXPECT_EQ(calendar::format({INFINITY}, "HH"), "invalid");
}

}  // namespace
}  // namespace keepsakes
