// SPDX-License-Identifier: Apache-2.0
// Finding what was played again and again in the most records that are kept, beside the same rows
// stepped by hand.
#include <SQLiteCpp/SQLiteCpp.h>

#include "Bench.h"
#include "core/Log.h"
#include "core/Problems.h"
#include "devicedata/MediaStreamFile.h"
#include "notify/KSTocsinNotifier.h"
#include "sources/KSNowPlayingMediaManager.h"
#include "store/KSEventStore.h"
#include "store/KSPersistenceManager.h"
#include "support/TestPlatform.h"

namespace {

using namespace keepsakes;

/// A hundred songs over and over, ten players at a time, a minute of each.
void fill(SQLite::Database& file, KSDate end) {
    SQLite::Statement insert(
        file,
        "WITH RECURSIVE n(i) AS (SELECT 0 UNION ALL SELECT i + 1 FROM n WHERE i < ?) "
        "INSERT INTO records(timestamp, state, duration, title, album, artist, bundleID) "
        "SELECT ? - 6.0 * i, CASE WHEN i % 20 < 10 THEN 4 ELSE 1 END, 180,"
        " 'Song number ' || ((i / 20 * 10 + i % 10) % 100), 'An album', 'An artist',"
        " 'org.example.Music'"
        " FROM n ORDER BY i DESC");
    insert.bind(1, MediaStreamFile::kMostRecords - 1);
    insert.bind(2, end.seconds);
    insert.exec();
}

}  // namespace

int main() {
    setLogLevel(LogLevel::off);
    TestPlatform platform;
    const auto path = platform.folder / "mediaStream.sqlite";
    MediaStreamFile stream(path, platform.clock, platform.problems);
    SQLite::Database file(path.string(), SQLite::OPEN_READWRITE);
    fill(file, platform.clock.now());

    TestUniverse universe(platform.services);
    universe.add("TocsinNotifier",
                 std::make_shared<KSTocsinNotifier>("TocsinNotifier", platform.services));
    universe.add("PersistenceManager", KSPersistenceManager::initWithUniverse(universe));
    const auto media = KSNowPlayingMediaManager::initWithNowPlayingStream(
        &stream, platform.clock, KSEventStore::initWithUniverse(universe));

    std::size_t found = 0;
    const double finding = bench::bestMilliseconds(3, [&] {
        media->fetchRepeatedMediaPlayBetweenStartDate(
            {0}, {0}, [&found](const auto& plays) { found = plays.size(); });
        media->waitForQueueEmpty();
    });
    std::int64_t bytes = 0;
    const double stepping = bench::bestMilliseconds(3, [&] {
        SQLite::Statement query(file, "SELECT * FROM records ORDER BY id");
        while (query.executeStep()) {
            for (int column = 0; column < query.getColumnCount(); ++column) {
                bytes += query.getColumn(column).getBytes();
            }
        }
    });
    bench::report("find media on repeat in 100,000 records / stepping them", finding, stepping, 4);
    return found == 100 && bytes > 0 ? 0 : 1;
}
