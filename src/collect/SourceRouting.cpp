// SPDX-License-Identifier: Apache-2.0
#include "collect/SourceRouting.h"

#include <utility>

#include "sources/KSPhotoManager.h"
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
      photoManager_(universe.service<KSPhotoManager>("PhotoManager")) {
    if (vitalsManager_) {
        steps_.push_back({"resultWorkoutsSuccess",
                          [source = vitalsManager_](KSDate start, KSDate end, ResultHandler done) {
                              source->fetchAndSaveWorkoutsBetweenStartDate(start, end,
                                                                           std::move(done));
                          }});
    }
    if (photoManager_) {
        steps_.push_back(
            {"resultPhotosSuccess",
             [source = photoManager_](KSDate start, KSDate end, const ResultHandler& done) {
                 source->fetchAndSavePhotoKeepsakesBetweenStartDate(start, end, done);
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
        case KSEventCategory::photoKeepsake:
            if (photoManager_) {
                photoManager_->removePhotoEventsDeletedAtSource(group, std::move(handler));
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
        case KSEventCategory::photoKeepsake:
            if (photoManager_) {
                photoManager_->rehydratePhotoKeepsakes(group, std::move(handler));
                return;
            }
            break;
        default:
            break;
    }
    handler(group, std::nullopt);
}

}  // namespace keepsakes
