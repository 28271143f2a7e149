// SPDX-License-Identifier: Apache-2.0
#include "collect/KSEventManager.h"

#include <fmt/format.h>
#include <fmt/ranges.h>

#include <algorithm>
#include <mutex>
#include <utility>

#include "collect/SourceRouting.h"
#include "core/Clock.h"
#include "core/KSAssertion.h"
#include "core/Log.h"
#include "core/Problems.h"
#include "core/ResultKeys.h"
#include "core/TaskGroup.h"
#include "model/KSExtensions.h"
#include "platform/DeviceDataIndex.h"
#include "platform/PlatformServices.h"
#include "sources/KSDiscoveryManager.h"
#include "store/Availability.h"
#include "store/KSDefaultsManager.h"
#include "store/KSEventStore.h"
#include "store/KSPersistenceManager.h"
#include "trends/KSTrendsAnalyzer.h"

namespace keepsakes {

namespace {

constexpr const char* kCollectionStartKey = "EventManagerEventCollectionStartDate";

/// What several branches of one operation report, whichever thread they end on.
class Tally {
  public:
    void add(const OptionalError& error, const KSDictionary& result) {
        const std::lock_guard lock(mutex_);
        if (error) lastError_ = error;
        total_ += valueForKey(result, kResultNumberOfEvents).asInteger().value_or(0);
        const auto failure = result.find(kSpiPurgeFailure);
        if (failure != result.end()) result_.insert_or_assign(failure->first, failure->second);
    }

    void markFailed(std::string_view successKey) {
        const std::lock_guard lock(mutex_);
        result_.insert_or_assign(std::string(successKey), false);
    }

    KSDictionary result() const {
        const std::lock_guard lock(mutex_);
        auto result = result_;
        result.insert_or_assign(std::string(kResultNumberOfEvents), total_);
        return result;
    }

    bool hasFailed(std::string_view successKey) const {
        const std::lock_guard lock(mutex_);
        return result_.contains(std::string(successKey));
    }

    OptionalError lastError() const {
        const std::lock_guard lock(mutex_);
        return lastError_;
    }

  private:
    mutable std::mutex mutex_;
    KSDictionary result_;
    std::int64_t total_ = 0;
    OptionalError lastError_;
};

/// "Workouts" of "resultWorkoutsSuccess".
std::string sourceName(std::string_view successKey) {
    constexpr std::string_view kBefore = "result";
    constexpr std::string_view kAfter = "Success";
    successKey.remove_prefix(kBefore.size());
    successKey.remove_suffix(kAfter.size());
    return std::string(successKey);
}

KSEventArray sortedAs(KSEventArray events, bool ascending) {
    std::ranges::stable_sort(events, [ascending](const auto& a, const auto& b) {
        return ascending ? a->startDate() < b->startDate() : b->startDate() < a->startDate();
    });
    return events;
}

}  // namespace

KSEventManager::KSEventManager(const PlatformServices& platform,
                               std::shared_ptr<KSDefaultsManager> defaultsManager,
                               std::shared_ptr<KSEventStore> eventStore,
                               std::unique_ptr<EventSources> sources)
    : platform_(platform),
      defaultsManager_(std::move(defaultsManager)),
      eventStore_(std::move(eventStore)),
      sources_(std::move(sources)),
      discoveryManager_(KSDiscoveryManager::initWithPlatform(platform)),
      queue_("KSEventManager"),
      refreshQueue_("KSEventManager.deviceData"),
      metricsQueue_("KSEventManager.metrics") {}

KSEventManager::~KSEventManager() = default;

std::shared_ptr<KSEventManager> KSEventManager::initWithUniverse(const ServiceLookup& universe) {
    auto defaultsManager = universe.service<KSDefaultsManager>("DefaultsManager");
    auto eventStore = universe.service<KSEventStore>("EventStore");
    const bool good =
        assertParameter(eventStore != nullptr, "eventStore", kUnit, __LINE__) &&
        assertParameter(defaultsManager != nullptr, "defaultsManager", kUnit, __LINE__);
    if (!good) return nullptr;
    return std::shared_ptr<KSEventManager>(
        new KSEventManager(universe.platform(), std::move(defaultsManager), std::move(eventStore),
                           std::make_unique<EventSources>(universe)));
}

const std::shared_ptr<KSPersistenceManager>& KSEventManager::persistenceManager() const {
    return eventStore_->persistenceManager();
}

CollectionOutcome KSEventManager::lastOutcome() const {
    const std::lock_guard lock(outcomeMutex_);
    return outcome_;
}

void KSEventManager::setProgressObserver(ProgressObserver observer) {
    refreshQueue_.sync([this, &observer] { progressObserver_ = std::move(observer); });
}

void KSEventManager::afterRefresh(std::string_view activity, Work work) {
    // Not on the manager's queue: fetches are answered while a long scan runs.
    refreshQueue_.async([this, activity = std::string(activity), work = std::move(work)] {
        platform_.deviceData->refresh([&](std::uint64_t done, std::uint64_t total) {
            if (progressObserver_) progressObserver_(activity, done, total);
        });
        queue_.async(work);
    });
}

void KSEventManager::collectEventsWithHandler(ResultHandler handler) {
    whenAvailable(
        *persistenceManager(), queue_,
        [this, handler = addingAvailability(handler)] {
            persistenceManager()->persistCollectionDate();
            afterRefresh("collect", [this, handler] { _collectEvents(handler); });
        },
        handler);
}

void KSEventManager::_collectEvents(const ResultHandler& handler) {
    const KSDate end = platform_.clock->now();
    const auto chosen = defaultsManager_->objectForKey(kCollectionStartKey).asDate();
    if (discoveryManager_) discoveryManager_->submitProximity();
    const KSDate start = chosen && *chosen <= end ? *chosen : end - kDefaultWindowSeconds;
    _collectEventsBetweenStartDate(start, end, handler);
}

void KSEventManager::collectEventsBetweenStartDate(KSDate start, KSDate end,
                                                   ResultHandler handler) {
    queue_.async([this, start, end, handler = std::move(handler)] {
        _collectEventsBetweenStartDate(start, end, handler);
    });
}

/// Into the log and, when a source failed, among what the owner should know.
void KSEventManager::tellOutcome(CollectionOutcome outcome) {
    if (outcome.failed.empty()) {
        logInfo(fmt::format("collected, {} sources answered", outcome.answered.size()));
    } else {
        const auto line = fmt::format("collected, {} sources answered, but not {}",
                                      outcome.answered.size(), fmt::join(outcome.failed, ", "));
        logWarning(line);
        platform_.problems->add(line);
    }
    const std::lock_guard lock(outcomeMutex_);
    outcome_ = std::move(outcome);
}

void KSEventManager::_collectEventsBetweenStartDate(KSDate start, KSDate end,
                                                    const ResultHandler& handler) {
    const auto tally = std::make_shared<Tally>();
    CollectionOutcome outcome;
    for (const auto& step : sources_->collectionSteps()) {
        Semaphore done;
        const auto finish = [tally, done, key = step.successKey](const OptionalError& error,
                                                                 const KSDictionary& result) {
            if (error) {
                logWarning(fmt::format("{}: {}", key, error->description()));
                tally->markFailed(key);
            } else {
                tally->add(error, result);
            }
            Semaphore(done).signal();
        };
        step.fetchAndSave(start, end, finish);
        if (!platform_.clock->wait(done, kSourceWaitSeconds)) {
            const auto error = KSError::make(KSErrorCode::waitTimedOut, "semaphore wait timeout");
            logWarning(fmt::format("{}: {}", step.successKey, error.description()));
            tally->markFailed(step.successKey);
        }
        (tally->hasFailed(step.successKey) ? outcome.failed : outcome.answered)
            .push_back(sourceName(step.successKey));
    }
    tellOutcome(std::move(outcome));
    handler(std::nullopt, tally->result());
}

void KSEventManager::storeEvents(KSEventArray events, ResultHandler handler) {
    whenAvailable(
        *persistenceManager(), queue_,
        [this, events = std::move(events), handler] { eventStore_->storeEvents(events, handler); },
        handler);
}

void KSEventManager::fetchEventsWithOptions(KSEventFetchOptions options, EventsHandler handler) {
    whenAvailable(
        *persistenceManager(), queue_,
        [this, options, handler] { _fetchEventsWithOptions(options, handler); },
        [&handler](const OptionalError& error, const KSDictionary&) { handler({}, error); });
}

void KSEventManager::_fetchEventsWithOptions(const KSEventFetchOptions& options,
                                             const EventsHandler& handler) {
    KSEventArray fetched;
    OptionalError failed;
    eventStore_->fetchEventsWithOptions(
        options, [&fetched, &failed](KSEventArray events, OptionalError error) {
            fetched = std::move(events);
            failed = std::move(error);
        });
    if (failed) {
        handler({}, failed);
        return;
    }
    // The groups come back one behind the other; the caller asked for an order.
    _rehydrateEvents(fetched, [handler, ascending = options.ascending](KSEventArray events,
                                                                       OptionalError error) {
        handler(sortedAs(std::move(events), ascending), std::move(error));
    });
}

void KSEventManager::rehydrateEvents(KSEventArray events, EventsHandler handler) {
    queue_.async([this, events = std::move(events), handler = std::move(handler)] {
        _rehydrateEvents(events, handler);
    });
}

void KSEventManager::_rehydrateEvents(const KSEventArray& events, EventsHandler handler) {
    struct Groups {
        std::mutex mutex;
        EventGroups byKey;
    };
    const auto rehydrated = std::make_shared<Groups>();
    const auto group = TaskGroup::create();
    for (const auto& [key, members] : splitEventArrayByCategory(events)) {
        group->enter();
        sources_->_rehydrateEventsBySingleSource(
            members, [rehydrated, group, key](KSEventArray filled, const OptionalError& error) {
                if (error) logWarning(fmt::format("{}: {}", key, error->description()));
                {
                    const std::lock_guard lock(rehydrated->mutex);
                    rehydrated->byKey.insert_or_assign(key, std::move(filled));
                }
                group->leave();
            });
    }
    group->notify(queue_, [rehydrated, handler = std::move(handler)] {
        handler(mergeEventArraysFromDict(rehydrated->byKey), std::nullopt);
    });
}

void KSEventManager::cleanUpEventsWithHandler(ResultHandler handler) {
    whenAvailable(
        *persistenceManager(), queue_,
        [this, handler = addingAvailability(handler)] {
            afterRefresh("purge", [this, handler] { _cleanUpEvents(handler); });
        },
        handler);
}

void KSEventManager::_cleanUpEvents(const ResultHandler& handler) {
    const auto tally = std::make_shared<Tally>();
    const auto group = TaskGroup::create();
    const auto finish = [tally, group](const OptionalError& error, const KSDictionary& result) {
        tally->add(error, result);
        group->leave();
    };
    group->enter();
    eventStore_->purgeExpiredEvents(finish);
    group->enter();
    eventStore_->purgeUnknownEvents(finish);
    group->enter();
    _purgeEventsDeletedAtSources(finish);
    group->notify(queue_, [tally, handler] { handler(tally->lastError(), tally->result()); });
}

void KSEventManager::_purgeEventsDeletedAtSources(ResultHandler handler) {
    KSEventArray stored;
    const auto tally = std::make_shared<Tally>();
    eventStore_->fetchAllEvents([&stored, &tally](KSEventArray events, const OptionalError& error) {
        stored = std::move(events);
        tally->add(error, {});
    });
    const auto group = TaskGroup::create();
    for (const auto& [key, members] : splitEventArrayByCategory(stored)) {
        group->enter();
        sources_->_purgeEventsDeletedAtSingleSource(
            members, [tally, group](const OptionalError& error, const KSDictionary& result) {
                tally->add(error, result);
                group->leave();
            });
    }
    group->notify(queue_, [tally, handler = std::move(handler)] {
        handler(tally->lastError(), tally->result());
    });
}

void KSEventManager::clearEventsWithHandler(ResultHandler handler) {
    whenAvailable(
        *persistenceManager(), queue_, [this, handler] { eventStore_->removeAllEvents(handler); },
        handler);
}

void KSEventManager::runAnalyticsWithHandler(ResultHandler handler) {
    whenAvailable(
        *persistenceManager(), queue_,
        [this, handler = addingAvailability(handler)] { _runAnalytics(handler); }, handler);
}

void KSEventManager::_runAnalytics(const ResultHandler& handler) {
    const auto analyzer = std::make_shared<KSTrendsAnalyzer>(platform_, sources_->vitalsManager());
    const auto plans = analyzer->buildAnalyticsPlans();
    if (plans.empty()) {
        handler(KSError::make(KSErrorCode::analyticsPlansUnavailable,
                              "Analytics Plans are not avaialble"),
                {});
        return;
    }
    const KSDateInterval window{plans.front()->trainDateInterval.start,
                                plans.front()->testDateInterval.end};
    fetchEventsWithOptions(
        {.dateInterval = window, .ascending = true},
        [this, analyzer, plans, handler](const KSEventArray& events, const OptionalError& error) {
            if (error) {
                handler(error, {});
                return;
            }
            analyzer->analyzeEvents(
                events, plans, [&](const KSEventArray& trends, const KSDictionary&) {
                    eventStore_->storeEvents(trends, handler);
                    metricsQueue_.async(
                        [analyzer, trends] { analyzer->sendMetricsForTrendsEvents(trends); });
                });
        });
}

KSEventManager::EventGroups KSEventManager::splitEventArrayByCategory(const KSEventArray& events) {
    EventGroups groups;
    for (const auto& event : events) {
        groups[fmt::format("{}:{}", event->describeCategory(), event->describeProvider())]
            .push_back(event);
    }
    return groups;
}

KSEventArray KSEventManager::mergeEventArraysFromDict(const EventGroups& groups) {
    KSEventArray merged;
    for (const auto& [key, members] : groups) {
        merged.insert(merged.end(), members.begin(), members.end());
    }
    return merged;
}

}  // namespace keepsakes
