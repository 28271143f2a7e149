// SPDX-License-Identifier: Apache-2.0
#include "sources/KSForesightTravelManager.h"

#include <fmt/format.h>
#include <fmt/ranges.h>

#include <algorithm>
#include <iterator>
#include <optional>
#include <utility>

#include "core/Clock.h"
#include "core/KSAssertion.h"
#include "core/MurmurHash3.h"
#include "model/KSExtensions.h"
#include "platform/PlatformServices.h"
#include "sources/AlmanacCoding.h"
#include "sources/IdentifiedEvents.h"
#include "sources/Lifetimes.h"
#include "sources/ProfileItems.h"
#include "store/KSEventStore.h"

namespace keepsakes {

KSForesightTravelManager::KSForesightTravelManager(ProfileEventStore& profileStore,
                                                   std::shared_ptr<KSEventStore> keepsakeStore,
                                                   Clock& clock)
    : profileStore_(profileStore),
      keepsakeStore_(std::move(keepsakeStore)),
      clock_(clock),
      queue_("KSForesightTravelManager") {}

std::shared_ptr<KSForesightTravelManager> KSForesightTravelManager::initWithUniverse(
    const ServiceLookup& universe) {
    const auto& platform = universe.platform();
    return initWithProfileStore(platform.profileEventStore,
                                universe.service<KSEventStore>("EventStore"), *platform.clock);
}

std::shared_ptr<KSForesightTravelManager> KSForesightTravelManager::initWithProfileStore(
    ProfileEventStore* profileStore, std::shared_ptr<KSEventStore> keepsakeStore, Clock& clock) {
    if (!assertParameter(keepsakeStore != nullptr, "keepsakeStore", kUnit, 48)) return nullptr;
    if (!profileStore) return nullptr;
    return std::shared_ptr<KSForesightTravelManager>(
        new KSForesightTravelManager(*profileStore, std::move(keepsakeStore), clock));
}

void KSForesightTravelManager::fetchTripsBetweenStartDate(KSDate start, KSDate end,
                                                          TripsHandler handler) {
    queue_.async([this, start, end, handler = std::move(handler)] {
        const auto trips = profileItems<Trip>(profileStore_, TripEventQuery{start, end});
        if (trips) handler(*trips);
    });
}

std::shared_ptr<KSEvent> KSForesightTravelManager::createEventFromTrip(const Trip& trip) const {
    const KSDate now = clock_.now();
    auto event =
        KSEvent::initWithEventIdentifier(KSUUID::random(), trip.startDate, trip.endDate, now,
                                         KSEventProvider::foresight, KSEventCategory::travel);
    event->expirationDate = now + lifetime::kFourWeeks;
    event->identifierFromProvider = _providerIdOfTrip(trip);
    return event;
}

std::string KSForesightTravelManager::_providerIdOfTrip(const Trip& trip) {
    std::vector<std::string> parts;
    parts.reserve(trip.tripParts.size());
    for (const auto& part : trip.tripParts) {
        parts.push_back(fmt::format("{}", fmt::join(part.eventIdentifiers, ":")));
    }
    return identifierHash(fmt::format("{}", fmt::join(parts, "|")));
}

void KSForesightTravelManager::saveTrips(const Trips& trips, const ResultHandler& handler) {
    KSDate earliest = KSDate::distantFuture();
    for (const auto& trip : trips) earliest = std::min(earliest, trip.startDate);
    const auto stored = storedIdentifiers(*keepsakeStore_, earliest, KSEventCategory::travel);
    if (!stored) {
        handler(stored.error(), {});
        return;
    }
    KSEventArray fresh;
    for (const auto& trip : trips) {
        if (!stored->contains(_providerIdOfTrip(trip))) fresh.push_back(createEventFromTrip(trip));
    }
    keepsakeStore_->storeEvents(fresh, handler);
}

void KSForesightTravelManager::fetchAndSaveTripsBetweenStartDate(KSDate start, KSDate end,
                                                                 ResultHandler handler) {
    fetchTripsBetweenStartDate(
        start, end,
        [this, handler = std::move(handler)](const Trips& trips) { saveTrips(trips, handler); });
}

std::optional<KSForesightTravelManager::TripIndex> KSForesightTravelManager::tripsOfEvents(
    const KSEventArray& events) {
    const auto span = KSExtensions::getDurationOfKSEventArray(events);
    if (!span) return std::nullopt;
    const auto index = std::make_shared<std::optional<TripIndex>>();
    fetchTripsBetweenStartDate(span->start, span->end, [index](const Trips& trips) {
        index->emplace();
        for (const auto& trip : trips) (*index)->insert_or_assign(_providerIdOfTrip(trip), trip);
    });
    waitForQueueEmpty();
    return std::move(*index);
}

KSEventArray KSForesightTravelManager::rehydratedTripEvents(const KSEventArray& events) {
    KSEventArray refreshed;
    const auto trips = tripsOfEvents(events);
    if (!trips) return refreshed;
    forEachFoundIn(*trips, events, [&refreshed](const KSEvent& event, const Trip& trip) {
        auto filled = event.copy();
        // The narrow copy drops it, and a client that stores back what it fetched must not lose it.
        filled->identifierFromProvider = event.identifierFromProvider;
        filled->tripTitle = trip.title;
        if (!trip.tripParts.empty()) {
            auto& parts = filled->tripParts.emplace();
            std::ranges::transform(trip.tripParts, std::back_inserter(parts), encodeTripPart);
        }
        refreshed.push_back(std::move(filled));
    });
    return refreshed;
}

void KSForesightTravelManager::removeTripEventsDeletedAtSource(const KSEventArray& events,
                                                               const ResultHandler& handler) {
    _removeTripEventsDeletedAtSource(events, handler);
}

void KSForesightTravelManager::_removeTripEventsDeletedAtSource(const KSEventArray& events,
                                                                const ResultHandler& handler) {
    const auto trips = tripsOfEvents(events);
    if (!trips) {
        handler(std::nullopt, {});
        return;
    }
    keepsakeStore_->removeEvents(eventsMissingIn(*trips, events), handler);
}

void KSForesightTravelManager::waitForQueueEmpty() {
    queue_.sync([] {});
}

}  // namespace keepsakes
