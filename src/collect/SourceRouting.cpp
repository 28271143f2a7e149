// SPDX-License-Identifier: Apache-2.0
#include "collect/SourceRouting.h"

#include <type_traits>
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

    addRoute({KSEventCategory::visit}, routineServiceManager_,
             &KSRoutineServiceManager::removeVisitsDeletedAtSource,
             &KSRoutineServiceManager::rehydrateVisits);
    addRoute({KSEventCategory::photoKeepsake}, photoManager_,
             &KSPhotoManager::removePhotoEventsDeletedAtSource,
             &KSPhotoManager::rehydratePhotoKeepsakes);
    addRoute({KSEventCategory::topic}, topicManager_, nullptr,
             &KSTopicManager::rehydratedScoredTopicsEvents);
    addRoute({KSEventCategory::mediaOnRepeat, KSEventCategory::leisureMedia},
             nowPlayingMediaManager_,
             &KSNowPlayingMediaManager::removeMediaPlayEventsDeletedAtSource,
             &KSNowPlayingMediaManager::rehydratedMediaPlayEvents);
    addRoute({KSEventCategory::linkshelf}, linkshelfManager_,
             &KSLinkshelfManager::removeSharedContentsDeletedAtSource,
             &KSLinkshelfManager::rehydratedSharedContentEvents);
    addRoute({KSEventCategory::travel}, foresightTravelManager_,
             &KSForesightTravelManager::removeTripEventsDeletedAtSource,
             &KSForesightTravelManager::rehydratedTripEvents);
    addRoute({KSEventCategory::structuredEvent, KSEventCategory::socialEvent},
             suggestedEventManager_, &KSSuggestedEventManager::removeSuggestedEventsDeletedAtSource,
             &KSSuggestedEventManager::rehydratedSuggestedEvents);
    addRoute({KSEventCategory::significantContact}, significantContactManager_,
             &KSSignificantContactManager::removeConversationsDeletedAtSource,
             &KSSignificantContactManager::rehydrateConversations);
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

template <class Source, class Purge, class Rehydrate>
void EventSources::addRoute(std::initializer_list<KSEventCategory> categories,
                            const std::shared_ptr<Source>& source, Purge purge,
                            Rehydrate rehydrate) {
    if (!source) return;
    Route route;
    if constexpr (!std::is_null_pointer_v<Purge>) {
        route.purge = [source, purge](const KSEventArray& group, ResultHandler handler) {
            std::invoke(purge, *source, group, std::move(handler));
        };
    }
    route.rehydrate = [source, rehydrate](const KSEventArray& group, EventsHandler handler) {
        if constexpr (std::is_invocable_v<Rehydrate, Source&, const KSEventArray&>) {
            handler(std::invoke(rehydrate, *source, group), std::nullopt);
        } else {
            std::invoke(rehydrate, *source, group, std::move(handler));
        }
    };
    for (const auto category : categories) routes_.emplace(category, route);
}

const EventSources::Route* EventSources::routeOf(const KSEventArray& group) const {
    const auto& event = *group.front();
    // A trends event has the category of what it tells of, and no source.
    if (event.provider() == KSEventProvider::postAnalytics) return nullptr;
    const auto found = routes_.find(event.category());
    return found == routes_.end() ? nullptr : &found->second;
}

void EventSources::_purgeEventsDeletedAtSingleSource(const KSEventArray& group,
                                                     ResultHandler handler) const {
    const auto* route = routeOf(group);
    if (route && route->purge) {
        route->purge(group, std::move(handler));
    } else {
        handler(std::nullopt, {});
    }
}

void EventSources::_rehydrateEventsBySingleSource(const KSEventArray& group,
                                                  EventsHandler handler) const {
    if (const auto* route = routeOf(group)) {
        route->rehydrate(group, std::move(handler));
    } else {
        handler(group, std::nullopt);
    }
}

}  // namespace keepsakes
