// SPDX-License-Identifier: Apache-2.0
// Upserting and fetching 100,000 events through the store, beside the same statements bound and
// stepped by hand on the engine.
#include <SQLiteCpp/SQLiteCpp.h>
#include <sqlite3.h>

#include <memory>

#include "Bench.h"
#include "core/Log.h"
#include "notify/KSTocsinNotifier.h"
#include "store/KSEventMO.h"
#include "store/KSEventStore.h"
#include "store/KSPersistenceManager.h"
#include "support/TestEvents.h"
#include "support/TestPlatform.h"

namespace {

using namespace keepsakes;

constexpr std::uint32_t kEvents = 100000;

KSEventArray makeEvents() {
    KSEventArray events;
    for (std::uint32_t number = 0; number < kEvents; ++number) {
        const double start = 1000.0 * number;
        auto event = makeWorkout(number, start, start + 600, "Running");
        event->expirationDate = KSDate{start + 2419200};
        event->identifierFromProvider = "identifier-" + std::to_string(number);
        events.push_back(std::move(event));
    }
    return events;
}

/// The store on a file of its own.
struct Store {
    Store() {
        setLogLevel(LogLevel::off);
        universe.add("TocsinNotifier",
                     std::make_shared<KSTocsinNotifier>("TocsinNotifier", platform.services));
        universe.add("PersistenceManager", KSPersistenceManager::initWithUniverse(universe));
        store = KSEventStore::initWithUniverse(universe);
        WorkerThreads::shared().settle();
    }
    TestPlatform platform;
    TestUniverse universe{platform.services};
    std::shared_ptr<KSEventStore> store;
};

/// Binds what a workout's row holds, column by column, as the store's table does.
void bindByHand(sqlite3_stmt* statement, const KSEvent& event) {
    const auto text = [statement](int index, const std::string& value) {
        sqlite3_bind_text(statement, index, value.data(), static_cast<int>(value.size()),
                          SQLITE_STATIC);
    };
    sqlite3_bind_blob(statement, 1, event.eventIdentifier().bytes.data(), 16, SQLITE_STATIC);
    sqlite3_bind_double(statement, 2, event.startDate().seconds);
    sqlite3_bind_double(statement, 3, event.endDate().seconds);
    sqlite3_bind_double(statement, 4, event.creationDate().seconds);
    sqlite3_bind_int64(statement, 5, static_cast<std::int64_t>(event.provider()));
    sqlite3_bind_int64(statement, 6, static_cast<std::int64_t>(event.category()));
    sqlite3_bind_double(statement, 7, event.expirationDate->seconds);
    text(8, *event.identifierFromProvider);
    sqlite3_bind_double(statement, 10, event.sourceCreationDate().seconds);
    text(11, *event.workoutType);
    for (const int zero : {12, 31, 32, 35, 36, 38}) sqlite3_bind_int64(statement, zero, 0);
}

std::string insertText() {
    const auto names = KSEventMO::columnNames();
    std::string marks = "?";
    for (const char c : names) {
        if (c == ',') marks += ", ?";
    }
    return fmt::format("INSERT INTO KSEventMO ({}) VALUES ({})", names, marks);
}

/// The same rows on the engine alone: a look-up and an insert each, one transaction.
void upsertByHand(const std::string& file, const KSEventArray& events) {
    SQLite::Database database(file, SQLite::OPEN_READWRITE);
    database.exec("PRAGMA synchronous = FULL; PRAGMA secure_delete = ON");
    sqlite3* handle = database.getHandle();
    sqlite3_stmt* find = nullptr;
    sqlite3_stmt* insert = nullptr;
    sqlite3_prepare_v2(
        handle, "SELECT pk FROM KSEventMO WHERE eventIdentifier = ? ORDER BY pk DESC LIMIT 1", -1,
        &find, nullptr);
    sqlite3_prepare_v2(handle, insertText().c_str(), -1, &insert, nullptr);
    database.exec("BEGIN IMMEDIATE");
    for (const auto& event : events) {
        sqlite3_bind_blob(find, 1, event->eventIdentifier().bytes.data(), 16, SQLITE_STATIC);
        sqlite3_step(find);
        sqlite3_reset(find);
        bindByHand(insert, *event);
        sqlite3_step(insert);
        sqlite3_reset(insert);
    }
    database.exec("COMMIT");
    sqlite3_finalize(find);
    sqlite3_finalize(insert);
}

/// The same SELECT, every column of every row taken.
std::size_t fetchByHand(const std::string& file) {
    SQLite::Database database(file, SQLite::OPEN_READONLY);
    sqlite3_stmt* select = nullptr;
    const auto text = fmt::format(
        "SELECT {} FROM KSEventMO WHERE startDate <= ? AND endDate >= ? ORDER BY "
        "startDate ASC",
        KSEventMO::columnNames());
    sqlite3_prepare_v2(database.getHandle(), text.c_str(), -1, &select, nullptr);
    sqlite3_bind_double(select, 1, 1e12);
    sqlite3_bind_double(select, 2, 0);
    std::size_t bytes = 0;
    while (sqlite3_step(select) == SQLITE_ROW) {
        for (int column = 0; column < sqlite3_column_count(select); ++column) {
            switch (sqlite3_column_type(select, column)) {
                case SQLITE_TEXT:
                case SQLITE_BLOB:
                    bytes +=
                        std::string(static_cast<const char*>(sqlite3_column_blob(select, column)),
                                    static_cast<std::size_t>(sqlite3_column_bytes(select, column)))
                            .size();
                    break;
                case SQLITE_NULL:
                    break;
                default:
                    bytes += static_cast<std::size_t>(sqlite3_column_double(select, column) > 0);
            }
        }
    }
    sqlite3_finalize(select);
    return bytes;
}

}  // namespace

int main() {
    const auto events = makeEvents();
    constexpr int kRuns = 3;
    const auto ignore = [](const OptionalError& error, const KSDictionary&) {
        if (error) fmt::print("error: {}\n", error->description());
    };
    const auto fileOf = [](const Store& made) {
        return (made.platform.services.cacheFolder / "keepsakesDataModel.sqlite").string();
    };

    double store = 1e300;
    double byHand = 1e300;
    for (int run = 0; run < kRuns; ++run) {
        Store ours;
        store = std::min(
            store, bench::bestMilliseconds(1, [&] { ours.store->storeEvents(events, ignore); }));
        Store theirs;
        byHand = std::min(
            byHand, bench::bestMilliseconds(1, [&] { upsertByHand(fileOf(theirs), events); }));
    }
    bench::report("upsert 100,000 events / bound and stepped by hand", store, byHand, 1.5);

    Store ours;
    ours.store->storeEvents(events, ignore);
    const KSEventFetchOptions options{.dateInterval = KSDateInterval{{0}, {1e12}},
                                      .ascending = true};
    std::size_t fetched = 0;
    const double fetch = bench::bestMilliseconds(kRuns, [&] {
        ours.store->fetchEventsWithOptions(
            options, [&fetched](const KSEventArray& found, const OptionalError&) {
                fetched = found.size();
            });
    });
    std::size_t bytes = 0;
    const double hand = bench::bestMilliseconds(kRuns, [&] { bytes = fetchByHand(fileOf(ours)); });
    bench::report("fetch 100,000 events / stepped by hand", fetch, hand, 2);
    return fetched == kEvents && bytes > 0 ? 0 : 1;
}
