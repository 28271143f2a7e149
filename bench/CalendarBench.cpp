// SPDX-License-Identifier: Apache-2.0
// Scans a calendar of some ten years into an index: as one file, as the files of a vdir, and how
// the peak of resident memory grows with a file four times as large.
#include <filesystem>
#include <fstream>

#include "Bench.h"
#include "ScanBench.h"
#include "indexer/ContentReader.h"
#include "support/TemporaryFolder.h"

using namespace keepsakes;
namespace fs = std::filesystem;

namespace {

constexpr int kEntries = 20000;
/// What indexing an entry may take, in milliseconds: ten years of them in four seconds.
constexpr double kMillisecondsPerEntry = 0.2;
constexpr double kMillisecondsPerFile = 0.3;
/// An entry is kept until the last of its file is read, since later ones may replace it. Half of
/// what the indexer may have.
constexpr long kMostGrowthKiB = 256L * 1024;
constexpr double kDay = 86400;
const KSDate kNow = parseISO8601("2024-06-16")->date;

/// Every twentieth a reservation, every thousandth one that recurs, all with what calendars add.
std::string entry(int i) {
    const auto start = formatISO8601(kNow - i % 3650 * kDay);
    std::string stamp;
    for (const char c : start) {
        if (c != '-' && c != ':') stamp += c;
    }
    const auto title = i % 20 == 0 ? fmt::format("Flight AB {} from GRZ to LIS", 1000 + i % 9000)
                                   : fmt::format("Meeting No. {} about this and that", i);
    return fmt::format(
        "BEGIN:VEVENT\r\nUID:{0}@example.org\r\nDTSTAMP:{1}\r\nSUMMARY:{2}\r\nDTSTART:{1}\r\n"
        "DURATION:PT1H\r\n{3}LOCATION:Herrengasse 16\\, 8010 Graz\\, Austria\r\nDESCRIPTION:Join "
        "with\r\n  the link below\\, or dial in: +43 316 000000\\, {4}\r\nSTATUS:CONFIRMED\r\n"
        "ATTENDEE;CN=Anna;PARTSTAT=ACCEPTED:mailto:anna@example.org\r\nEND:VEVENT\r\n",
        i, stamp, title, i % 1000 == 7 ? "RRULE:FREQ=WEEKLY;BYDAY=MO,WE\r\n" : "",
        std::string(200, 'x'));
}

std::string calendar(int from, int to) {
    std::string text = "BEGIN:VCALENDAR\r\nVERSION:2.0\r\n";
    for (int i = from; i < to; ++i) text += entry(i);
    return text + "END:VCALENDAR\r\n";
}

double scanMilliseconds(const fs::path& root, const char* folder, std::uint64_t& files) {
    ContentReader reader;
    bench::Scan scan(root);
    const double took = bench::bestMilliseconds(1, [&] {
        scan.run({.index = root / (std::string(folder) + ".sqlite"),
                  .tracks = {},
                  .photos = {},
                  .calendars = {root / folder},
                  .ownerAddresses = {},
                  .now = kNow},
                 reader);
    });
    files = scan.summary().totals.files;
    return took;
}

}  // namespace

int main() {
    const TemporaryFolder folder;
    const auto& root = folder.path();
    for (const auto* name : {"one", "vdir", "large"}) fs::create_directories(root / name);
    std::ofstream(root / "one/work.ics") << calendar(0, kEntries);
    for (int i = 0; i < kEntries; ++i) {
        std::ofstream(root / "vdir" / fmt::format("{}.ics", i)) << calendar(i, i + 1);
    }
    std::uint64_t one = 0;
    const double indexed = scanMilliseconds(root, "one", one);
    bench::report(fmt::format("index a calendar of {} entries", kEntries), indexed,
                  kEntries * kMillisecondsPerEntry, 1);
    const long before = bench::peakKiB();
    std::ofstream(root / "large/work.ics") << calendar(0, 4 * kEntries);
    std::uint64_t large = 0;
    scanMilliseconds(root, "large", large);
    bench::reportGrowth(fmt::format("memory of indexing {} entries more", 3 * kEntries), before,
                        kMostGrowthKiB);
    std::uint64_t vdir = 0;
    const double apart = scanMilliseconds(root, "vdir", vdir);
    bench::report(fmt::format("index {} files of an entry each", vdir), apart,
                  kEntries * kMillisecondsPerFile, 1);
    return one == 1 && large == 1 && vdir == kEntries ? 0 : 1;
}
