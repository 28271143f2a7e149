// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "PlaceFiles.h"
#include "support/FitWriter.h"

namespace keepsakes {
namespace {

using testing::HasSubstr;
using Type = FitWriter::Type;

// Sports of the profile.
constexpr int kRunning = 1;
constexpr int kTransition = 3;
constexpr int kSwimming = 5;
constexpr int kDriving = 24;
constexpr int kTrail = 3;

const KSDate kStart = parseISO8601("2024-06-15T08:00:00Z")->date;

FitWriter run(bool bigEndian = false) {
    FitWriter fit(bigEndian);
    fit.fileId()
        .record(kStart, 47, 15.5)
        .record(kStart + 60, -47.001, -15.5)
        .session(kStart, kStart + 60, kRunning, kTrail)
        .activity(kStart + 60, 7200);
    return fit;
}

const std::string kPoints =
    "2024-06-15T08:00:00Z 47.0000 15.5000\n"
    "2024-06-15T08:01:00Z -47.0010 -15.5000\n";
const std::string kSpan = " 2024-06-15T08:00:00Z 2024-06-15T08:01:00Z\n";
const std::string kRun = kPoints + "Trail Running" + kSpan + "zone 7200" + kSpan;

TEST(FitReader, ReadsPointsSessionsAndTheZone) {
    EXPECT_EQ(toldPlaces(run().file()), kRun);
    EXPECT_EQ(toldPlaces(run().file(12)), kRun) << "a header without checksum";
    EXPECT_EQ(toldPlaces(run(/*bigEndian=*/true).file()), kRun) << "the other byte order";
    FitWriter laps;
    laps.fileId()
        .session(kStart, kStart + 60, kSwimming, 17)
        .record(kStart, 200, 15)
        .record(kStart + 9, 0, 0);
    EXPECT_EQ(toldPlaces(laps.file()), "Swimming 2024-06-15T08:00:00Z 2024-06-15T08:00:09Z\n")
        << "times without positions on earth";
    FitWriter indoors;
    indoors.fileId().session(kStart, kStart + 60, kSwimming).activity(kStart + 60);
    EXPECT_EQ(toldPlaces(indoors.file()), "Swimming" + kSpan) << "no records";
}

TEST(FitReader, ReadsEverySessionButTransitionsAndTransport) {
    FitWriter fit;
    fit.fileId()
        .session(kStart, kStart + 600, kSwimming)
        .session(kStart + 600, kStart + 700, kTransition)
        .session(kStart + 700, kStart + 900, kDriving)
        .session(kStart + 900, kStart + 1000, 0)
        .activity(kStart + 1000);
    EXPECT_EQ(toldPlaces(fit.file()),
              "Swimming 2024-06-15T08:00:00Z 2024-06-15T08:10:00Z\n"
              "Other 2024-06-15T08:15:00Z 2024-06-15T08:16:40Z\n");
}

TEST(FitReader, CountsCompressedTimesFromTheLastOne) {
    FitWriter fit;
    fit.fileId().define(1, 20, {{0, Type::sint32}, {1, Type::sint32}});
    const std::vector<FitWriter::Value> here{FitWriter::semicircles(47),
                                             FitWriter::semicircles(15)};
    fit.compressed(1, kStart, here);  // no time yet to count from
    fit.define(2, 21, {{253, Type::uint32}}).data(2, {FitWriter::timestamp(kStart)});
    for (const int seconds : {0, 31, 31, 40, 71}) fit.compressed(1, kStart + seconds, here);
    EXPECT_EQ(toldPlaces(fit.file()),
              "2024-06-15T08:00:00Z 47.0000 15.0000\n2024-06-15T08:00:31Z 47.0000 15.0000\n"
              "2024-06-15T08:00:31Z 47.0000 15.0000\n2024-06-15T08:00:40Z 47.0000 15.0000\n"
              "2024-06-15T08:01:11Z 47.0000 15.0000\n"
              "Other 2024-06-15T08:00:00Z 2024-06-15T08:01:11Z\n");
}

TEST(FitReader, PassesOverWhatIsInvalidUnknownOrTheDevelopers) {
    FitWriter fit;
    fit.fileId();
    fit.define(4, 65280, {{0, Type::uint16}, {253, Type::uint32}}, 3).data(4, {7, {}});
    fit.define(1, 20,
               {{99, Type::uint16},
                {253, Type::uint32},
                {0, Type::sint32},
                {1, Type::sint32},
                {31, Type::uint8}},
               5);
    const auto now = FitWriter::timestamp(kStart);
    const auto degree = FitWriter::semicircles(1);
    fit.data(1, {1, now, degree, degree, 4})
        .data(1, {1, now, {}, degree, 4})
        .data(1, {1, {}, degree, degree, 4})
        .data(1, {1, 0x0FFFFFFF, degree, degree, 4})
        .data(1, {{}, now + 60, 2 * degree, degree, {}});
    EXPECT_EQ(toldPlaces(fit.file()),
              "2024-06-15T08:00:00Z 1.0000 1.0000 4 m\n2024-06-15T08:01:00Z 2.0000 1.0000\n"
              "Other" +
                  kSpan);
    for (const int plan : {5, 6}) {
        FitWriter course;
        course.fileId(plan).record(kStart, 47, 15).record(kStart + 60, 47, 15);
        EXPECT_EQ(toldPlaces(course.file()), "") << "file type " << plan;
    }
}

TEST(FitReader, ReadsFilesBehindOneAnother) {
    FitWriter other;
    other.fileId(32).record(kStart, 1, 1).activity(kStart);
    const std::string zeros(600, '\0');
    EXPECT_EQ(toldPlaces(other.file() + run().file() + run(true).file(12) + zeros),
              kPoints + kPoints + "Trail Running" + kSpan + "Trail Running" + kSpan + "zone 7200" +
                  kSpan);
}

TEST(FitReader, ReadsARecordingThatEndsEarlyUpToThere) {
    FitWriter ride;
    ride.fileId().define(5, 12, {{0, Type::enumeration}}).data(5, {2});
    ride.record(kStart, 47, 15.5).record(kStart + 60, -47.001, -15.5);
    const auto told = kPoints + "Cycling" + kSpan;
    const auto size = [&](const std::string& bytes) { return bytes + ride.messages(); };
    EXPECT_EQ(toldPlaces(size(std::string("\x0E\x20\0\0\0\0\0\0.FIT\0\0", 14))), told)
        << "a size that was never written";
    EXPECT_EQ(toldPlaces(size(std::string("\x0E\x20\0\0\0\1\0\0.FIT\0\0", 14)) + "\x01half"), told)
        << "within a message";
    EXPECT_EQ(toldPlaces(ride.file().substr(0, ride.file().size() - 2) + "??"), told)
        << "nothing closes it, so that no checksum can be right";
    EXPECT_EQ(brokenCut(run().file() + run().file()), "");
}

TEST(FitReader, RefusesDamage) {
    const auto changed = [](std::size_t at, char to) {
        auto bytes = run().file();
        bytes.at(at) = to;
        return bytes;
    };
    const auto runSize = std::to_string(run().file().size());
    const std::vector<std::pair<std::string, std::string>> cases{
        {changed(50, '!'), "the checksum is wrong"},
        {changed(2, '!'), "byte 0: the header's checksum is wrong"},
        {run().file() + run().file().substr(0, 14) + "\x01",
         "byte " + std::to_string(run().file().size() + 14) +
             ": data of message 1, which is not defined"},
        {run().file() + "garbage that is no file", "byte " + runSize + ": no FIT header"},
        {run().file().substr(0, 13), "byte 0: the header is cut"},
    };
    for (const auto& [bytes, reason] : cases) EXPECT_THAT(toldPlaces(bytes), HasSubstr(reason));
    FitWriter future;
    future.fileId().record(parseISO8601("2030-01-01")->date, 1, 1);
    EXPECT_EQ(toldPlaces(future.file()),
              "error: no timestamp lies between 1990-01-01 and a day from now\n");
}

}  // namespace
}  // namespace keepsakes
