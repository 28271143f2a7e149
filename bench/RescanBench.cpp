// SPDX-License-Identifier: Apache-2.0
// Rescan of 10,000 unchanged files beside a stat of each (limit: 3 times as long), the occasions of
// 100,000 photos (limit: a second), and the memory of a scan for each file.
#include <fmt/format.h>
#include <sys/resource.h>
#include <sys/stat.h>

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <functional>

#include "Bench.h"
#include "indexer/FolderScan.h"
#include "indexer/OccasionUpdate.h"

using namespace keepsakes;
namespace fs = std::filesystem;

namespace {

/// A photo in a few bytes: its number is its time.
class TinyReader final : public FileReader {
  public:
    std::expected<std::optional<FileRecords>, std::string> read(int, int, const ReaderContext&,
                                                                LocationSink&,
                                                                PeopleSink&) override {
        FileRecords records;
        ++count_;
        records.photos.push_back({.taken = {count_ * 600.0},
                                  .timeSource = TimeSource::offset,
                                  .localTime = {count_ * 600.0},
                                  .position = std::nullopt,
                                  .inferences = {"nature"},
                                  .persons = {},
                                  .holidays = {},
                                  .publicEvents = {}});
        return records;
    }

  private:
    double count_ = 0;
};

class SilentReporter final : public ScanReporter {
  public:
    void progress(std::uint64_t, std::uint64_t) override {}
    void problem(const std::string& line) override { fmt::print("problem: {}\n", line); }
    void report(const ScanSummary& done) override { summary = done; }
    ScanSummary summary;
};

double milliseconds(const std::function<void()>& work) {
    const auto start = std::chrono::steady_clock::now();
    work();
    return std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - start)
        .count();
}

double best(int rounds, const std::function<void()>& work) {
    double least = 1e300;
    for (int i = 0; i < rounds; ++i) least = std::min(least, milliseconds(work));
    return least;
}

long peakKilobytes() {
    rusage usage{};
    ::getrusage(RUSAGE_SELF, &usage);
    return usage.ru_maxrss;
}

}  // namespace

int main() {
    std::string name = (fs::temp_directory_path() / "keepsakes-bench-XXXXXX").string();
    const fs::path root = ::mkdtemp(name.data());
    constexpr int kFiles = 10000;
    std::vector<std::string> paths;
    for (int i = 0; i < kFiles; ++i) {
        const auto folder = root / "Pictures" / fmt::format("{:03}", i / 100);
        if (i % 100 == 0) fs::create_directories(folder);
        paths.push_back((folder / fmt::format("IMG_{:08}.jpg", i)).string());
        std::ofstream(paths.back()) << i;
    }
    const auto index = root / "index.sqlite";
    const auto mark = ReadMark::take(root / "mark");
    TinyReader reader;
    SilentReporter reporter;
    const auto scan = [&] {
        const auto error =
            scanFolders({.index = index, .tracks = {}, .photos = {root / "Pictures"}, .now = {0}},
                        reader, **mark, reporter);
        if (error) fmt::print("scan: {}\n", error->description());
    };
    const long before = peakKilobytes();
    const double first = milliseconds(scan);
    fmt::print("first scan of {} tiny files, {} bytes of memory a file|{:.0f} ms|-|-|-\n",
               reporter.summary.read, (peakKilobytes() - before) * 1024 / kFiles, first);
    const double rescan = best(15, scan);
    struct stat info {};
    const double stats = best(15, [&] {
        for (const auto& path : paths) (void)!::stat(path.c_str(), &info);
    });
    bench::report("rescan 10,000 unchanged files / stat of the same", rescan, stats, 3);

    IndexWriter writer(root / "photos.sqlite");
    FileRecords one;
    for (int i = 0; i < 100000; ++i) {
        // Runs of eight photos, five minutes apart, and two hours between the runs.
        one.photos = {{.taken = {i / 8 * 9300.0 + i % 8 * 300.0},
                       .timeSource = TimeSource::offset,
                       .localTime = {},
                       .position = GeoPoint{.latitude = 50, .longitude = 8},
                       .inferences = {"nature"},
                       .persons = {"Ada"},
                       .holidays = {},
                       .publicEvents = {}}};
        writer.putRecords(i + 1, one);
    }
    writer.commit({0});
    const auto update = [&] {
        updateOccasions(writer);
        writer.commit({0});
    };
    constexpr double kMostMilliseconds = 1000;
    fmt::print("occasions of 100,000 photos, the first time|{:.0f} ms|-|-|-\n",
               milliseconds(update));
    bench::report("occasions of 100,000 photos, again", best(3, update), kMostMilliseconds, 1);
    fs::remove_all(root);
}
