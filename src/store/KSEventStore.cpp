// SPDX-License-Identifier: Apache-2.0
#include "store/KSEventStore.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <fmt/format.h>

#include <cmath>
#include <utility>

#include "core/Clock.h"
#include "core/KSAssertion.h"
#include "platform/PlatformServices.h"
#include "store/KSEventMO.h"
#include "store/KSPersistenceManager.h"

namespace keepsakes {

namespace {

constexpr ManagedObjectContext::Changes kTouchesEvents{.events = true, .bundles = false};
// Rows that go take their places in bundles with them.
constexpr ManagedObjectContext::Changes kTouchesBoth{.events = true, .bundles = true};

KSDictionary countResult(std::size_t count) { return {{"resultNumberOfEvents", count}}; }

std::string selectText(std::string_view rest) {
    return fmt::format("SELECT {} FROM KSEventMO {}", KSEventMO::columnNames(), rest);
}

void bindNothing(SQLite::Statement&) {}

}  // namespace

KSEventStore::KSEventStore(std::shared_ptr<KSPersistenceManager> persistenceManager)
    : persistenceManager_(std::move(persistenceManager)) {}

std::shared_ptr<KSEventStore> KSEventStore::initWithUniverse(const ServiceLookup& universe) {
    auto manager = universe.service<KSPersistenceManager>("PersistenceManager");
    if (!assertParameter(manager != nullptr, "persistenceManager", "KSEventStore", __LINE__)) {
        return nullptr;
    }
    return std::shared_ptr<KSEventStore>(new KSEventStore(std::move(manager)));
}

void KSEventStore::storeEvent(const KSEventPointer& event, const ResultHandler& handler) {
    if (!event) {
        handler(std::nullopt, countResult(0));
        return;
    }
    const auto error = persistenceManager_->performBlockAndWait([&](ManagedObjectContext& context) {
        const auto failed = context.save(
            kTouchesEvents, [&] { KSEventMO::managedObjectWithEvent(*event, context); });
        handler(failed, countResult(1));
    });
    if (error) handler(error, {});
}

void KSEventStore::storeEvents(const KSEventArray& events, const ResultHandler& handler) {
    if (events.empty()) {
        handler(std::nullopt, countResult(0));
        return;
    }
    const auto error = persistenceManager_->performBlockAndWait([&](ManagedObjectContext& context) {
        const auto failed = context.save(kTouchesEvents, [&] {
            for (const auto& event : events) {
                const auto row = KSEventMO::rowWithIdentifier(event->eventIdentifier(), context);
                if (row != 0) {
                    KSEventMO::setPropertiesOfEventMO(row, *event, context);
                } else {
                    KSEventMO::managedObjectWithEvent(*event, context);
                }
            }
        });
        handler(failed, countResult(events.size()));
    });
    if (error) handler(error, {});
}

void KSEventStore::removeEvents(const KSEventArray& events, const ResultHandler& handler) {
    const auto error = persistenceManager_->performBlockAndWait([&](ManagedObjectContext& context) {
        std::size_t removed = 0;
        const auto failed = context.save(kTouchesBoth, [&] {
            for (const auto& event : events) {
                auto& statement =
                    context.statement("DELETE FROM KSEventMO WHERE eventIdentifier = ?");
                const auto& bytes = event->eventIdentifier().bytes;
                statement.bind(1, bytes.data(), static_cast<int>(bytes.size()));
                removed += static_cast<std::size_t>(statement.exec());
            }
        });
        handler(failed, countResult(failed ? 0 : removed));
    });
    if (error) handler(error, {});
}

void KSEventStore::remove(const std::string& sql, const Bind& bind, const ResultHandler& handler) {
    const auto error = persistenceManager_->performBlockAndWait([&](ManagedObjectContext& context) {
        std::size_t removed = 0;
        const auto failed = context.save(kTouchesBoth, [&] {
            auto& statement = context.statement(sql);
            bind(statement);
            removed = static_cast<std::size_t>(statement.exec());
        });
        handler(failed, countResult(failed ? 0 : removed));
    });
    if (error) handler(error, {});
}

void KSEventStore::removeAllEvents(const ResultHandler& handler) {
    remove("DELETE FROM KSEventMO", bindNothing, handler);
}

void KSEventStore::purgeExpiredEvents(const ResultHandler& handler) {
    const KSDate now = persistenceManager_->now();
    remove(
        "DELETE FROM KSEventMO WHERE expirationDate < ?",
        [now](SQLite::Statement& statement) { statement.bind(1, now.seconds); }, handler);
}

void KSEventStore::purgeUnknownEvents(const ResultHandler& handler) {
    remove("DELETE FROM KSEventMO WHERE category = 0 OR provider = 0", bindNothing, handler);
}

void KSEventStore::fetch(const std::string& sql, const Bind& bind, const EventsHandler& handler) {
    const auto error = persistenceManager_->performBlockAndWait([&](ManagedObjectContext& context) {
        KSEventArray events;
        const auto failed = context.perform([&] {
            auto& statement = context.statement(sql);
            bind(statement);
            while (statement.executeStep()) {
                if (auto event = KSEventMO::initWithEventMO(statement)) {
                    events.push_back(std::move(event));
                }
            }
        });
        if (failed) events.clear();
        handler(std::move(events), failed);
    });
    if (error) handler({}, error);
}

void KSEventStore::fetchAllEvents(const EventsHandler& handler) {
    static const std::string text = selectText("");
    fetch(text, bindNothing, handler);
}

void KSEventStore::fetchLastEventOfCategory(KSEventCategory category, const EventHandler& handler) {
    fetchLastEventOfCategories({category}, handler);
}

void KSEventStore::fetchLastEventOfCategories(const std::vector<KSEventCategory>& categories,
                                              const EventHandler& handler) {
    std::string marks;
    for (std::size_t i = 0; i < categories.size(); ++i) marks += i == 0 ? "?" : ", ?";
    fetch(
        selectText(fmt::format("WHERE category IN ({}) ORDER BY startDate DESC LIMIT 1", marks)),
        [&categories](SQLite::Statement& statement) {
            int index = 0;
            for (const auto category : categories) {
                statement.bind(++index, static_cast<std::int64_t>(category));
            }
        },
        [&handler](const KSEventArray& events, const OptionalError& error) {
            handler(events.empty() ? nullptr : events.front(), error);
        });
}

void KSEventStore::fetchEventsWithStartDateAfter(KSDate date, KSEventCategory category,
                                                 const EventsHandler& handler) {
    static const std::string text =
        selectText("WHERE startDate >= ? AND category = ? ORDER BY startDate ASC");
    fetch(
        text,
        [date, category](SQLite::Statement& statement) {
            statement.bind(1, date.seconds);
            statement.bind(2, static_cast<std::int64_t>(category));
        },
        handler);
}

void KSEventStore::fetchEventsWithOptions(const KSEventFetchOptions& options,
                                          const EventsHandler& handler) {
    std::string conditions;
    const auto require = [&conditions](std::string_view condition) {
        conditions += conditions.empty() ? "WHERE " : " AND ";
        conditions += condition;
    };
    if (options.dateInterval) require("startDate <= ? AND endDate >= ?");
    if (options.category != KSEventCategory::unknown) require("category = ?");
    const auto text = selectText(fmt::format("{} ORDER BY startDate {}{}", conditions,
                                             options.ascending ? "ASC" : "DESC",
                                             options.limit ? " LIMIT ?" : ""));
    fetch(
        text,
        [&options](SQLite::Statement& statement) {
            int index = 0;
            if (options.dateInterval) {
                statement.bind(++index, options.dateInterval->end.seconds);
                statement.bind(++index, options.dateInterval->start.seconds);
            }
            if (options.category != KSEventCategory::unknown) {
                statement.bind(++index, static_cast<std::int64_t>(options.category));
            }
            if (options.limit) statement.bind(++index, rowLimit(*options.limit));
        },
        handler);
}

bool KSEventStore::isEqualTrendsData(const KSEvent& event, const KSEvent& stored) {
    if (event.provider() != stored.provider() || event.category() != stored.category()) {
        return false;
    }
    const auto trends = event.trends.value_or(KSDictionary());
    const auto storedTrends = stored.trends.value_or(KSDictionary());
    for (const char* key :
         {"keyword", "aggregationDuration", "aggregationMethod", "valueFunctionType"}) {
        if (valueForKey(trends, key) != valueForKey(storedTrends, key)) return false;
    }
    return true;
}

}  // namespace keepsakes
