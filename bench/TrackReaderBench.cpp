// SPDX-License-Identifier: Apache-2.0
// Reads a GPX file of 500 MB and prints the pace beside that of only reading its bytes, and the
// peak of resident memory. The file is made in the folder for temporary files and removed.
#include <fcntl.h>
#include <fmt/core.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <string>

#include "Bench.h"
#include "readers/FileReaders.h"
#include "support/TemporaryFolder.h"

namespace {

using namespace keepsakes;

constexpr double kMegabyte = 1e6;
constexpr double kFileSize = 500 * kMegabyte;
constexpr double kLeastPace = 50;  // MB/s

/// Points as watches write them: a second and some metres apart, in tracks of three hours; every
/// second track without a type, so that its speed is measured.
void makeFile(const std::filesystem::path& path) {
    std::ofstream file(path);
    file << "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<gpx version=\"1.1\" "
            "xmlns=\"http://www.topografix.com/GPX/1/1\">\n";
    auto time = parseISO8601("2010-01-01T00:00:00Z")->date;
    double written = 0;
    for (int track = 0; written < kFileSize; ++track) {
        file << "<trk><name>Track</name>" << (track % 2 == 0 ? "<type>running</type>" : "")
             << "<trkseg>\n";
        for (int i = 0; i < 3 * 3600; ++i) {
            const auto point = fmt::format(
                "<trkpt lat=\"{:.7f}\" lon=\"15.4312345\"><ele>412.2</ele><time>{}</time>"
                "<extensions><gpxtpx:TrackPointExtension><gpxtpx:hr>141</gpxtpx:hr>"
                "</gpxtpx:TrackPointExtension></extensions></trkpt>\n",
                47 + i * 2.5e-5, formatISO8601(time));
            file << point;
            written += static_cast<double>(point.size());
            time = time + 1;
        }
        file << "</trkseg></trk>\n";
    }
    file << "</gpx>\n";
}

/// Takes what readers hand on and keeps nothing.
class NoPlaces final : public LocationSink {
  public:
    void point(const TrackPoint&) override {}
    void visit(StatedVisit) override {}
    void place(NamedPlace) override {}
};

}  // namespace

int main() {
    const TemporaryFolder folder;
    const auto path = folder / "large.gpx";
    makeFile(path);
    const auto megabytes = static_cast<double>(std::filesystem::file_size(path)) / kMegabyte;
    const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    const double bytesOnly = bench::readingMilliseconds(1, fd);
    const long before = bench::peakKiB();
    std::size_t workouts = 0;
    std::string error;
    NoPlaces places;
    const double parsed = bench::bestMilliseconds(1, [fd, &workouts, &error, &places] {
        const auto records = readTrackFile(fd, {parseISO8601("2024-06-16")->date}, places);
        workouts = records ? records->workouts.size() : 0;
        error = records ? "" : records.error();
    });
    ::close(fd);

    if (!error.empty()) fmt::print(stderr, "{}\n", error);
    const auto title = fmt::format("read {:.0f} MB of GPX", megabytes);
    bench::report(
        fmt::format("{} ({:.0f} MB/s) / {:.0f} MB/s", title, megabytes / parsed * 1000, kLeastPace),
        parsed, megabytes / kLeastPace * 1000, 1);
    bench::note(title + " / reading only its bytes", parsed, bytesOnly);
    constexpr long kMostGrowthKiB = 16 * 1024;
    bench::reportGrowth("memory of reading it", before, kMostGrowthKiB);
    return error.empty() && workouts > 0 ? 0 : 1;
}
