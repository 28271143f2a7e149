// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <unordered_map>
#include <vector>

#include "core/KSError.h"
#include "core/ServiceLookup.h"
#include "core/WorkQueue.h"
#include "model/KSEvent.h"
#include "platform/SearchIndex.h"

namespace keepsakes {

class Clock;
class KSEventStore;
class UserDefaults;

/// Turns the links that were shared with the owner, and that are highlighted, into events; nothing
/// unless the owner switched that on. Owned by the registry as "LinkshelfManager". The search index
/// is asked on its queue, and what follows runs there too. Rehydration and removal wait for that
/// queue and must not be called on it.
class KSLinkshelfManager final : public KSService {
  public:
    using Items = std::vector<SearchableItem>;
    using ItemsHandler = std::function<void(const Items&)>;
    using AccountIdentifiers = std::set<std::string>;

    /// Needs "EventStore"; yields nothing on a device without a search index.
    static std::shared_ptr<KSLinkshelfManager> initWithUniverse(const ServiceLookup& universe);

    /// The preference "LinkshelfEnabled" of the domain "com.brindle.Sharelane"; false when absent.
    bool _linkshelfEnabled() const;
    /// The chats whose links are highlighted without the owner's doing. Calls the completion before
    /// it returns.
    void _fetchAutoDonatingChatWithCompletionHandler(
        const std::function<void(const AccountIdentifiers&)>& completion) const;

    /// The highlighted links of the dates, both included, on the queue. When the index fails, which
    /// is logged, the completion is not called.
    void fetchSharedContentBetweenStartDate(KSDate start, KSDate end, ItemsHandler completion);
    /// Null for an item without an identifier or without a date.
    std::shared_ptr<KSEvent> createEventFromSharedContent(const SearchableItem& item) const;
    /// Stores an event for each item that is later than the newest one stored.
    void saveSharedContents(const Items& items, const ResultHandler& handler);
    /// Calls the handler on the queue, or not at all when the index fails.
    void fetchAndSaveSharedContentBetweenStartDate(KSDate start, KSDate end, ResultHandler handler);

    /// Copies of the events with their item's fields; events whose item is gone are left out.
    KSEventArray rehydratedSharedContentEvents(const KSEventArray& events);
    /// Removes the events whose item is gone: all of them when the feature is switched off, none
    /// when the index fails.
    void removeSharedContentsDeletedAtSource(const KSEventArray& events,
                                             const ResultHandler& handler);

    /// Returns when what was queued before has finished.
    void waitForQueueEmpty();

  private:
    KSLinkshelfManager(SearchIndex& searchIndex, const UserDefaults& userDefaults, Clock& clock,
                       std::shared_ptr<KSEventStore> keepsakeStore);

    using ItemIndex = std::unordered_map<std::string, SearchableItem>;
    /// Nothing when the index fails.
    std::optional<Items> querySharedContent(KSDate start, KSDate end) const;
    /// By unique identifier; nothing when there are no dates or the index fails.
    std::optional<ItemIndex> itemsBetween(std::optional<KSDateInterval> dates);
    void _removeSharedContentsDeletedAtSource(const KSEventArray& events,
                                              const ResultHandler& handler);

    SearchIndex& searchIndex_;
    const UserDefaults& userDefaults_;
    Clock& clock_;
    const std::shared_ptr<KSEventStore> keepsakeStore_;
    WorkQueue queue_;
};

}  // namespace keepsakes
