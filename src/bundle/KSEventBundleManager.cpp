// SPDX-License-Identifier: Apache-2.0
#include "bundle/KSEventBundleManager.h"

#include <algorithm>
#include <array>
#include <iterator>
#include <unordered_set>
#include <utility>

#include "bundle/KSEventBundleStore.h"
#include "bundle/PromptLanguage.h"
#include "collect/KSEventManager.h"
#include "core/Clock.h"
#include "core/KSAssertion.h"
#include "core/KSDate.h"
#include "core/ResultKeys.h"
#include "platform/PlatformServices.h"
#include "store/Availability.h"
#include "store/KSPersistenceManager.h"

namespace keepsakes {

namespace {

constexpr double kStoredWindow = 7 * kDay;
constexpr double kRecently = 3 * kDay;
constexpr std::array kWindows = {28 * kDay, 21 * kDay, 14 * kDay, kStoredWindow,
                                 3 * kDay,  2 * kDay,  kDay,      10800.0};

/// Events that lie wholly inside the window.
KSEventArray eventsWithin(const KSEventArray& events, KSDate start, KSDate end) {
    KSEventArray inside;
    std::ranges::copy_if(events, std::back_inserter(inside), [start, end](const auto& event) {
        return event->startDate() >= start && event->endDate() <= end;
    });
    return inside;
}

KSEventBundleArray valuesOf(const KSEventBundler::Bundles& bundles) {
    KSEventBundleArray values;
    for (const auto& [key, bundle] : bundles) values.push_back(bundle);
    return values;
}

}  // namespace

KSEventBundleManager::KSEventBundleManager(Clock& clock,
                                           std::shared_ptr<KSEventBundleStore> eventBundleStore,
                                           std::shared_ptr<KSEventManager> eventManager)
    : clock_(clock),
      eventBundleStore_(std::move(eventBundleStore)),
      eventManager_(std::move(eventManager)),
      queue_("KSEventBundleManager") {}

std::shared_ptr<KSEventBundleManager> KSEventBundleManager::initWithUniverse(
    const ServiceLookup& universe) {
    auto store = universe.service<KSEventBundleStore>("EventBundleStore");
    auto manager = universe.service<KSEventManager>("EventManager");
    const bool good = assertParameter(store != nullptr, "eventBundleStore", kUnit, __LINE__) &&
                      assertParameter(manager != nullptr, "eventManager", kUnit, __LINE__);
    if (!good) return nullptr;
    return std::shared_ptr<KSEventBundleManager>(
        new KSEventBundleManager(*universe.platform().clock, std::move(store), std::move(manager)));
}

void KSEventBundleManager::bundleEventsWithHandler(ResultHandler handler) {
    whenAvailable(
        *eventBundleStore_->persistenceManager(), queue_,
        [this, handler = addingAvailability(handler)] { _bundleEvents(handler); }, handler);
}

void KSEventBundleManager::_bundleEvents(const ResultHandler& handler) {
    const KSDate now = clock_.now();
    const auto collected = eventBundleStore_->persistenceManager()->getCollectionDate();
    const bool collectedRecently = collected && now - *collected <= kRecently;
    const double lookBack = *std::ranges::max_element(kWindows);
    const KSEventFetchOptions options{.dateInterval = KSDateInterval{now - lookBack, now},
                                      .ascending = true};
    eventManager_->fetchEventsWithOptions(
        options, [this, now, collectedRecently, handler](KSEventArray events, OptionalError error) {
            if (events.empty()) {
                handler(std::move(error), {});
                return;
            }
            queue_.async([this, now, collectedRecently, handler, events = std::move(events)] {
                bundleFetchedEvents(events, now, collectedRecently, handler);
            });
        });
}

void KSEventBundleManager::bundleFetchedEvents(const KSEventArray& events, KSDate now,
                                               bool collectedRecently,
                                               const ResultHandler& handler) {
    OptionalError failed;
    KSDictionary result;
    for (const double window : kWindows) {
        const bool stores = window == kStoredWindow;
        if (!stores && !collectedRecently) continue;
        _bundleEventsWithStartDate(
            now - window, now, eventsWithin(events, now - window, now), stores, collectedRecently,
            [&](OptionalError error, const KSDictionary& stepResult) {
                if (!stores) return;
                failed = std::move(error);
                const auto count = stepResult.find(kResultNumberOfBundleEvents);
                if (count != stepResult.end()) result.insert(*count);
            });
    }
    if (collectedRecently && metrics_.submitKSEventData) {
        const KSDate start = now - 3 * kDay;
        const KSDate end = now - 2 * kDay;
        metrics_.submitKSEventData(eventsWithin(events, start, end), start, end, now);
    }
    if (!failed) result.insert_or_assign(std::string(kResultNumberOfEvents), events.size());
    handler(std::move(failed), std::move(result));
}

void KSEventBundleManager::_bundleEventsWithStartDate(KSDate start, KSDate end, KSEventArray events,
                                                      bool storeBundle, bool submitMetricsFlg,
                                                      const ResultHandler& handler) {
    const bool submits = submitMetricsFlg && metrics_.submitMetricForEventBundle;
    if (!storeBundle && !submits) return;
    const KSDate now = clock_.now();
    const auto bundler = KSEventBundler::initWithStartDate(start, end, now);
    const auto clusters = bundler->calculateEventBundlesFromEvents(events);
    if (enableSemanticPruning_) bundler->pruneEventBundles(clusters);
    const auto& ruleBundles = bundler->returnCurrentEventBundles();
    if (storeBundle) {
        const auto clusterBundles = getUnfilteredEventBundleFrom(clusters, ruleBundles, now);
        for (const auto* bundles : {&ruleBundles, &clusterBundles}) {
            for (const auto& [key, bundle] : *bundles) {
                bundle->promptLanguage = promptLanguageOf(*bundle);
            }
        }
        auto bundles = valuesOf(ruleBundles);
        std::ranges::move(valuesOf(clusterBundles), std::back_inserter(bundles));
        saveEventBundles(bundles, start, end, handler);
    }
    if (submits) metrics_.submitMetricForEventBundle(end - start, events, clusters, ruleBundles);
}

KSEventBundler::Bundles KSEventBundleManager::getUnfilteredEventBundleFrom(
    const KSEventBundler::Clusters& clusters, const KSEventBundler::Bundles& ruleBundles,
    KSDate now) {
    // By each of their events: a rule bundle of the same events holds the cluster's first one too.
    std::multimap<KSUUID, const KSEventBundle*> byMember;
    for (const auto& [number, bundle] : ruleBundles) {
        for (const auto& event : bundle->events) {
            byMember.emplace(event->eventIdentifier(), bundle.get());
        }
    }
    KSEventBundler::Bundles kept;
    for (const auto& [label, events] : clusters) {
        auto bundle = KSEventBundle::initWithEventSet(events, false, now);
        const auto [first, last] = byMember.equal_range(events.front()->eventIdentifier());
        const bool repeatsRule = std::any_of(first, last, [&bundle](const auto& entry) {
            return bundle->containTheSameEventSet(*entry.second);
        });
        if (!repeatsRule) kept.emplace(label, std::move(bundle));
    }
    return kept;
}

void KSEventBundleManager::saveEventBundles(const KSEventBundleArray& bundles, KSDate start,
                                            KSDate end, const ResultHandler& handler) {
    std::unordered_set<KSUUID> newMembers;
    for (const auto& bundle : bundles) {
        for (const auto& event : bundle->events) newMembers.insert(event->eventIdentifier());
    }
    KSEventBundleArray replaced;
    OptionalError failed;
    eventBundleStore_->fetchEventBundleWithOptions(
        {.dateInterval = KSDateInterval{start, end}, .ascending = true},
        [&](const KSEventBundleArray& stored, OptionalError error) {
            failed = std::move(error);
            std::ranges::copy_if(stored, std::back_inserter(replaced), [&](const auto& bundle) {
                return std::ranges::any_of(bundle->events, [&](const auto& event) {
                    return newMembers.contains(event->eventIdentifier());
                });
            });
        });
    KSDictionary result;
    if (!failed) {
        eventBundleStore_->storeEventBundles(bundles,
                                             [&](OptionalError error, KSDictionary stored) {
                                                 failed = std::move(error);
                                                 result = std::move(stored);
                                             });
    }
    // Old bundles go only once their successors are on disk.
    if (!failed) {
        eventBundleStore_->removeEventBundles(
            replaced, [&](OptionalError error, const KSDictionary&) { failed = std::move(error); });
    }
    handler(std::move(failed), std::move(result));
}

void KSEventBundleManager::fetchEventBundlesWithOptions(KSEventBundleFetchOptions options,
                                                        BundlesHandler handler) {
    whenAvailable(
        *eventBundleStore_->persistenceManager(), queue_,
        [this, options, handler] { _fetchEventBundlesWithOptions(options, handler); },
        [&handler](OptionalError error, KSDictionary result) {
            handler({}, std::move(error), std::move(result));
        });
}

void KSEventBundleManager::_fetchEventBundlesWithOptions(const KSEventBundleFetchOptions& options,
                                                         const BundlesHandler& handler) {
    const auto answer = [handler](KSEventBundleArray bundles, OptionalError error,
                                  const KSDictionary&) {
        KSDictionary result{{std::string(kStateDatabaseAvailable), true},
                            {std::string(kResultNumberOfBundleEvents), bundles.size()}};
        handler(std::move(bundles), std::move(error), std::move(result));
    };
    KSEventBundleArray stored;
    OptionalError failed;
    eventBundleStore_->fetchEventBundleWithOptions(
        options, [&stored, &failed](KSEventBundleArray bundles, OptionalError error) {
            stored = std::move(bundles);
            failed = std::move(error);
        });
    if (failed) {
        answer({}, std::move(failed), {});
        return;
    }
    _rehydrateEventBundles(stored, answer);
}

void KSEventBundleManager::_rehydrateEventBundles(const KSEventBundleArray& bundles,
                                                  const BundlesHandler& handler) {
    KSEventArray members;
    std::unordered_set<KSUUID> gathered;
    for (const auto& bundle : bundles) {
        for (const auto& event : bundle->events) {
            if (gathered.insert(event->eventIdentifier()).second) members.push_back(event);
        }
    }
    eventManager_->rehydrateEvents(
        std::move(members), [bundles, handler](const KSEventArray& events, OptionalError error) {
            std::map<KSUUID, KSEventPointer> rehydrated;
            for (const auto& event : events) rehydrated.emplace(event->eventIdentifier(), event);
            KSEventBundleArray filled;
            for (const auto& bundle : bundles) {
                auto copy = std::make_shared<KSEventBundle>(*bundle);
                copy->events = findRehydrateEvents(rehydrated, *bundle);
                filled.push_back(std::move(copy));
            }
            handler(std::move(filled), std::move(error), {});
        });
}

KSEventArray KSEventBundleManager::findRehydrateEvents(
    const std::map<KSUUID, KSEventPointer>& rehydrated, const KSEventBundle& bundle) {
    KSEventArray found;
    for (const auto& event : bundle.events) {
        const auto fresh = rehydrated.find(event->eventIdentifier());
        if (fresh != rehydrated.end()) found.push_back(fresh->second);
    }
    return found;
}

void KSEventBundleManager::cleanUpEventBundlesWithHandler(ResultHandler handler) {
    whenAvailable(
        *eventBundleStore_->persistenceManager(), queue_,
        [this, handler = addingAvailability(handler)] {
            eventBundleStore_->purgeExpiredEventBundles(handler);
        },
        handler);
}

}  // namespace keepsakes
