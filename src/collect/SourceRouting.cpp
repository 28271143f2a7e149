// SPDX-License-Identifier: Apache-2.0
#include "collect/SourceRouting.h"

#include <utility>

#include "sources/KSForesightTravelManager.h"
#include "sources/KSLinkshelfManager.h"
#include "sources/KSNowPlayingMediaManager.h"
#include "sources/KSPhotoManager.h"
#include "sources/KSRoutineServiceManager.h"
#include "sources/KSSignificantContactManager.h"
#include "sources/KSSuggestedEventManager.h"
#include "sources/KSTopicManager.h"
#include "sources/KSVitalsManager.h"

namespace keepsakes {

namespace {

/// A trends event has the category of what it tells of, and no source.
bool hasNoSource(const KSEventArray& group) {
    return group.front()->provider() == KSEventProvider::postAnalytics;
}

}  // namespace

EventSources::EventSources(const ServiceLookup& universe)
    : vitalsManager_(universe.service<KSVitalsManager>("VitalsManager")),
      routineServiceManager_(universe.service<KSRoutineServiceManager>("RoutineServiceManager")),
      photoManager_(universe.service<KSPhotoManager>("PhotoManager")),
      topicManager_(universe.service<KSTopicManager>("TopicManager")),
      linkshelfManager_(universe.service<KSLinkshelfManager>("LinkshelfManager")),
      suggestedEventManager_(universe.service<KSSuggestedEventManager>("SuggestedEventManager")),
      foresightTravelManager_(universe.service<KSForesightTravelManager>("ForesightTravelManager")),
      nowPlayingMediaManager_(universe.service<KSNowPlayingMediaManager>("NowPlayingMediaManager")),
      significantContactManager_(
          universe.service<KSSignificantContactManager>("SignificantContactManager")) {
    addStep("resultWorkoutsSuccess", vitalsManager_,
            &KSVitalsManager::fetchAndSaveWorkoutsBetweenStartDate);
    addStep("resultVisitsSuccess", routineServiceManager_,
            &KSRoutineServiceManager::fetchAndSaveVisitsBetweenStartDate);
    addStep("resultPhotosSuccess", photoManager_,
            &KSPhotoManager::fetchAndSavePhotoKeepsakesBetweenStartDate);
    // Whatever the window is: of the day before its end.
    addStep("resultTopicsSuccess", topicManager_,
            [](KSTopicManager& source, KSDate, KSDate end, ResultHandler done) {
                source.fetchAndSaveScoredTopicsBetweenStartDate(
                    KSTopicManager::startOfDayBefore(end), KSTopicManager::endOfDayBefore(end),
                    std::move(done));
            });
    addStep("resultSharedSuccess", linkshelfManager_,
            &KSLinkshelfManager::fetchAndSaveSharedContentBetweenStartDate);
    addStep("resultSuggestedSuccess", suggestedEventManager_,
            &KSSuggestedEventManager::fetchAndSaveSuggestedEventBetweenStartDate);
    addStep("resultTripsSuccess", foresightTravelManager_,
            &KSForesightTravelManager::fetchAndSaveTripsBetweenStartDate);
    addStep("resultMusicSuccess", nowPlayingMediaManager_,
            &KSNowPlayingMediaManager::fetchAndSaveRepeatedMediaPlayBetweenStartDate);
    addStep("resultContactsSuccess", significantContactManager_,
            &KSSignificantContactManager::fetchAndSaveConversationsBetweenStartDate);
}

template <class Source, class FetchAndSave>
void EventSources::addStep(std::string_view successKey, const std::shared_ptr<Source>& source,
                           FetchAndSave fetchAndSave) {
    if (!source) return;
    steps_.push_back(
        {successKey, [source, fetchAndSave](KSDate start, KSDate end, ResultHandler done) {
             std::invoke(fetchAndSave, *source, start, end, std::move(done));
         }});
}

void EventSources::_purgeEventsDeletedAtSingleSource(const KSEventArray& group,
                                                     ResultHandler handler) const {
    if (hasNoSource(group)) {
        handler(std::nullopt, {});
        return;
    }
    switch (group.front()->category()) {
        case KSEventCategory::visit:
            if (routineServiceManager_) {
                routineServiceManager_->removeVisitsDeletedAtSource(group, std::move(handler));
                return;
            }
            break;
        case KSEventCategory::photoKeepsake:
            if (photoManager_) {
                photoManager_->removePhotoEventsDeletedAtSource(group, std::move(handler));
                return;
            }
            break;
        case KSEventCategory::mediaOnRepeat:
        case KSEventCategory::leisureMedia:
            if (nowPlayingMediaManager_) {
                nowPlayingMediaManager_->removeMediaPlayEventsDeletedAtSource(group, handler);
                return;
            }
            break;
        case KSEventCategory::linkshelf:
            if (linkshelfManager_) {
                linkshelfManager_->removeSharedContentsDeletedAtSource(group, handler);
                return;
            }
            break;
        case KSEventCategory::travel:
            if (foresightTravelManager_) {
                foresightTravelManager_->removeTripEventsDeletedAtSource(group, handler);
                return;
            }
            break;
        case KSEventCategory::structuredEvent:
        case KSEventCategory::socialEvent:
            if (suggestedEventManager_) {
                suggestedEventManager_->removeSuggestedEventsDeletedAtSource(group, handler);
                return;
            }
            break;
        case KSEventCategory::significantContact:
            if (significantContactManager_) {
                significantContactManager_->removeConversationsDeletedAtSource(group, handler);
                return;
            }
            break;
        default:
            break;
    }
    handler(std::nullopt, {});
}

void EventSources::_rehydrateEventsBySingleSource(const KSEventArray& group,
                                                  EventsHandler handler) const {
    if (hasNoSource(group)) {
        handler(group, std::nullopt);
        return;
    }
    switch (group.front()->category()) {
        case KSEventCategory::visit:
            if (routineServiceManager_) {
                routineServiceManager_->rehydrateVisits(group, std::move(handler));
                return;
            }
            break;
        case KSEventCategory::photoKeepsake:
            if (photoManager_) {
                photoManager_->rehydratePhotoKeepsakes(group, std::move(handler));
                return;
            }
            break;
        case KSEventCategory::topic:
            if (topicManager_) {
                handler(topicManager_->rehydratedScoredTopicsEvents(group), std::nullopt);
                return;
            }
            break;
        case KSEventCategory::mediaOnRepeat:
        case KSEventCategory::leisureMedia:
            if (nowPlayingMediaManager_) {
                handler(nowPlayingMediaManager_->rehydratedMediaPlayEvents(group), std::nullopt);
                return;
            }
            break;
        case KSEventCategory::linkshelf:
            if (linkshelfManager_) {
                handler(linkshelfManager_->rehydratedSharedContentEvents(group), std::nullopt);
                return;
            }
            break;
        case KSEventCategory::travel:
            if (foresightTravelManager_) {
                handler(foresightTravelManager_->rehydratedTripEvents(group), std::nullopt);
                return;
            }
            break;
        case KSEventCategory::structuredEvent:
        case KSEventCategory::socialEvent:
            if (suggestedEventManager_) {
                handler(suggestedEventManager_->rehydratedSuggestedEvents(group), std::nullopt);
                return;
            }
            break;
        case KSEventCategory::significantContact:
            if (significantContactManager_) {
                handler(significantContactManager_->rehydrateConversations(group), std::nullopt);
                return;
            }
            break;
        default:
            break;
    }
    handler(group, std::nullopt);
}

}  // namespace keepsakes
