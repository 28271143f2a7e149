// SPDX-License-Identifier: Apache-2.0
#include "sources/KSSuggestedEventManager.h"

#include <algorithm>
#include <iterator>
#include <unordered_set>
#include <utility>

#include "core/Clock.h"
#include "core/KSAssertion.h"
#include "core/Log.h"
#include "model/KSExtensions.h"
#include "platform/CalendarService.h"
#include "platform/PlatformServices.h"
#include "sources/AlmanacCoding.h"
#include "sources/IdentifiedEvents.h"
#include "sources/Lifetimes.h"
#include "sources/ProfileItems.h"
#include "store/KSEventStore.h"

namespace keepsakes {

KSSuggestedEventManager::KSSuggestedEventManager(ProfileEventStore& profileStore,
                                                 CalendarService& calendars,
                                                 std::shared_ptr<KSEventStore> keepsakeStore,
                                                 Clock& clock)
    : profileStore_(profileStore),
      calendars_(calendars),
      keepsakeStore_(std::move(keepsakeStore)),
      clock_(clock),
      queue_("KSSuggestedEventManager") {}

KSSuggestedEventManager::~KSSuggestedEventManager() = default;

std::shared_ptr<KSSuggestedEventManager> KSSuggestedEventManager::initWithUniverse(
    const ServiceLookup& universe) {
    const auto& platform = universe.platform();
    return initWithProfileStore(platform.profileEventStore, platform.calendars,
                                universe.service<KSEventStore>("EventStore"), *platform.clock);
}

std::shared_ptr<KSSuggestedEventManager> KSSuggestedEventManager::initWithProfileStore(
    ProfileEventStore* profileStore, CalendarService* calendars,
    std::shared_ptr<KSEventStore> keepsakeStore, Clock& clock) {
    if (!assertParameter(keepsakeStore != nullptr, "keepsakeStore", kUnit, 62)) return nullptr;
    if (!profileStore || !calendars) return nullptr;
    return std::shared_ptr<KSSuggestedEventManager>(
        new KSSuggestedEventManager(*profileStore, *calendars, std::move(keepsakeStore), clock));
}

void KSSuggestedEventManager::_fetchTripsBetweenStartDate(
    KSDate start, KSDate end, std::function<void(const Trips&)> handler) {
    queue_.async([this, start, end, handler = std::move(handler)] {
        const auto trips = profileItems<Trip>(profileStore_, TripEventQuery{start, end});
        if (trips) handler(*trips);
    });
}

void KSSuggestedEventManager::fetchSuggestedEventBetweenStartDate(
    KSDate start, KSDate end, std::function<void(const SuggestedEvents&)> handler) {
    queue_.async([this, start, end, handler = std::move(handler)] {
        const auto suggested =
            profileItems<SuggestedEvent>(profileStore_, SuggestedEventQuery{start, end});
        if (suggested) handler(*suggested);
    });
}

std::shared_ptr<KSEvent> KSSuggestedEventManager::createEventFromSuggestedEvent(
    const SuggestedEvent& suggested) const {
    if (!suggested.eventIdentifier) return nullptr;
    const KSDate now = clock_.now();
    const auto category = suggested.category == SuggestionCategory::naturalLanguage
                              ? KSEventCategory::socialEvent
                              : KSEventCategory::structuredEvent;
    auto event =
        KSEvent::initWithEventIdentifier(KSUUID::random(), suggested.startDate, suggested.endDate,
                                         now, KSEventProvider::foresight, category);
    event->suggestedEventIdentifier = suggested.eventIdentifier;
    event->identifierFromProvider = suggested.eventIdentifier;
    event->expirationDate = now + lifetime::kFourWeeks;
    return event;
}

void KSSuggestedEventManager::saveSuggestedEvents(const SuggestedEvents& suggested,
                                                  const ResultHandler& handler) {
    KSDate earliest = KSDate::distantFuture();
    for (const auto& one : suggested) earliest = std::min(earliest, one.startDate);
    std::unordered_set<std::string> stored;
    for (const auto category : {KSEventCategory::structuredEvent, KSEventCategory::socialEvent}) {
        // A fetch that fails contributes nothing.
        if (auto found = storedIdentifiers(*keepsakeStore_, earliest, category)) {
            stored.merge(*found);
        }
    }
    KSEventArray fresh;
    for (const auto& one : suggested) {
        const auto event = createEventFromSuggestedEvent(one);
        if (event && !stored.contains(*event->identifierFromProvider)) fresh.push_back(event);
    }
    keepsakeStore_->storeEvents(fresh, handler);
}

void KSSuggestedEventManager::fetchAndSaveSuggestedEventBetweenStartDate(KSDate start, KSDate end,
                                                                         ResultHandler handler) {
    // Written and read on the queue alone, one task after the other.
    const auto onTrips = std::make_shared<std::set<std::string>>();
    _fetchTripsBetweenStartDate(start, end, [onTrips](const Trips& trips) {
        for (const auto& trip : trips) {
            for (const auto& part : trip.tripParts) {
                onTrips->insert(part.eventIdentifiers.begin(), part.eventIdentifiers.end());
            }
        }
    });
    fetchSuggestedEventBetweenStartDate(
        start, end,
        [this, onTrips, handler = std::move(handler)](const SuggestedEvents& suggested) {
            SuggestedEvents kept;
            std::ranges::copy_if(suggested, std::back_inserter(kept), [&onTrips](const auto& one) {
                return !one.eventIdentifier || !onTrips->contains(*one.eventIdentifier);
            });
            saveSuggestedEvents(kept, handler);
        });
}

std::optional<KSSuggestedEventManager::SuggestionIndex>
KSSuggestedEventManager::suggestionsOfEvents(const KSEventArray& events) {
    const auto span = KSExtensions::getDurationOfKSEventArray(events);
    if (!span) return std::nullopt;
    const auto index = std::make_shared<std::optional<SuggestionIndex>>();
    fetchSuggestedEventBetweenStartDate(
        span->start, span->end, [index](const SuggestedEvents& suggested) {
            index->emplace();
            for (const auto& one : suggested) {
                if (one.eventIdentifier) (*index)->insert_or_assign(*one.eventIdentifier, one);
            }
        });
    waitForQueueEmpty();
    return std::move(*index);
}

KSEventArray KSSuggestedEventManager::rehydratedSuggestedEvents(const KSEventArray& events) {
    const auto suggestions = suggestionsOfEvents(events);
    if (!suggestions) return {};
    std::vector<std::shared_ptr<KSEvent>> refreshed;
    forEachFoundIn(
        *suggestions, events, [&refreshed](const KSEvent& event, const SuggestedEvent& suggested) {
            auto filled = event.copy();
            filled->identifierFromProvider = event.identifierFromProvider;
            filled->suggestedEventIdentifier = event.suggestedEventIdentifier;
            filled->suggestedEventTitle = suggested.title;
            filled->suggestedEventCategory = static_cast<std::uint64_t>(suggested.category);
            refreshed.push_back(std::move(filled));
        });
    _enrichSuggestedEventsWithAlmanac(refreshed);
    return {refreshed.begin(), refreshed.end()};
}

void KSSuggestedEventManager::_enrichSuggestedEventsWithAlmanac(
    const std::vector<std::shared_ptr<KSEvent>>& events) {
    if (!almanacStore_) almanacStore_ = calendars_.openStore(kCalendarStoreLookUpOnly);
    for (const auto& event : events) {
        event->suggestedEvent.reset();
        if (!event->suggestedEventIdentifier) continue;
        const auto found = almanacStore_->eventWithIdentifier(*event->suggestedEventIdentifier);
        if (!found) {
            logWarning(found.error().description());
        } else if (*found) {
            event->suggestedEvent = encodeCalendarEvent(**found);
        }
    }
}

void KSSuggestedEventManager::removeSuggestedEventsDeletedAtSource(const KSEventArray& events,
                                                                   const ResultHandler& handler) {
    const auto suggestions = suggestionsOfEvents(events);
    if (!suggestions) {
        handler(std::nullopt, {});
        return;
    }
    keepsakeStore_->removeEvents(eventsMissingIn(*suggestions, events), handler);
}

void KSSuggestedEventManager::waitForQueueEmpty() {
    queue_.sync([] {});
}

}  // namespace keepsakes
