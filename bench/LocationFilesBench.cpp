// SPDX-License-Identifier: Apache-2.0
// Reads a million points of Records.json, and of a FIT file, and prints the time beside what is
// allowed for a million points and beside that of only reading the bytes; and the growth of peak
// memory. The files are made in a folder for temporary files and removed.
#include <fcntl.h>
#include <unistd.h>

#include <fstream>
#include <functional>
#include <string>

#include "Bench.h"
#include "readers/FileReaders.h"
#include "support/FitWriter.h"
#include "support/TemporaryFolder.h"

namespace {

using namespace keepsakes;

constexpr int kPoints = 1'000'000;
constexpr double kAllowedMilliseconds = 10'000;
constexpr long kMostGrowthKiB = 16L * 1024;

const KSDate kStart = parseISO8601("2020-01-01T00:00:00Z")->date;

class Counter final : public LocationSink {
  public:
    void point(const TrackPoint&) override { ++points; }
    void visit(StatedVisit) override {}
    void place(NamedPlace) override {}

    int points = 0;
};

/// As phones write them: every third with a guess of the activity.
void writeRecords(std::ofstream& file) {
    file << "{\n  \"locations\": [";
    for (int i = 0; i < kPoints; ++i) {
        const auto time = formatISO8601(kStart + 60.0 * i + 0.123);
        file << fmt::format(
            "{}{{\n    \"latitudeE7\": {},\n    \"longitudeE7\": {},\n    \"accuracy\": 25,\n",
            i > 0 ? ", " : "", 470000000 + i, 155000000 - i);
        if (i % 3 == 0) {
            file << fmt::format(
                "    \"activity\": [{{\n      \"activity\": [{{\n        \"type\": \"STILL\",\n"
                "        \"confidence\": 62\n      }}, {{\n        \"type\": \"IN_VEHICLE\",\n"
                "        \"confidence\": 31\n      }}],\n      \"timestamp\": \"{}\"\n    }}],\n",
                time);
        }
        file << fmt::format(
            "    \"source\": \"WIFI\",\n    \"deviceTag\": 335552189,\n    \"timestamp\": \"{}\"\n"
            "  }}",
            time);
    }
    file << "]\n}\n";
}

void writeFit(std::ofstream& file) {
    FitWriter fit;
    fit.fileId();
    for (int i = 0; i < kPoints; ++i) fit.record(kStart + i, 47 + i * 1e-6, 15.5 - i * 1e-6);
    fit.session(kStart, kStart + kPoints, 2).activity(kStart + kPoints);
    file << fit.file();
}

using Reader = std::expected<FileRecords, std::string> (*)(int, const ReaderContext&,
                                                           LocationSink&);

bool measure(const std::string& what, const std::filesystem::path& path, Reader reader) {
    const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    const double bytesOnly = bench::readingMilliseconds(1, fd);
    const long before = bench::peakKiB();
    Counter counter;
    std::string error;
    const double taken = bench::bestMilliseconds(1, [&] {
        const auto records = reader(fd, {parseISO8601("2024-06-16")->date}, counter);
        error = records ? "" : records.error();
    });
    ::close(fd);

    const auto megabytes = static_cast<double>(std::filesystem::file_size(path)) / 1e6;
    const auto title = fmt::format("read 1,000,000 points of {} ({:.0f} MB)", what, megabytes);
    bench::report(title + " / allowed", taken, kAllowedMilliseconds, 1);
    bench::note(title + " / reading only its bytes", taken, bytesOnly);
    bench::reportGrowth("memory of reading it", before, kMostGrowthKiB);
    if (!error.empty()) fmt::print(stderr, "{}: {}\n", what, error);
    if (counter.points != kPoints) fmt::print(stderr, "{}: {} points\n", what, counter.points);
    return error.empty() && counter.points == kPoints;
}

}  // namespace

int main() {
    const TemporaryFolder folder;
    const auto make = [&folder](const std::string& name, auto write) {
        const auto path = folder.path() / name;
        std::ofstream file(path, std::ios::binary);
        write(file);
        return path;
    };
    const auto records = make("Records.json", writeRecords);
    const bool readRecords = measure("Records.json", records, readLocationHistoryFile);
    const auto fit = make("ride.fit", writeFit);
    return measure("FIT", fit, readFitFile) && readRecords ? 0 : 1;
}
