// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "core/KSError.h"
#include "core/ServiceLookup.h"
#include "core/WorkQueue.h"
#include "model/KSEvent.h"
#include "platform/ProfileEventStore.h"

namespace keepsakes {

class Clock;
class KSEventStore;

/// Turns the trips that the personal profile service has put together into events. Owned by the
/// registry as "ForesightTravelManager"; trips are asked for on its queue, everything else happens
/// on the caller's thread. Its operations may be called from any thread, those that wait for the
/// queue from any but its own.
class KSForesightTravelManager final : public KSService {
  public:
    using Trips = std::vector<Trip>;
    using TripsHandler = std::function<void(const Trips&)>;

    /// Needs "EventStore".
    static std::shared_ptr<KSForesightTravelManager> initWithUniverse(
        const ServiceLookup& universe);
    /// A missing event store fails the assertion; a missing profile store yields nothing.
    static std::shared_ptr<KSForesightTravelManager> initWithProfileStore(
        ProfileEventStore* profileStore, std::shared_ptr<KSEventStore> keepsakeStore, Clock& clock);

    /// The trips of the dates, on the queue. After an error of the store the handler is not called
    /// at all.
    void fetchTripsBetweenStartDate(KSDate start, KSDate end, TripsHandler handler);
    std::shared_ptr<KSEvent> createEventFromTrip(const Trip& trip) const;

    /// Stores what is not stored yet; calls the handler before it returns.
    void saveTrips(const Trips& trips, const ResultHandler& handler);
    /// Calls the handler on the queue, or not at all when the profile store fails.
    void fetchAndSaveTripsBetweenStartDate(KSDate start, KSDate end, ResultHandler handler);

    /// Copies with title and parts filled in; an event without a trip any more is left out.
    KSEventArray rehydratedTripEvents(const KSEventArray& events);

    /// Removes the events whose trip is gone, unless the profile store fails. Calls the handler
    /// before it returns.
    void removeTripEventsDeletedAtSource(const KSEventArray& events, const ResultHandler& handler);

    void waitForQueueEmpty();

  private:
    static constexpr std::string_view kUnit = "KSForesightTravelManager";

    KSForesightTravelManager(ProfileEventStore& profileStore,
                             std::shared_ptr<KSEventStore> keepsakeStore, Clock& clock);

    void _removeTripEventsDeletedAtSource(const KSEventArray& events, const ResultHandler& handler);
    static std::string _providerIdOfTrip(const Trip& trip);

    using TripIndex = std::unordered_map<std::string, Trip>;
    /// The trips of the events' time by identifier; nothing when they could not be asked for.
    std::optional<TripIndex> tripsOfEvents(const KSEventArray& events);

    ProfileEventStore& profileStore_;
    const std::shared_ptr<KSEventStore> keepsakeStore_;
    Clock& clock_;
    WorkQueue queue_;
};

}  // namespace keepsakes
