// SPDX-License-Identifier: Apache-2.0
#include "sources/KSTopicManager.h"

#include <algorithm>
#include <string>
#include <utility>

#include "core/Calendar.h"
#include "core/Clock.h"
#include "core/KSAssertion.h"
#include "core/KSDate.h"
#include "core/Log.h"
#include "platform/PlatformServices.h"
#include "sources/Lifetimes.h"
#include "store/KSEventStore.h"

namespace keepsakes {

namespace {

constexpr std::string_view kTopicMapping = "keepsakes-topics";
constexpr double kDecayRate = 0.000001;

TopicQuery queryBetween(KSDate start, KSDate end) {
    return {.fromDate = start,
            .toDate = end,
            .scoringDate = end,
            .decayRate = kDecayRate,
            .scoreWithBiases = false};
}

bool isHigh(const std::pair<const std::string, double>& topic) {
    return topic.second >= KSTopicManager::kLeastScore;
}

}  // namespace

KSTopicManager::KSTopicManager(TopicStore& topicStore, Clock& clock,
                               std::shared_ptr<KSEventStore> keepsakeStore)
    : topicStore_(topicStore),
      clock_(clock),
      keepsakeStore_(std::move(keepsakeStore)),
      queue_("KSTopicManager") {}

std::shared_ptr<KSTopicManager> KSTopicManager::initWithUniverse(const ServiceLookup& universe) {
    const auto& platform = universe.platform();
    return initWithTopicStore(*platform.topicStore, *platform.clock,
                              universe.service<KSEventStore>("EventStore"));
}

std::shared_ptr<KSTopicManager> KSTopicManager::initWithTopicStore(
    TopicStore& topicStore, Clock& clock, std::shared_ptr<KSEventStore> keepsakeStore) {
    if (!assertParameter(keepsakeStore != nullptr, "keepsakeStore", "KSTopicManager", __LINE__)) {
        return nullptr;
    }
    return std::shared_ptr<KSTopicManager>(
        new KSTopicManager(topicStore, clock, std::move(keepsakeStore)));
}

KSDate KSTopicManager::startOfDayBefore(KSDate date) { return calendar::startOfDay(date - kDay); }

KSDate KSTopicManager::endOfDayBefore(KSDate date) { return calendar::startOfDay(date) - 1; }

std::shared_ptr<KSEvent> KSTopicManager::createEventFromTopicQuery(const TopicQuery& query) const {
    const KSDate now = clock_.now();
    auto event =
        KSEvent::initWithEventIdentifier(KSUUID::random(), query.fromDate, query.toDate, now,
                                         KSEventProvider::foresight, KSEventCategory::topic);
    event->expirationDate = now + lifetime::kFourWeeks;
    return event;
}

void KSTopicManager::fetchAndSaveScoredTopicsBetweenStartDate(KSDate start, KSDate end,
                                                              ResultHandler handler) {
    queue_.async([this, query = queryBetween(start, end), handler = std::move(handler)] {
        fetchAndSave(query, handler);
    });
}

void KSTopicManager::fetchAndSave(const TopicQuery& query, const ResultHandler& handler) {
    bool isCovered = false;
    OptionalError failed;
    keepsakeStore_->fetchEventsWithStartDateAfter(
        query.fromDate, KSEventCategory::topic,
        [&](const KSEventArray& events, OptionalError error) {
            failed = std::move(error);
            isCovered = std::ranges::any_of(events, [&query](const auto& event) {
                return event->startDate() == query.fromDate && event->endDate() == query.toDate;
            });
        });
    if (failed || isCovered) {
        handler(failed, {});
        return;
    }
    const auto scores = topicStore_.scoresForTopicMapping(kTopicMapping, query);
    if (!scores) {
        handler(scores.error(), {});
        return;
    }
    const auto event =
        std::ranges::any_of(*scores, isHigh) ? createEventFromTopicQuery(query) : nullptr;
    keepsakeStore_->storeEvent(event, handler);
}

std::shared_ptr<KSEvent> KSTopicManager::rehydratedScoredTopicsEvent(const KSEventPointer& event) {
    const auto scores = topicStore_.scoresForTopicMapping(
        kTopicMapping, queryBetween(event->startDate(), event->endDate()));
    if (!scores) {
        logWarning(scores.error().description());
        return nullptr;
    }
    KSDictionary topics;
    for (const auto& topic : *scores) {
        if (isHigh(topic)) topics.emplace(topic.first, topic.second);
    }
    if (topics.empty()) {
        keepsakeStore_->removeEvents({event}, [](const OptionalError&, const KSDictionary&) {});
        return nullptr;
    }
    auto copy = event->copy();
    copy->scoredTopics = std::move(topics);
    return copy;
}

KSEventArray KSTopicManager::rehydratedScoredTopicsEvents(const KSEventArray& events) {
    KSEventArray filled;
    for (const auto& event : events) {
        if (auto copy = rehydratedScoredTopicsEvent(event)) filled.push_back(std::move(copy));
    }
    return filled;
}

void KSTopicManager::waitForQueueEmpty() {
    queue_.sync([] {});
}

}  // namespace keepsakes
