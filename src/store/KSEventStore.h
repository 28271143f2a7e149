// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "core/KSError.h"
#include "core/ServiceLookup.h"
#include "model/KSEvent.h"
#include "model/KSEventFetchOptions.h"

namespace SQLite {
class Statement;
}

namespace keepsakes {

class KSPersistenceManager;

/// The only code that reads and writes event rows. Every operation does its work on the persistence
/// manager's context and calls its handler there, before it returns; results hold
/// "resultNumberOfEvents". Owned by the registry as "EventStore"; any thread may call it. Whether
/// the database is available is the callers' business to check.
class KSEventStore final : public KSService {
  public:
    using EventsHandler = std::function<void(KSEventArray, OptionalError)>;
    using EventHandler = std::function<void(KSEventPointer, OptionalError)>;

    static std::shared_ptr<KSEventStore> initWithUniverse(const ServiceLookup& universe);

    const std::shared_ptr<KSPersistenceManager>& persistenceManager() const {
        return persistenceManager_;
    }

    /// Adds a row without looking for an older one; nothing for no event.
    void storeEvent(const KSEventPointer& event, const ResultHandler& handler);
    /// Adds each event, or overwrites the row with its identifier. All or nothing.
    void storeEvents(const KSEventArray& events, const ResultHandler& handler);

    void removeEvents(const KSEventArray& events, const ResultHandler& handler);
    void removeAllEvents(const ResultHandler& handler);
    /// Events without an expiration date never expire.
    void purgeExpiredEvents(const ResultHandler& handler);
    void purgeUnknownEvents(const ResultHandler& handler);

    void fetchAllEvents(const EventsHandler& handler);
    /// The event with the latest start among the categories, or none.
    void fetchLastEventOfCategory(KSEventCategory category, const EventHandler& handler);
    void fetchLastEventOfCategories(const std::vector<KSEventCategory>& categories,
                                    const EventHandler& handler);
    /// Starting at `date` or later, ascending by start.
    void fetchEventsWithStartDateAfter(KSDate date, KSEventCategory category,
                                       const EventsHandler& handler);
    void fetchEventsWithOptions(const KSEventFetchOptions& options, const EventsHandler& handler);

    /// Whether the event and a stored one tell of the same trend.
    static bool isEqualTrendsData(const KSEvent& event, const KSEvent& stored);

  private:
    explicit KSEventStore(std::shared_ptr<KSPersistenceManager> persistenceManager);

    using Bind = std::function<void(SQLite::Statement&)>;
    void remove(const std::string& sql, const Bind& bind, const ResultHandler& handler);
    void fetch(const std::string& sql, const Bind& bind, const EventsHandler& handler);

    const std::shared_ptr<KSPersistenceManager> persistenceManager_;
};

}  // namespace keepsakes
