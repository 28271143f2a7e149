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
    if (vitalsManager_) {
        steps_.push_back({"resultWorkoutsSuccess",
                          [source = vitalsManager_](KSDate start, KSDate end, ResultHandler done) {
                              source->fetchAndSaveWorkoutsBetweenStartDate(start, end,
                                                                           std::move(done));
                          }});
    }
    if (routineServiceManager_) {
        steps_.push_back(
            {"resultVisitsSuccess",
             [source = routineServiceManager_](KSDate start, KSDate end, ResultHandler done) {
                 source->fetchAndSaveVisitsBetweenStartDate(start, end, std::move(done));
             }});
    }
    if (photoManager_) {
        steps_.push_back(
            {"resultPhotosSuccess",
             [source = photoManager_](KSDate start, KSDate end, const ResultHandler& done) {
                 source->fetchAndSavePhotoKeepsakesBetweenStartDate(start, end, done);
             }});
    }
    if (topicManager_) {
        // Whatever the window is: of the day before its end.
        steps_.push_back({"resultTopicsSuccess",
                          [source = topicManager_](KSDate, KSDate end, ResultHandler done) {
                              source->fetchAndSaveScoredTopicsBetweenStartDate(
                                  KSTopicManager::startOfDayBefore(end),
                                  KSTopicManager::endOfDayBefore(end), std::move(done));
                          }});
    }
    if (linkshelfManager_) {
        steps_.push_back(
            {"resultSharedSuccess",
             [source = linkshelfManager_](KSDate start, KSDate end, ResultHandler done) {
                 source->fetchAndSaveSharedContentBetweenStartDate(start, end, std::move(done));
             }});
    }
    if (suggestedEventManager_) {
        steps_.push_back(
            {"resultSuggestedSuccess",
             [source = suggestedEventManager_](KSDate start, KSDate end, ResultHandler done) {
                 source->fetchAndSaveSuggestedEventBetweenStartDate(start, end, std::move(done));
             }});
    }
    if (foresightTravelManager_) {
        steps_.push_back(
            {"resultTripsSuccess",
             [source = foresightTravelManager_](KSDate start, KSDate end, ResultHandler done) {
                 source->fetchAndSaveTripsBetweenStartDate(start, end, std::move(done));
             }});
    }
    if (nowPlayingMediaManager_) {
        steps_.push_back(
            {"resultMusicSuccess",
             [source = nowPlayingMediaManager_](KSDate start, KSDate end, ResultHandler done) {
                 source->fetchAndSaveRepeatedMediaPlayBetweenStartDate(start, end, std::move(done));
             }});
    }
    if (significantContactManager_) {
        steps_.push_back(
            {"resultContactsSuccess",
             [source = significantContactManager_](KSDate start, KSDate end, ResultHandler done) {
                 source->fetchAndSaveConversationsBetweenStartDate(start, end, std::move(done));
             }});
    }
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
