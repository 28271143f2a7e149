// SPDX-License-Identifier: Apache-2.0
#include "sources/KSPhotoManager.h"

#include <algorithm>
#include <map>
#include <set>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "core/Clock.h"
#include "core/KSAssertion.h"
#include "core/Log.h"
#include "model/KSExtensions.h"
#include "platform/PhotoAnalysis.h"
#include "platform/PlatformServices.h"
#include "sources/IdentifiedEvents.h"
#include "sources/Lifetimes.h"
#include "store/KSEventStore.h"

namespace keepsakes {

namespace {

const KSArray& keepsakesOf(const KSDictionary& summary) {
    static const KSArray none;
    const auto* events = valueForKey(summary, kKSKeyEvents).asArray();
    return events ? *events : none;
}

const std::string* identifierOf(const KSDictionary& keepsake) {
    return valueForKey(keepsake, kKSKeyLocalIdentifier).asString();
}

std::optional<KSDateInterval> intervalOf(const KSDictionary& keepsake) {
    const auto* pair = valueForKey(keepsake, kKSKeyEventUniversalDateInterval).asDictionary();
    if (!pair) return std::nullopt;
    const auto start = valueForKey(*pair, kKSKeyIntervalStart).asDate();
    const auto end = valueForKey(*pair, kKSKeyIntervalEnd).asDate();
    if (!start || !end) return std::nullopt;
    return KSDateInterval{*start, *end};
}

/// On the words as delivered: only the exact lower-case ones count.
bool returnsEveryYear(const KSDictionary& keepsake) {
    const auto* words = valueForKey(keepsake, kKSKeyInferences).asArray();
    return words && std::ranges::any_of(*words, [](const KSValue& word) {
               const auto* text = word.asString();
               return text && (*text == "birthday" || *text == "anniversary");
           });
}

}  // namespace

KSPhotoManager::KSPhotoManager(PhotoAnalysis& photoAnalysis, Clock& clock,
                               std::shared_ptr<KSEventStore> eventStore)
    : photoAnalysis_(photoAnalysis),
      clock_(clock),
      eventStore_(std::move(eventStore)),
      queue_("KSPhotoManager") {}

std::shared_ptr<KSPhotoManager> KSPhotoManager::initWithUniverse(const ServiceLookup& universe) {
    auto eventStore = universe.service<KSEventStore>("EventStore");
    if (!assertParameter(eventStore != nullptr, "eventStore", "KSPhotoManager", 46)) {
        return nullptr;
    }
    const auto& platform = universe.platform();
    return std::shared_ptr<KSPhotoManager>(
        new KSPhotoManager(*platform.photoAnalysis, *platform.clock, std::move(eventStore)));
}

std::optional<KSDictionary> KSPhotoManager::fetchPhotoKeepsakesBetweenStartDate(KSDate start,
                                                                                KSDate end) {
    auto summary = photoAnalysis_.summary(KSDateInterval{start, end});
    if (summary) return std::move(*summary);
    logWarning(summary.error().description());
    return std::nullopt;
}

void KSPhotoManager::fetchAndSavePhotoKeepsakesBetweenStartDate(KSDate start, KSDate end,
                                                                const ResultHandler& handler) {
    const auto summary = fetchPhotoKeepsakesBetweenStartDate(start, end);
    if (!summary || keepsakesOf(*summary).empty()) {
        handler(std::nullopt, {});
        return;
    }
    saveKeepsakes(keepsakesOf(*summary), valueForKey(*summary, kKSKeyGraphCreationDate).asDate(),
                  handler);
}

std::shared_ptr<KSEvent> KSPhotoManager::createEventFromPhotoKeepsake(
    const KSDictionary& keepsake) const {
    const auto interval = intervalOf(keepsake);
    const auto* identifier = identifierOf(keepsake);
    if (!interval || !identifier) return nullptr;
    const KSDate now = clock_.now();
    auto event =
        KSEvent::initWithEventIdentifier(KSUUID::random(), interval->start, interval->end, now,
                                         KSEventProvider::photo, KSEventCategory::photoKeepsake);
    event->identifierFromProvider = *identifier;
    event->extendedAttributes = KSEventExtendedAttributes::initWithKeepsake(keepsake);
    event->expirationDate =
        now + (returnsEveryYear(keepsake) ? lifetime::kYearAndWeek : lifetime::kFourWeeks);
    return event;
}

void KSPhotoManager::saveKeepsakes(const KSArray& keepsakes, std::optional<KSDate> creationDate,
                                   const ResultHandler& handler) {
    KSEventPointer newest;
    eventStore_->fetchLastEventOfCategory(
        KSEventCategory::photoKeepsake,
        [&newest](const KSEventPointer& event, const OptionalError&) { newest = event; });
    KSEventArray fresh;
    for (const auto& item : keepsakes) {
        const auto* keepsake = item.asDictionary();
        auto event = keepsake ? createEventFromPhotoKeepsake(*keepsake) : nullptr;
        if (!event) continue;
        event->storedSourceCreationDate = creationDate;
        if (newest && event->startDate() <= newest->startDate()) continue;
        fresh.push_back(std::move(event));
    }
    eventStore_->storeEvents(fresh, handler);
}

KSEventPointer KSPhotoManager::rehydrateEventFromEvent(const KSEvent& event,
                                                       const KSDictionary& keepsake) {
    auto refreshed = event.copy();
    // The narrow copy drops it, and a client that stores back what it fetched must not lose it.
    refreshed->identifierFromProvider = event.identifierFromProvider;
    refreshed->extendedAttributes = KSEventExtendedAttributes::initWithKeepsake(keepsake);
    return refreshed;
}

void KSPhotoManager::rehydratePhotoKeepsakes(KSEventArray events, EventsHandler handler) {
    queue_.async([this, events = std::move(events), handler = std::move(handler)] {
        _rehydratePhotoKeepsakes(events, handler);
    });
}

void KSPhotoManager::_rehydratePhotoKeepsakes(const KSEventArray& events,
                                              const EventsHandler& handler) {
    std::map<std::string, KSEventPointer> byIdentifier;
    std::vector<std::string> identifiers;
    for (const auto& event : events) {
        if (!event->identifierFromProvider) continue;
        const auto& identifier = *event->identifierFromProvider;
        if (byIdentifier.insert_or_assign(identifier, event).second) {
            identifiers.push_back(identifier);
        }
    }
    KSEventArray refreshed;
    std::span<const std::string> rest(identifiers);
    while (!rest.empty()) {
        const auto batch = rest.first(std::min(rest.size(), PhotoAnalysis::kMostIdentifiers));
        rest = rest.subspan(batch.size());
        const auto summary = photoAnalysis_.summary(batch);
        if (!summary) {
            handler({}, summary.error());
            return;
        }
        for (const auto& item : keepsakesOf(*summary)) {
            const auto* keepsake = item.asDictionary();
            const auto* identifier = keepsake ? identifierOf(*keepsake) : nullptr;
            if (!identifier) continue;
            const auto stored = byIdentifier.find(*identifier);
            if (stored == byIdentifier.end()) continue;
            refreshed.push_back(rehydrateEventFromEvent(*stored->second, *keepsake));
        }
    }
    handler(std::move(refreshed), std::nullopt);
}

void KSPhotoManager::removePhotoEventsDeletedAtSource(KSEventArray events, ResultHandler handler) {
    queue_.async([this, events = std::move(events), handler = std::move(handler)] {
        _removePhotoEventsDeletedAtSource(events, handler);
    });
}

void KSPhotoManager::_removePhotoEventsDeletedAtSource(const KSEventArray& events,
                                                       const ResultHandler& handler) {
    std::set<std::string> existing;
    if (const auto span = KSExtensions::getDurationOfKSEventArray(events)) {
        const auto summary = fetchPhotoKeepsakesBetweenStartDate(span->start, span->end);
        for (const auto& item : summary ? keepsakesOf(*summary) : KSArray()) {
            const auto* keepsake = item.asDictionary();
            if (const auto* identifier = keepsake ? identifierOf(*keepsake) : nullptr) {
                existing.insert(*identifier);
            }
        }
    }
    eventStore_->removeEvents(eventsMissingIn(existing, events), handler);
}

}  // namespace keepsakes
