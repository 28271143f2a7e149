// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

#include "core/KSError.h"
#include "core/ServiceLookup.h"
#include "core/WorkQueue.h"
#include "model/KSEvent.h"
#include "model/KSEventFetchOptions.h"

namespace keepsakes {

class EventSources;
class KSDefaultsManager;
class KSDiscoveryManager;
class KSEventStore;
class KSPersistenceManager;
struct PlatformServices;

/// Which sources a collection could read, by the names in the keys of its result: "Workouts" of
/// "resultWorkoutsSuccess". In the order of collection.
struct CollectionOutcome {
    std::vector<std::string> answered;
    std::vector<std::string> failed;
};

/// The collection pipeline: asks each source in turn to fetch and save a window's events, cleans
/// the store, and answers fetches with what the database does not keep filled in again from the
/// sources. Owned by the registry as "EventManager"; any thread may call it. The work runs on its
/// queue, which a collection holds while it waits for the sources. Handlers are called once, on
/// that queue or a source's.
///
/// Each operation first checks the database; without one it answers error 16 and
/// {"stateDatabaseAvailable": false} and does nothing.
class KSEventManager final : public KSService {
  public:
    using EventsHandler = std::function<void(KSEventArray, OptionalError)>;
    using EventGroups = std::map<std::string, KSEventArray>;
    /// Told how far the scan of the owner's files is, while a collection or a purge waits for it.
    using ProgressObserver =
        std::function<void(std::string_view activity, std::uint64_t done, std::uint64_t total)>;

    static constexpr double kSourceWaitSeconds = 120;
    static constexpr double kDefaultWindowSeconds = 259200;  ///< Three days.

    /// Needs "DefaultsManager" and "EventStore"; works with the sources that are registered.
    static std::shared_ptr<KSEventManager> initWithUniverse(const ServiceLookup& universe);
    ~KSEventManager() override;

    /// Brings the index of the owner's files up to date, then collects from the start date in the
    /// defaults store, when there is one that is not in the future, or else from three days ago.
    /// Nearby devices are counted meanwhile, where the owner wants that; nothing waits for it.
    void collectEventsWithHandler(ResultHandler handler);
    void collectEventsBetweenStartDate(KSDate start, KSDate end, ResultHandler handler);
    void storeEvents(KSEventArray events, ResultHandler handler);
    void fetchEventsWithOptions(KSEventFetchOptions options, EventsHandler handler);
    void rehydrateEvents(KSEventArray events, EventsHandler handler);
    /// Removes what expired, what is of unknown kind and what was deleted at its source.
    void cleanUpEventsWithHandler(ResultHandler handler);
    void clearEventsWithHandler(ResultHandler handler);
    /// Looks for trends in the last four weeks of events and stores what it finds as events, whose
    /// metrics follow later. Error 5 when there is no plan to follow.
    void runAnalyticsWithHandler(ResultHandler handler);

    void setProgressObserver(ProgressObserver observer);

    /// Groups under "<category>:<provider>", each in input order; and back.
    static EventGroups splitEventArrayByCategory(const KSEventArray& events);
    static KSEventArray mergeEventArraysFromDict(const EventGroups& groups);

    const std::shared_ptr<KSPersistenceManager>& persistenceManager() const;

    /// Of the last collection that ended; empty before.
    CollectionOutcome lastOutcome() const;

  private:
    static constexpr std::string_view kUnit = "KSEventManager";

    KSEventManager(const PlatformServices& platform,
                   std::shared_ptr<KSDefaultsManager> defaultsManager,
                   std::shared_ptr<KSEventStore> eventStore, std::unique_ptr<EventSources> sources);

    using Work = std::function<void()>;
    void afterRefresh(std::string_view activity, Work work);
    void _fetchEventsWithOptions(const KSEventFetchOptions& options, const EventsHandler& handler);
    void _collectEvents(const ResultHandler& handler);
    void _collectEventsBetweenStartDate(KSDate start, KSDate end, const ResultHandler& handler);
    void tellOutcome(CollectionOutcome outcome);
    void _runAnalytics(const ResultHandler& handler);
    void _cleanUpEvents(const ResultHandler& handler);
    void _purgeEventsDeletedAtSources(ResultHandler handler);
    void _rehydrateEvents(const KSEventArray& events, EventsHandler handler);

    const PlatformServices& platform_;
    const std::shared_ptr<KSDefaultsManager> defaultsManager_;
    const std::shared_ptr<KSEventStore> eventStore_;
    const std::unique_ptr<EventSources> sources_;
    const std::shared_ptr<KSDiscoveryManager> discoveryManager_;  ///< Where devices are counted.
    ProgressObserver progressObserver_;                           // only on refreshQueue_
    mutable std::mutex outcomeMutex_;
    CollectionOutcome outcome_;  // guarded by outcomeMutex_
    WorkQueue queue_;
    WorkQueue refreshQueue_;  // waits for the scan of the owner's files
    WorkQueue metricsQueue_;  // waits for the owner's age and sex
};

}  // namespace keepsakes
