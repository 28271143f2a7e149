// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <memory>
#include <string_view>
#include <vector>

#include "core/KSError.h"
#include "core/ServiceLookup.h"
#include "core/WorkQueue.h"
#include "model/KSEvent.h"
#include "platform/RoutineService.h"

namespace keepsakes {

class Clock;
class KSEventStore;

/// Turns the visits that the routine service has found into events, refreshes what the database
/// does not keep of them, and removes those that the service no longer has. Keeps nothing between
/// calls: what is new, the store tells. Owned by the registry as "RoutineServiceManager"; any
/// thread may call it. Work and handlers run on its queue, but for a mode, which is answered on the
/// service's thread.
class KSRoutineServiceManager final : public KSService {
  public:
    using VisitArray = std::vector<RoutineVisit>;
    using LocationArray = std::vector<LocationOfInterest>;
    using VisitsHandler = std::function<void(VisitArray, OptionalError)>;
    using ModeHandler = std::function<void(KSPlaceMode, OptionalError)>;
    using EventsHandler = std::function<void(KSEventArray, OptionalError)>;

    /// Needs "EventStore".
    static std::shared_ptr<KSRoutineServiceManager> initWithUniverse(const ServiceLookup& universe);

    /// The whole visits of five minutes and more that overlap the window, by entry.
    void fetchVisitBetweenStartDate(KSDate start, KSDate end, VisitsHandler handler);
    /// On the manager's queue only.
    void _fetchVisitBetweenStartDate(KSDate start, KSDate end, VisitsHandler handler);

    /// Stores an event for each visit that began after the newest stored one, or after the start
    /// where none is stored since.
    void fetchAndSaveVisitsBetweenStartDate(KSDate start, KSDate end, ResultHandler handler);

    /// A new event without its mode; one without end ends now. Nothing for a visit without entry.
    std::shared_ptr<KSEvent> createEventFromVisit(const RoutineVisit& visit,
                                                  const LocationArray& lois) const;
    static void _setDynamicProperties(KSEvent& event, const RoutineVisit& visit,
                                      const LocationArray& lois);
    /// Unknown beside an error, and for codes that are no mode.
    void fetchModeForVisit(const RoutineVisit& visit, ModeHandler handler);

    /// Copies of the events with their place's properties fresh; events whose visit is gone are
    /// missing.
    void rehydrateVisits(KSEventArray events, EventsHandler handler);
    /// Removes the events whose visit is gone; none when the service fails.
    void removeVisitsDeletedAtSource(KSEventArray events, ResultHandler handler);

    /// The visit that the event was made of; `visits` are by entry. Nothing when there is none.
    static const RoutineVisit* findMatchingVisitFor(const KSEvent& event, const VisitArray& visits);

  private:
    static constexpr std::string_view kUnit = "KSRoutineServiceManager";

    struct Fetched;

    KSRoutineServiceManager(RoutineService& routineManager, Clock& clock,
                            std::shared_ptr<KSEventStore> eventStore);

    void _fetchAndSaveVisitsBetweenStartDate(KSDate start, KSDate end, ResultHandler handler);
    void fetchVisitsAndLocations(KSDate start, KSDate end,
                                 std::function<void(const Fetched&)> handler);
    /// The distant past when none is stored.
    KSDate startOfNewestVisit() const;
    void saveVisits(const Fetched& fetched, KSDate after, ResultHandler handler);
    void _rehydrateVisits(const KSEventArray& events, EventsHandler handler);
    void _removeVisitsDeletedAtSource(KSEventArray events, ResultHandler handler);

    RoutineService& routineManager_;
    Clock& clock_;
    const std::shared_ptr<KSEventStore> eventStore_;
    WorkQueue queue_;
};

}  // namespace keepsakes
