// SPDX-License-Identifier: Apache-2.0
#include "readers/PhotoTime.h"

#include <gtest/gtest.h>

#include <optional>
#include <vector>

namespace keepsakes {
namespace {

TEST(PhotoTime, TellsTheOffsetFromGpsTime) {
    struct Case {
        std::string_view what;
        std::string_view local;
        std::string_view day;  ///< Empty: not stamped.
        double hours;          ///< GPS time of day.
        std::optional<double> offset;
    };
    const std::vector<Case> cases{
        {"two minutes ahead", "2008-10-22T16:29:49", "2008-10-22", 14 + 28 / 60.0, 2},
        {"the day stamped one late", "2008-10-22T16:29:49", "2008-10-23", 14 + 28 / 60.0, 2},
        {"the day stamped one early", "2008-10-22T10:00:00", "2008-10-21", 14, -4},
        {"local day ahead of UTC", "2024-01-02T08:00:00", "2024-01-01", 19, 13},
        {"local day behind UTC", "2024-01-01T14:00:00", "2024-01-02", 1, -11},
        {"quarters of an hour", "2024-01-01T15:45:00", "2024-01-01", 10, 5.75},
        {"no day stamped", "2024-01-01T23:30:00", "", 4.5, -5},
        {"a fix of minutes ago", "2024-01-01T12:05:00", "2024-01-01", 10, std::nullopt},
        {"a fix of days ago", "2024-01-08T12:00:00", "2024-01-01", 10, std::nullopt},
    };
    for (const auto& [what, local, day, hours, offset] : cases) {
        GpsTime gps{hours * 3600, std::nullopt};
        if (!day.empty()) gps.day = parseISO8601(day)->date;
        const auto told = offsetByGps(parseISO8601(local)->date, gps);
        const auto toldHours = told ? std::optional(*told / 3600.0) : std::nullopt;
        EXPECT_EQ(toldHours, offset) << what;
    }
}

TEST(PhotoTime, ReadsTheTimesThatCamerasWrite) {
    const auto iso = [](std::string_view text) {
        const auto parsed = parseExifTime(text);
        return parsed ? formatISO8601(parsed->date) : "none";
    };
    EXPECT_EQ(iso("2024:06:15 10:02:03"), "2024-06-15T10:02:03Z");
    EXPECT_EQ(iso("2024-06-15T10:02:03"), "2024-06-15T10:02:03Z");
    EXPECT_EQ(iso({"2024:06:15 10:02:03\0", 20}), "2024-06-15T10:02:03Z");
    for (const auto* text : {"", "0000:00:00 00:00:00", "    :  :     :  :  ",
                             "2024:13:15 10:02:03", "2024:06:15", "2024:06:15 25:00:00", "2024"}) {
        EXPECT_EQ(iso(text), "none") << text;
    }
    EXPECT_EQ(parseExifOffset("-09:30"), -34200);
    EXPECT_EQ(parseExifOffset("   :  "), std::nullopt);
    EXPECT_EQ(parseExifOffset("+17:00"), std::nullopt);
}

}  // namespace
}  // namespace keepsakes
