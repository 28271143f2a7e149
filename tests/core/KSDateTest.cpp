// SPDX-License-Identifier: Apache-2.0
#include "core/KSDate.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <optional>
#include <random>
#include <set>

#include "core/KSUUID.h"

namespace keepsakes {
namespace {

TEST(KSDate, ReadsISO8601AndItsUsualShortenings) {
    struct Case {
        const char* text;
        double unixSeconds;
        std::optional<int> offset;
    };
    const Case cases[] = {
        {"2001-01-01T00:00:00Z", 978307200, 0},
        {"2024-06-15T10:02:03+02:00", 1718438523, 7200},
        {"2024-06-15T10:02:03+0200", 1718438523, 7200},
        {"2024-06-15T10:02:03+02", 1718438523, 7200},
        {"2024-06-15 10:02:03-03:30", 1718458323, -12600},
        {"2024-06-15t10:02:03z", 1718445723, 0},
        {"2024-06-15T10:02:03.25Z", 1718445723.25, 0},
        {"2024-06-15T10:02:03,5Z", 1718445723.5, 0},
        {"2024-06-15T10:02", 1718445720, std::nullopt},
        {"2024-06-15", 1718409600, std::nullopt},
        {"2024-06-15T24:00:00Z", 1718496000, 0},
        {"2016-12-31T23:59:60Z", 1483228800, 0},
        {"1969-12-31T23:59:59.5Z", -0.5, 0},
        {"2000-02-29", 951782400, std::nullopt},
    };
    for (const auto& [text, unixSeconds, offset] : cases) {
        const auto read = parseISO8601(text);
        ASSERT_TRUE(read) << text;
        EXPECT_NEAR(read->date.unixSeconds(), unixSeconds, 1e-6) << text;
        EXPECT_EQ(read->offsetSeconds, offset) << text;
    }
    for (const char* text : {"",
                             "2024",
                             "2024-06",
                             "2024-6-15",
                             "2024-02-30",
                             "1900-02-29",
                             "2024-13-01",
                             "2024-00-10",
                             "2024-06-15T",
                             "2024-06-15T10",
                             "2024-06-15T10:60",
                             "2024-06-15T24:00:01",
                             "2024-06-15T24:00:00.5",
                             "2024-06-15T10:02:61",
                             "2024-06-15T10:02:03.",
                             "+2024-06-15",
                             "2024-06-15T10:02:03+2",
                             "2024-06-15T10:02:03+19:00",
                             "2024-06-15T10:02:03+02:",
                             "2024-06-15T10:02:03+02:60",
                             "2024-06-15T10:02:03ZZ",
                             "2024-06-15Z",
                             " 2024-06-15",
                             "2024-06-15T-1:02",
                             "２024-06-15"}) {
        EXPECT_FALSE(parseISO8601(text)) << text;
    }
}

TEST(KSDate, EveryInstantReadsBackAsItWasWritten) {
    std::mt19937_64 random(20010101);  // NOLINT(*-msc51-cpp): the same run every time
    std::uniform_int_distribution<std::int64_t> milliseconds(-62135596800000, 253402300799999);
    for (int i = 0; i < 20000; ++i) {
        const auto unixMilliseconds = milliseconds(random);
        const auto date = KSDate::fromUnix(static_cast<double>(unixMilliseconds) / 1000.0);
        const auto text = formatISO8601(date);
        const auto read = parseISO8601(text);
        ASSERT_TRUE(read) << text;
        ASSERT_EQ(std::llround(read->date.unixSeconds() * 1000), unixMilliseconds) << text;
    }
    EXPECT_EQ(formatISO8601(parseISO8601("0001-01-01")->date), "0001-01-01T00:00:00Z");
    EXPECT_EQ(formatISO8601(parseISO8601("9999-12-31T23:59:59.999")->date),
              "9999-12-31T23:59:59.999Z");
    // Rounding must not lead out of the range that can be read again.
    const auto end = parseISO8601("9999-12-31T23:59:59.999")->date;
    for (const auto date :
         {end + 0.001, end + 0.0008, parseISO8601("0001-01-01")->date - 0.001, KSDate{std::nan("")},
          KSDate{INFINITY}, KSDate{-INFINITY}, KSDate{1e300}}) {
        EXPECT_EQ(formatISO8601(date), "invalid") << date.seconds;
    }
}

TEST(KSUUID, ReadsWhatItWritesAndNothingElse) {
    std::set<KSUUID> seen;
    for (int i = 0; i < 1000; ++i) {
        const auto id = KSUUID::random();
        const auto text = id.string();
        EXPECT_EQ(KSUUID::parse(text), id);
        EXPECT_EQ(text[14], '4');
        EXPECT_NE(std::string("89ab").find(text[19]), std::string::npos) << text;
        seen.insert(id);
    }
    EXPECT_EQ(seen.size(), 1000u);
    EXPECT_EQ(KSUUID::parse("00112233-4455-6677-8899-AABBCCDDEEFF")->string(),
              "00112233-4455-6677-8899-aabbccddeeff");
    for (const char* text :
         {"", "00112233-4455-6677-8899-aabbccddeef", "00112233-4455-6677-8899-aabbccddeeff0",
          "0011223344556677-8899-aabbccddeeff--", "00112233-4455-6677-8899-aabbccddeefg",
          "001122334-455-6677-8899-aabbccddeeff", "{0112233-4455-6677-8899-aabbccddeef}"}) {
        EXPECT_FALSE(KSUUID::parse(text)) << text;
    }
}

}  // namespace
}  // namespace keepsakes
