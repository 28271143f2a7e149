// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <SQLiteCpp/SQLiteCpp.h>
#include <gtest/gtest.h>

#include <memory>

#include "notify/KSTocsinNotifier.h"
#include "store/KSEventStore.h"
#include "store/KSPersistenceManager.h"
#include "support/TestEvents.h"
#include "support/TestPlatform.h"

namespace keepsakes {

/// A store on a real file, opened as on a device without content protection.
class StoreFixture : public testing::Test {
  protected:
    StoreFixture() { open(); }

    void close() {
        store.reset();
        manager.reset();
        universe.reset();
    }

    /// Ends the store, when there is one, and starts it anew on the same file.
    void open() {
        close();
        universe = std::make_unique<TestUniverse>(platform.services);
        universe->add("TocsinNotifier",
                      std::make_shared<KSTocsinNotifier>("TocsinNotifier", platform.services));
        manager = KSPersistenceManager::initWithUniverse(*universe);
        universe->add("PersistenceManager", manager);
        store = KSEventStore::initWithUniverse(*universe);
        WorkerThreads::shared().settle();
    }

    std::filesystem::path file() const {
        return platform.services.cacheFolder / "keepsakesDataModel.sqlite";
    }

    /// What an operation answered: its error's text or "", and its count.
    struct Answer {
        std::string error;
        std::int64_t count = -1;
        friend bool operator==(const Answer&, const Answer&) = default;
        friend void PrintTo(const Answer& answer, std::ostream* out) {
            *out << '"' << answer.error << "\" " << answer.count;
        }
    };
    ResultHandler into(Answer& answer) {
        return [&answer](const OptionalError& error, const KSDictionary& result) {
            answer.error = error ? error->description() : "";
            answer.count = valueForKey(result, "resultNumberOfEvents").asInteger().value_or(-1);
        };
    }

    Answer storeAll(const KSEventArray& events) {
        Answer answer;
        store->storeEvents(events, into(answer));
        return answer;
    }

    KSEventArray fetch(const KSEventFetchOptions& options) {
        KSEventArray fetched;
        store->fetchEventsWithOptions(options,
                                      [&fetched](KSEventArray events, const OptionalError& error) {
                                          EXPECT_FALSE(error) << error->description();
                                          fetched = std::move(events);
                                      });
        return fetched;
    }

    /// The numbers that `testUUID` made the identifiers of.
    static std::vector<int> numbersOf(const KSEventArray& events) {
        std::vector<int> numbers;
        for (const auto& event : events) {
            numbers.push_back(event->eventIdentifier().bytes[15] +
                              256 * event->eventIdentifier().bytes[14]);
        }
        return numbers;
    }

    /// Runs a statement beside the store, as a hand on the file would.
    void execute(const std::string& sql) {
        SQLite::Database database(file().string(), SQLite::OPEN_READWRITE);
        database.exec(sql);
    }

    TestPlatform platform;
    std::unique_ptr<TestUniverse> universe;
    std::shared_ptr<KSPersistenceManager> manager;
    std::shared_ptr<KSEventStore> store;
};

}  // namespace keepsakes
