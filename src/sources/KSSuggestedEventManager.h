// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <set>
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

class CalendarService;
class CalendarStore;
class Clock;
class KSEventStore;

/// Turns the events that the personal profile service suggests into events, unless they are parts
/// of a trip. Owned by the registry as "SuggestedEventManager"; the profile service is asked on its
/// queue, everything else happens on the caller's thread. Operations that wait for the queue may be
/// called from any thread but its own, rehydration by one thread at a time: the calendar store is
/// opened at its first use.
class KSSuggestedEventManager final : public KSService {
  public:
    using SuggestedEvents = std::vector<SuggestedEvent>;
    using Trips = std::vector<Trip>;

    /// Needs "EventStore".
    static std::shared_ptr<KSSuggestedEventManager> initWithUniverse(const ServiceLookup& universe);
    /// A missing event store fails the assertion; a missing service of the device yields nothing.
    static std::shared_ptr<KSSuggestedEventManager> initWithProfileStore(
        ProfileEventStore* profileStore, CalendarService* calendars,
        std::shared_ptr<KSEventStore> keepsakeStore, Clock& clock);
    ~KSSuggestedEventManager() override;

    /// The suggestions of the dates, on the queue. After an error of the store the handler is not
    /// called at all.
    void fetchSuggestedEventBetweenStartDate(KSDate start, KSDate end,
                                             std::function<void(const SuggestedEvents&)> handler);

    /// Nothing for a suggestion without an identifier.
    std::shared_ptr<KSEvent> createEventFromSuggestedEvent(const SuggestedEvent& suggested) const;

    /// Stores what is not stored yet; calls the handler before it returns.
    void saveSuggestedEvents(const SuggestedEvents& suggested, const ResultHandler& handler);
    /// Calls the handler on the queue, or not at all when the profile store fails.
    void fetchAndSaveSuggestedEventBetweenStartDate(KSDate start, KSDate end,
                                                    ResultHandler handler);

    /// Copies with the suggestion and its calendar event filled in; an event whose suggestion is
    /// gone is left out.
    KSEventArray rehydratedSuggestedEvents(const KSEventArray& events);

    /// Removes the events whose suggestion is gone, unless the profile store fails. Calls the
    /// handler before it returns.
    void removeSuggestedEventsDeletedAtSource(const KSEventArray& events,
                                              const ResultHandler& handler);

    void waitForQueueEmpty();

  private:
    static constexpr std::string_view kUnit = "KSSuggestedEventManager";

    KSSuggestedEventManager(ProfileEventStore& profileStore, CalendarService& calendars,
                            std::shared_ptr<KSEventStore> keepsakeStore, Clock& clock);

    void _fetchTripsBetweenStartDate(KSDate start, KSDate end,
                                     std::function<void(const Trips&)> handler);
    void _enrichSuggestedEventsWithAlmanac(const std::vector<std::shared_ptr<KSEvent>>& events);

    using SuggestionIndex = std::unordered_map<std::string, SuggestedEvent>;
    /// The suggestions of the events' time by identifier; nothing when they could not be asked for.
    std::optional<SuggestionIndex> suggestionsOfEvents(const KSEventArray& events);

    ProfileEventStore& profileStore_;
    CalendarService& calendars_;
    const std::shared_ptr<KSEventStore> keepsakeStore_;
    Clock& clock_;
    std::unique_ptr<CalendarStore> almanacStore_;
    WorkQueue queue_;
};

}  // namespace keepsakes
