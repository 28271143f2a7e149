// SPDX-License-Identifier: Apache-2.0
// A trends run over 28 days and 10,000 events, beside fetching those events from the store.
#include <memory>

#include "Bench.h"
#include "collect/KSEventManager.h"
#include "core/Log.h"
#include "model/KSExtensions.h"
#include "notify/KSTocsinNotifier.h"
#include "sources/KSVitalsManager.h"
#include "store/KSDefaultsManager.h"
#include "store/KSEventStore.h"
#include "store/KSPersistenceManager.h"
#include "support/TestEvents.h"
#include "support/TestPlatform.h"
#include "trends/AnalyticsPlans.h"
#include "trends/KSTrendsAnalyzer.h"

namespace {

using namespace keepsakes;

constexpr std::uint32_t kEvents = 10000;
constexpr int kRuns = 5;

/// The daemon's part of it, on a file of its own.
struct Daemon {
    Daemon() {
        setLogLevel(LogLevel::off);
        universe.add("TocsinNotifier",
                     std::make_shared<KSTocsinNotifier>("TocsinNotifier", platform.services));
        universe.add("PersistenceManager", KSPersistenceManager::initWithUniverse(universe));
        store = KSEventStore::initWithUniverse(universe);
        universe.add("EventStore", store);
        universe.add("DefaultsManager", std::make_shared<KSDefaultsManager>(platform.defaults));
        universe.add("VitalsManager", KSVitalsManager::initWithUniverse(universe));
        manager = KSEventManager::initWithUniverse(universe);
        WorkerThreads::shared().settle();
    }
    TestPlatform platform;
    TestUniverse universe{platform.services};
    std::shared_ptr<KSEventStore> store;
    std::shared_ptr<KSEventManager> manager;
};

/// Evenly over the interval.
template <class Make>
KSEventArray eventsWithin(const KSDateInterval& interval, const Make& make) {
    KSEventArray events;
    for (std::uint32_t number = 0; number < kEvents; ++number) {
        const double start = interval.start.seconds + interval.duration() * number / kEvents;
        events.push_back(make(number, start, start + 60 + number % 600));
    }
    return events;
}

}  // namespace

int main() {
    Daemon daemon;
    const auto plans = analyticsPlansAt(daemon.platform.clock.now());
    const KSDateInterval window{plans.front()->trainDateInterval.start,
                                plans.front()->testDateInterval.end};
    const auto workouts = eventsWithin(window, [](std::uint32_t number, double start, double end) {
        return makeWorkout(number, start, end, "Running");
    });
    const auto report = [](const OptionalError& error, const KSDictionary&) {
        if (error) fmt::print("error: {}\n", error->description());
    };
    daemon.store->storeEvents(workouts, report);

    const double fetch = bench::bestMilliseconds(kRuns, [&] {
        daemon.store->fetchEventsWithOptions({.dateInterval = window, .ascending = true},
                                             [](const KSEventArray& events, const OptionalError&) {
                                                 if (events.size() < kEvents)
                                                     fmt::print("only {} events\n", events.size());
                                             });
    });
    const double run = bench::bestMilliseconds(kRuns, [&] {
        daemon.manager->runAnalyticsWithHandler(report);
        WorkerThreads::shared().settle();
    });
    bench::report("trends run over 10,000 events / fetching them", run, fetch, 5);

    // What the store does not keep of visits their source fills in again, so they are made here.
    const auto visits = eventsWithin(window, [](std::uint32_t number, double start, double end) {
        auto visit = makeVisit(number, start, end, "Office");
        visit->placeUserType = 2;
        return visit;
    });
    const KSTrendsAnalyzer analyzer(daemon.platform.services, nullptr);
    const double analysis = bench::bestMilliseconds(kRuns, [&] {
        analyzer.analyzeEvents(visits, plans, [](const KSEventArray&, const KSDictionary&) {});
    });
    bench::report("analysis of 10,000 work visits / fetching as many events", analysis, fetch, 5);
    return 0;
}
