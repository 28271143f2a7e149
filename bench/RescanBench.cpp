// SPDX-License-Identifier: Apache-2.0
// Rescan of 10,000 unchanged files beside a stat of each (limit: 3 times as long), the occasions of
// 100,000 photos (limit: a second), and the memory of a scan for each file.
#include <sys/stat.h>

#include <filesystem>
#include <fstream>

#include "Bench.h"
#include "ScanBench.h"
#include "indexer/OccasionUpdate.h"
#include "support/TemporaryFolder.h"

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

}  // namespace

int main() {
    const TemporaryFolder temporary;
    const auto& root = temporary.path();
    constexpr int kFiles = 10000;
    std::vector<std::string> paths;
    for (int i = 0; i < kFiles; ++i) {
        const auto folder = root / "Pictures" / fmt::format("{:03}", i / 100);
        if (i % 100 == 0) fs::create_directories(folder);
        paths.push_back((folder / fmt::format("IMG_{:08}.jpg", i)).string());
        std::ofstream(paths.back()) << i;
    }
    const auto index = root / "index.sqlite";
    TinyReader reader;
    bench::Scan scan(root);
    const auto scanAll = [&] {
        scan.run({.index = index, .tracks = {}, .photos = {root / "Pictures"}, .now = {0}}, reader);
    };
    const long before = bench::peakKiB();
    const double first = bench::bestMilliseconds(1, scanAll);
    bench::note(fmt::format("first scan of {} tiny files, {} bytes of memory a file",
                            scan.summary().read, (bench::peakKiB() - before) * 1024 / kFiles),
                first);
    const double rescan = bench::bestMilliseconds(15, scanAll);
    struct stat info {};
    const double stats = bench::bestMilliseconds(15, [&] {
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
    bench::note("occasions of 100,000 photos, the first time", bench::bestMilliseconds(1, update));
    bench::report("occasions of 100,000 photos, again", bench::bestMilliseconds(3, update),
                  kMostMilliseconds, 1);
}
