// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>

#include "core/KSError.h"
#include "core/ServiceLookup.h"
#include "core/WorkQueue.h"
#include "model/KSEvent.h"
#include "platform/TopicStore.h"

namespace keepsakes {

class Clock;
class KSEventStore;

/// Records the intervals, typically days, in which at least one topic of interest scores high. The
/// scores themselves are not stored but asked for again whenever an event is handed out. Owned by
/// the registry as "TopicManager"; collection runs on its queue, and the handler is called there.
class KSTopicManager final : public KSService {
  public:
    static constexpr double kLeastScore = 0.55;

    /// Needs "EventStore".
    static std::shared_ptr<KSTopicManager> initWithUniverse(const ServiceLookup& universe);
    static std::shared_ptr<KSTopicManager> initWithTopicStore(
        TopicStore& topicStore, Clock& clock, std::shared_ptr<KSEventStore> keepsakeStore);

    /// The start of the previous day, by the date 86400 seconds before.
    static KSDate startOfDayBefore(KSDate date);
    /// The last second of the previous day.
    static KSDate endOfDayBefore(KSDate date);

    std::shared_ptr<KSEvent> createEventFromTopicQuery(const TopicQuery& query) const;

    /// Stores one event for the interval when a topic reaches `kLeastScore`; an interval that has
    /// one is answered at once, with an empty result.
    void fetchAndSaveScoredTopicsBetweenStartDate(KSDate start, KSDate end, ResultHandler handler);

    /// A copy of the event with the topics that reach `kLeastScore`. When none does any more, the
    /// event is removed from the store and nothing is answered; when there are no scores to be had,
    /// which is logged, it stays there.
    std::shared_ptr<KSEvent> rehydratedScoredTopicsEvent(const KSEventPointer& event);
    /// On the caller's thread, as the other one.
    KSEventArray rehydratedScoredTopicsEvents(const KSEventArray& events);

    /// Returns when what was queued before has finished.
    void waitForQueueEmpty();

  private:
    KSTopicManager(TopicStore& topicStore, Clock& clock,
                   std::shared_ptr<KSEventStore> keepsakeStore);

    void fetchAndSave(const TopicQuery& query, const ResultHandler& handler);

    TopicStore& topicStore_;
    Clock& clock_;
    const std::shared_ptr<KSEventStore> keepsakeStore_;
    WorkQueue queue_;
};

}  // namespace keepsakes
