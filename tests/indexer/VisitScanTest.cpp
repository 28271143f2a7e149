// SPDX-License-Identifier: Apache-2.0
// Visits and places over real files and a real index, scan after scan.
#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <random>

#include "ScanOnce.h"
#include "TextReader.h"
#include "core/KSDate.h"
#include "devicedata/IndexedRoutineService.h"
#include "support/TemporaryFolder.h"
#include "support/VirtualClock.h"

namespace keepsakes {
namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class VisitScan : public testing::Test {
  protected:
    std::vector<std::string> scan() { return scanInto(index_); }

    std::vector<std::string> scanInto(const fs::path& index) {
        reader_.reads.clear();
        return scanOnce({.index = index,
                         .tracks = {folder_ / "Tracks"},
                         .photos = {},
                         .places = {},
                         .gazetteer = gazetteer_,
                         .now = {now_ += 1}},
                        reader_)
            .problems;
    }

    std::vector<RoutineVisit> visitsOf(const fs::path& index) {
        std::vector<RoutineVisit> found;
        const VirtualClock clock({now_});
        IndexedRoutineService service(index, clock);
        service.fetchStoredVisits({.interval = {{-1e10}, {1e10}}},
                                  [&found](RoutineService::Visits visits) { found = *visits; });
        WorkerThreads::shared().settle();
        return found;
    }

    /// A line for each visit: start, end, name, "home" or "work".
    std::vector<std::string> visits() {
        std::vector<std::string> lines;
        for (const auto& visit : visitsOf(index_)) {
            const auto& place = *visit.placeInference;
            auto line = fmt::format("{}..{}", visit.entry->seconds - start_,
                                    visit.exit ? visit.exit->seconds - start_ : 0);
            if (place.preferredName) line += " " + *place.preferredName;
            if (place.mapItem) line += " (" + *place.mapItem->name + ")";
            if (place.userType == kUserTypeHome) line += " home";
            if (place.userType == kUserTypeWork) line += " work";
            lines.push_back(line);
        }
        return lines;
    }

    std::vector<KSUUID> places() {
        std::vector<KSUUID> found;
        for (const auto& visit : visitsOf(index_)) {
            found.push_back(visit.placeInference->loiIdentifier.value_or(KSUUID()));
        }
        return found;
    }

    void write(const std::string& name, const std::string& lines) {
        folder_.write("Tracks/" + name, lines);
    }
    std::string still(double from, double to, double latitude) {
        return fmt::format("still {} {} {} 8\n", start_ + from, start_ + to, latitude);
    }

    TemporaryFolder folder_;
    const fs::path index_ = folder_ / "deviceData.sqlite";
    fs::path gazetteer_;
    TextReader reader_;
    const double start_ = 700 * kDay * 10;
    double now_ = start_ + 400 * kDay;
};

TEST_F(VisitScan, FilesTogetherMakeAVisitAndTakeTheirPartAlong) {
    write("evening.gpx", still(80000, kDay - 60, 50));
    write("morning.gpx", still(kDay, kDay + 3000, 50) + still(kDay + 4000, kDay + 5020, 50.1));
    scan();
    EXPECT_THAT(visits(), ElementsAre("80000..89400", "90400..91420"));
    const auto before = places();
    // The evening again, from another device, with what came before it.
    write("watch.gpx", still(70000, 79970, 50.05) + still(80020, 85000, 50));
    scan();
    EXPECT_THAT(visits(), ElementsAre("70000..79960", "80000..89400", "90400..91420"));
    EXPECT_EQ(places()[1], before[0]);
    fs::remove(folder_ / "Tracks/evening.gpx");
    fs::remove(folder_ / "Tracks/watch.gpx");
    scan();
    EXPECT_THAT(visits(), ElementsAre("86400..89400", "90400..91420"));
    EXPECT_EQ(places(), before) << "a place outlives a change of its visits";
    write("morning.gpx", still(kDay, kDay + 3000, 50) + "broken half way");
    scan();
    EXPECT_THAT(visits(), IsEmpty()) << "of a file that is refused nothing stays";
}

TEST_F(VisitScan, EveryChangeComesToWhatAnIndexBuiltAnewHolds) {
    std::mt19937 random(11);
    const auto draw = [&random](unsigned below) { return static_cast<double>(random() % below); };
    for (int round = 0; round < 40; ++round) {
        const auto name = fmt::format("{}.gpx", random() % 12);
        if (random() % 4 == 0) {
            fs::remove(folder_ / "Tracks" / name);
        } else {
            std::string lines;
            double time = draw(20) * kDay / 2;
            for (int leg = 0; leg < 8; ++leg) {
                const double length = draw(9000);
                lines += still(time, time + length, 50 + draw(4) * 0.01);
                time += length + draw(50000);
            }
            if (random() % 5 == 0) {
                lines += fmt::format("visit {} {} 51 8 Inn\n", start_ + time / 2,
                                     start_ + time / 2 + draw(9000));
            }
            write(name, lines);
        }
        scan();
        const auto anew = folder_ / "anew.sqlite";
        IndexWriter::remove(anew);
        scanInto(anew);
        const auto now = visitsOf(index_);
        const auto fresh = visitsOf(anew);
        ASSERT_EQ(now.size(), fresh.size()) << round;
        for (std::size_t i = 0; i < now.size(); ++i) {
            ASSERT_EQ(now[i].entry, fresh[i].entry) << round;
            ASSERT_EQ(now[i].exit, fresh[i].exit) << round;
            ASSERT_EQ(now[i].location, fresh[i].location) << round;
        }
    }
}

TEST_F(VisitScan, AFileThatStatesAVisitIsBelieved) {
    write("points.gpx", still(0, 9000, 50));
    write("stated.json", fmt::format("visit {} {} 50 8 Bakery\nvisit {} {} 50.3 8 Inn\n",
                                     start_ + 3000, start_ + 3500, start_ + 20000, start_ + 26000));
    write("again.json", fmt::format("visit {} {} 50.3 8 Inn\n", start_ + 20000, start_ + 25000));
    scan();
    EXPECT_THAT(visits(), ElementsAre("0..2940 (Bakery)", "3000..3500 (Bakery)",
                                      "3540..9000 (Bakery)", "20000..26000 (Inn)"));
    fs::remove(folder_ / "Tracks/stated.json");
    scan();
    EXPECT_THAT(visits(), ElementsAre("0..9000", "20000..25000 (Inn)"));
}

TEST_F(VisitScan, APlaceIsCalledByTheOwnerByFilesOrByTheNearestTown) {
    gazetteer_ = folder_.write("towns.txt",
                               "1\tNorthtown\t\t\t50.1\t8.01\tP\tPPL\tXX\t\t\t\t\t\t900\t\t\t\t\n"
                               "2\tHill\t\t\t50.1001\t8\tT\tHLL\tXX\t\t\t\t\t\t0\t\t\t\t\n"
                               "3\tOldtown\t\t\t50.1\t8.001\tP\tPPLQ\tXX\t\t\t\t\t\t0\t\t\t\t\n"
                               "a line of something else\n");
    write("a.gpx", still(0, 3000, 50.1) + still(9000, 12000, 51) + still(20000, 23000, 51.5));
    EXPECT_THAT(scan(), IsEmpty());
    EXPECT_THAT(visits(), ElementsAre("0..3000 (Northtown)", "9000..12000", "20000..23000"));
    const auto before = places();
    write("places.gpx", "place 50.1003 8 Grandma\nplace 51.5 8.0005 Zuhause\nplace 51.002 8 Far\n");
    scan();
    EXPECT_THAT(visits(),
                ElementsAre("0..3000 Grandma", "9000..12000", "20000..23000 Zuhause home"));
    EXPECT_EQ(places(), before);
    fs::remove(folder_ / "Tracks/places.gpx");
    folder_.write("towns.txt", "nothing of the kind\n");
    EXPECT_THAT(scan(), ElementsAre(HasSubstr("towns.txt: no line of it is a place")));
    EXPECT_EQ(scan().size(), 1u) << "said again, though not read again";
    EXPECT_THAT(visits(), ElementsAre("0..3000", "9000..12000", "20000..23000"));
}

TEST_F(VisitScan, WhatIsDeletedIsNotFoundInTheFilesBytes) {
    write("a.gpx", "place 50.1003 8 Secretplace\n" + still(0, 3000, 50.1));
    scan();
    fs::remove(folder_ / "Tracks/a.gpx");
    scan();
    for (const char* suffix : {"", "-wal"}) {
        std::ifstream in(index_.string() + suffix, std::ios::binary);
        const std::string bytes(std::istreambuf_iterator<char>(in), {});
        EXPECT_THAT(bytes, testing::Not(HasSubstr("Secretplace")));
    }
}

}  // namespace
}  // namespace keepsakes
