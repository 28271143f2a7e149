// SPDX-License-Identifier: Apache-2.0
// Indexes a year of a phone's log, a million points of GPX, and prints the time beside ten seconds
// and beside that of only reading the bytes; then has the visits of its last month rehydrated.
#include <fcntl.h>
#include <unistd.h>

#include <cmath>
#include <filesystem>
#include <fstream>
#include <numbers>

#include "Bench.h"
#include "ScanBench.h"
#include "core/Log.h"
#include "devicedata/IndexedRoutineService.h"
#include "indexer/ContentReader.h"
#include "notify/KSTocsinNotifier.h"
#include "sources/KSRoutineServiceManager.h"
#include "store/KSEventStore.h"
#include "store/KSPersistenceManager.h"
#include "support/TemporaryFolder.h"
#include "support/TestEvents.h"
#include "support/TestPlatform.h"

using namespace keepsakes;
namespace fs = std::filesystem;

namespace {

constexpr int kPoints = 1'000'000;
constexpr double kEvery = 30;  // seconds
constexpr double kMonth = 30 * 86400;
constexpr KSDate kStart = KSDate::fromUnix(1672531200);  // 2023-01-01
constexpr KSDate kEnd = kStart + kPoints * kEvery;

/// Six stays a day at forty places, with ways of a quarter of an hour between them.
GeoPoint whereAt(double seconds) {
    constexpr double kStay = 14400;
    constexpr double kWay = 900;
    const auto spot = [](double number) {
        const double angle = std::fmod(number * number, 40) * 2 * std::numbers::pi / 40;
        return GeoPoint{.latitude = 47 + 0.03 * std::sin(angle),
                        .longitude = 15 + 0.05 * std::cos(angle)};
    };
    const double number = std::floor(seconds / kStay);
    const double share = std::min(1.0, std::fmod(seconds, kStay) / kWay);
    const auto from = spot(number);
    const auto to = spot(number + 1);
    const double noise = 1e-4 * std::sin(seconds);
    return {.latitude = from.latitude + (to.latitude - from.latitude) * share + noise,
            .longitude = from.longitude + (to.longitude - from.longitude) * share - noise};
}

void writeLog(const fs::path& path) {
    std::ofstream file(path);
    file << "<gpx version=\"1.0\"><trk><trkseg>\n";
    for (int i = 0; i < kPoints; ++i) {
        const auto point = whereAt(i * kEvery);
        file << fmt::format(
            "<trkpt lat=\"{:.7f}\" lon=\"{:.7f}\"><ele>412.2</ele><time>{}</time><src>network</src>"
            "</trkpt>\n",
            point.latitude, point.longitude, formatISO8601(kStart + i * kEvery));
    }
    file << "</trkseg></trk></gpx>\n";
}

void indexLog(const fs::path& root, const fs::path& index) {
    const auto log = root / "Tracks" / "log.gpx";
    fs::create_directories(log.parent_path());
    writeLog(log);
    const int fd = ::open(log.c_str(), O_RDONLY | O_CLOEXEC);
    const double bytesOnly = bench::readingMilliseconds(3, fd);
    ::close(fd);
    bench::Scan scan(root);
    const long before = bench::peakKiB();
    const double took = bench::bestMilliseconds(2, [&] {
        IndexWriter::remove(index);
        ContentReader reader;
        scan.run({.index = index,
                  .tracks = {root / "Tracks"},
                  .photos = {},
                  .places = {},
                  .gazetteer = {},
                  .now = kEnd},
                 reader);
    });
    constexpr double kMostMilliseconds = 10000;
    bench::report("index 1,000,000 points of GPX / 10 s", took, kMostMilliseconds, 1);
    bench::note("index 1,000,000 points of GPX / reading only its bytes", took, bytesOnly);
    fmt::print("visits found in them; bytes of the index for each point|{}|{:.1f}|-|-\n",
               scan.summary().totals.visits, static_cast<double>(fs::file_size(index)) / kPoints);
    constexpr long kMostGrowthKiB = 32 * 1024;
    bench::reportGrowth("memory of indexing them", before, kMostGrowthKiB);
}

/// The events of the visits that overlap the window.
KSEventArray eventsOf(KSRoutineServiceManager& routine, KSDate start, KSDate end) {
    KSEventArray events;
    routine.fetchVisitBetweenStartDate(
        start, end, [&](const std::vector<RoutineVisit>& visits, const OptionalError&) {
            for (const auto& visit : visits) {
                events.push_back(routine.createEventFromVisit(visit, {}));
            }
        });
    WorkerThreads::shared().settle();
    return events;
}

void rehydrate(const fs::path& index) {
    TestPlatform platform;
    platform.clock.step(kEnd - platform.clock.now());
    IndexedRoutineService service(index, platform.clock);
    platform.services.routineService = &service;
    TestUniverse universe(platform.services);
    universe.add("TocsinNotifier",
                 std::make_shared<KSTocsinNotifier>("TocsinNotifier", platform.services));
    universe.add("PersistenceManager", KSPersistenceManager::initWithUniverse(universe));
    universe.add("EventStore", KSEventStore::initWithUniverse(universe));
    const auto routine = KSRoutineServiceManager::initWithUniverse(universe);
    const auto events = eventsOf(*routine, kEnd - kMonth, kEnd);
    std::size_t refreshed = 0;
    const double took = bench::bestMilliseconds(10, [&] {
        routine->rehydrateVisits(events,
                                 [&refreshed](const KSEventArray& answer, const OptionalError&) {
                                     refreshed = answer.size();
                                 });
        WorkerThreads::shared().settle();
    });
    constexpr double kMostMilliseconds = 50;
    bench::report(
        fmt::format("rehydrate a month of visits ({} of {}) / 50 ms", refreshed, events.size()),
        took, kMostMilliseconds, 1);
}

}  // namespace

int main() {
    setLogLevel(LogLevel::off);
    const TemporaryFolder folder;
    const auto index = folder / "index.sqlite";
    indexLog(folder.path(), index);
    rehydrate(index);
}
