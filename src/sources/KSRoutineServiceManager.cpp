// SPDX-License-Identifier: Apache-2.0
#include "sources/KSRoutineServiceManager.h"

#include <fmt/format.h>

#include <algorithm>
#include <utility>

#include "core/Clock.h"
#include "core/KSAssertion.h"
#include "core/Log.h"
#include "core/TaskGroup.h"
#include "model/KSExtensions.h"
#include "platform/PlatformServices.h"
#include "sources/KSVisitExtensions.h"
#include "sources/Lifetimes.h"
#include "store/KSEventStore.h"

namespace keepsakes {

namespace {

constexpr double kShortestVisit = 300;  // seconds
constexpr std::uint64_t kDiscoveryNew = 1;
constexpr std::uint64_t kDiscoveryKnown = 2;

/// "type == %luu" with the code: which visits become events.
struct TypePredicate {
    std::uint64_t type = kVisitWhole;

    std::string text() const { return fmt::format("type == {}u", type); }
    bool evaluate(const RoutineVisit& visit) const { return visit.type == type; }
};

/// One without an entry or an exit has no duration.
bool isLongEnough(const RoutineVisit& visit) {
    return visit.entry && visit.exit && *visit.exit - *visit.entry >= kShortestVisit;
}

std::uint64_t discoveryOf(const RoutineVisit& visit,
                          const std::vector<LocationOfInterest>& locations) {
    const auto& inference = visit.placeInference;
    if (!inference || !inference->loiIdentifier || !visit.entry) return kDiscoveryNew;
    const auto location =
        std::ranges::find(locations, *inference->loiIdentifier, &LocationOfInterest::identifier);
    if (location == locations.end()) return kDiscoveryNew;
    const auto day = KSExtensions::startOfDay(*visit.entry);
    const bool wasThereBefore = std::ranges::any_of(location->visits, [day](const auto& past) {
        return past.entryDate && KSExtensions::isBeforeDate(*past.entryDate, day);
    });
    return wasThereBefore ? kDiscoveryKnown : kDiscoveryNew;
}

}  // namespace

/// What two questions at the same time answered.
struct KSRoutineServiceManager::Fetched {
    VisitArray visits;
    OptionalError visitsError;
    LocationArray locations;
    OptionalError locationsError;
};

KSRoutineServiceManager::KSRoutineServiceManager(RoutineService& routineManager, Clock& clock,
                                                 std::shared_ptr<KSEventStore> eventStore)
    : routineManager_(routineManager),
      clock_(clock),
      eventStore_(std::move(eventStore)),
      queue_("KSRoutineServiceManager") {}

std::shared_ptr<KSRoutineServiceManager> KSRoutineServiceManager::initWithUniverse(
    const ServiceLookup& universe) {
    const auto& platform = universe.platform();
    auto eventStore = universe.service<KSEventStore>("EventStore");
    if (!assertParameter(eventStore != nullptr, "eventStore", kUnit, 46)) return nullptr;
    if (!platform.routineService) return nullptr;
    return std::shared_ptr<KSRoutineServiceManager>(new KSRoutineServiceManager(
        *platform.routineService, *platform.clock, std::move(eventStore)));
}

void KSRoutineServiceManager::fetchVisitBetweenStartDate(KSDate start, KSDate end,
                                                         VisitsHandler handler) {
    queue_.async([this, start, end, handler = std::move(handler)] {
        _fetchVisitBetweenStartDate(start, end, handler);
    });
}

void KSRoutineServiceManager::_fetchVisitBetweenStartDate(KSDate start, KSDate end,
                                                          VisitsHandler handler) {
    if (!assertParameter(queue_.isCurrent(), "queue.isCurrent", kUnit, __LINE__)) return;
    routineManager_.fetchStoredVisits(
        {.ascending = true,
         .minimumConfidence = kHighConfidence,
         .interval = {start, end},
         .labelVisitsWithPlaceInferences = true,
         .limit = std::nullopt},
        [this, handler = std::move(handler)](RoutineService::Visits fetched) {
            queue_.async([handler, fetched = std::move(fetched)] {
                if (!fetched) {
                    handler({}, fetched.error());
                    return;
                }
                const TypePredicate predicate;
                VisitArray kept;
                std::ranges::copy_if(*fetched, std::back_inserter(kept),
                                     [&predicate](const RoutineVisit& visit) {
                                         return predicate.evaluate(visit) && isLongEnough(visit);
                                     });
                logDebug(fmt::format("{} of {} visits kept by {}", kept.size(), fetched->size(),
                                     predicate.text()));
                handler(std::move(kept), std::nullopt);
            });
        });
}

/// Asks for the locations visited until the end and for the window's visits at the same time; the
/// handler runs on the queue.
void KSRoutineServiceManager::fetchVisitsAndLocations(KSDate start, KSDate end,
                                                      std::function<void(const Fetched&)> handler) {
    const auto fetched = std::make_shared<Fetched>();
    const auto group = TaskGroup::create();
    group->enter();
    routineManager_.fetchLocationsOfInterestVisitedBetween(
        KSDate::distantPast(), end, [fetched, group](RoutineService::Locations locations) {
            if (locations) {
                fetched->locations = std::move(*locations);
            } else {
                fetched->locationsError = locations.error();
            }
            group->leave();
        });
    group->enter();
    _fetchVisitBetweenStartDate(start, end,
                                [fetched, group](VisitArray visits, OptionalError error) {
                                    fetched->visits = std::move(visits);
                                    fetched->visitsError = std::move(error);
                                    group->leave();
                                });
    group->notify(queue_, [fetched, handler = std::move(handler)] { handler(*fetched); });
}

void KSRoutineServiceManager::fetchAndSaveVisitsBetweenStartDate(KSDate start, KSDate end,
                                                                 ResultHandler handler) {
    queue_.async([this, start, end, handler = std::move(handler)] {
        _fetchAndSaveVisitsBetweenStartDate(start, end, handler);
    });
}

void KSRoutineServiceManager::_fetchAndSaveVisitsBetweenStartDate(KSDate start, KSDate end,
                                                                  ResultHandler handler) {
    start = std::max(start, startOfNewestVisit());
    if (start > end) {
        handler(std::nullopt, {});
        return;
    }
    fetchVisitsAndLocations(start, end,
                            [this, start, handler = std::move(handler)](const Fetched& fetched) {
                                if (fetched.locationsError) {
                                    handler(fetched.locationsError, {});
                                } else if (fetched.visitsError) {
                                    handler(fetched.visitsError, {});
                                } else {
                                    saveVisits(fetched, start, handler);
                                }
                            });
}

KSDate KSRoutineServiceManager::startOfNewestVisit() const {
    auto start = KSDate::distantPast();
    eventStore_->fetchLastEventOfCategory(
        KSEventCategory::visit, [&start](const KSEventPointer& newest, const OptionalError&) {
            if (newest) start = newest->startDate();
        });
    return start;
}

void KSRoutineServiceManager::saveVisits(const Fetched& fetched, KSDate after,
                                         ResultHandler handler) {
    const auto fresh = std::make_shared<std::vector<std::shared_ptr<KSEvent>>>();
    const auto group = TaskGroup::create();
    for (const auto& visit : fetched.visits) {
        if (!visit.entry || *visit.entry <= after) continue;
        auto event = createEventFromVisit(visit, fetched.locations);
        fresh->push_back(event);
        group->enter();
        fetchModeForVisit(visit, [event, group](KSPlaceMode mode, const OptionalError&) {
            event->mode = mode;
            group->leave();
        });
    }
    group->notify(queue_, [this, fresh, handler = std::move(handler)] {
        // A collection that began while the service hung asked for the same visits; of the two,
        // the one that is answered first stores them.
        const auto stored = startOfNewestVisit();
        std::erase_if(*fresh, [stored](const auto& event) { return event->startDate() <= stored; });
        if (fresh->empty()) {
            handler(std::nullopt, {});
        } else {
            eventStore_->storeEvents({fresh->begin(), fresh->end()}, handler);
        }
    });
}

std::shared_ptr<KSEvent> KSRoutineServiceManager::createEventFromVisit(
    const RoutineVisit& visit, const LocationArray& lois) const {
    const KSDate now = clock_.now();
    auto event =
        KSEvent::initWithEventIdentifier(KSUUID::random(), visit.entry, visit.exit.value_or(now),
                                         now, KSEventProvider::routine, KSEventCategory::visit);
    if (!event) return nullptr;
    event->expirationDate = now + lifetime::kWeek;
    event->storedSourceCreationDate = visit.date;
    _setDynamicProperties(*event, visit, lois);
    return event;
}

void KSRoutineServiceManager::_setDynamicProperties(KSEvent& event, const RoutineVisit& visit,
                                                    const LocationArray& lois) {
    event.placeName = KSExtensions::getPlaceName(visit);
    event.location = KSExtensions::getLocation(visit);
    event.placeUserType = visit.placeInference ? visit.placeInference->userType : kUserTypeUnknown;
    event.placeDiscovery = discoveryOf(visit, lois);
}

void KSRoutineServiceManager::fetchModeForVisit(const RoutineVisit& visit, ModeHandler handler) {
    if (!visit.location) {
        handler(KSPlaceMode::unknown, std::nullopt);
        return;
    }
    routineManager_.fetchRoutineModeFromLocation(
        *visit.location, [handler = std::move(handler)](const RoutineService::Mode& code) {
            if (!code) {
                handler(KSPlaceMode::unknown, code.error());
            } else if (*code > static_cast<std::uint64_t>(KSPlaceMode::tourist)) {
                handler(KSPlaceMode::unknown, std::nullopt);
            } else {
                handler(static_cast<KSPlaceMode>(*code), std::nullopt);
            }
        });
}

void KSRoutineServiceManager::rehydrateVisits(KSEventArray events, EventsHandler handler) {
    queue_.async([this, events = std::move(events), handler = std::move(handler)] {
        _rehydrateVisits(events, handler);
    });
}

void KSRoutineServiceManager::_rehydrateVisits(const KSEventArray& events, EventsHandler handler) {
    const auto span = KSExtensions::getDurationOfKSEventArray(events);
    if (!span) {
        handler({}, std::nullopt);
        return;
    }
    fetchVisitsAndLocations(
        span->start, span->end, [events, handler = std::move(handler)](const Fetched& fetched) {
            KSEventArray refreshed;
            for (const auto& event : events) {
                const auto* visit = findMatchingVisitFor(*event, fetched.visits);
                if (!visit) continue;
                auto copy = event->copy();
                _setDynamicProperties(*copy, *visit, fetched.locations);
                refreshed.push_back(std::move(copy));
            }
            handler(std::move(refreshed), fetched.visitsError);
        });
}

void KSRoutineServiceManager::removeVisitsDeletedAtSource(KSEventArray events,
                                                          ResultHandler handler) {
    queue_.async([this, events = std::move(events), handler = std::move(handler)] {
        _removeVisitsDeletedAtSource(events, handler);
    });
}

void KSRoutineServiceManager::_removeVisitsDeletedAtSource(KSEventArray events,
                                                           ResultHandler handler) {
    const auto span = KSExtensions::getDurationOfKSEventArray(events);
    if (!span) {
        eventStore_->removeEvents({}, handler);
        return;
    }
    _fetchVisitBetweenStartDate(
        span->start, span->end,
        [this, events = std::move(events), handler = std::move(handler)](
            const VisitArray& visits, const OptionalError& error) {
            KSEventArray gone;
            if (!error) {
                std::ranges::copy_if(
                    events, std::back_inserter(gone),
                    [&visits](const auto& event) { return !findMatchingVisitFor(*event, visits); });
            }
            eventStore_->removeEvents(gone, handler);
        });
}

const RoutineVisit* KSRoutineServiceManager::findMatchingVisitFor(const KSEvent& event,
                                                                  const VisitArray& visits) {
    if (visits.empty()) return nullptr;
    std::size_t low = 0;
    std::size_t high = visits.size() - 1;
    while (high >= low) {
        const auto mid = low + (high - low) / 2;
        // Left of the first visit `high` wraps around, and this ends the search.
        if (mid > visits.size() - 1) return nullptr;
        const auto& visit = visits[mid];
        if (KSExtensions::isEqualToVisitKeepsake(visit, event)) return &visit;
        if (visit.entry && event.startDate() < *visit.entry) {
            high = mid - 1;
        } else {
            low = mid + 1;
        }
    }
    return nullptr;
}

}  // namespace keepsakes
