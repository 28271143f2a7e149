// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <initializer_list>
#include <map>
#include <memory>
#include <string_view>
#include <vector>

#include "core/KSError.h"
#include "core/ServiceLookup.h"
#include "model/KSEvent.h"

namespace keepsakes {

class KSForesightTravelManager;
class KSLinkshelfManager;
class KSNowPlayingMediaManager;
class KSPhotoManager;
class KSRoutineServiceManager;
class KSSignificantContactManager;
class KSSuggestedEventManager;
class KSTopicManager;
class KSVitalsManager;

/// One source's part of a collection.
struct CollectionStep {
    std::string_view successKey;  ///< Set to false in the result when the source fails.
    std::function<void(KSDate start, KSDate end, ResultHandler)> fetchAndSave;
};

/// The registered sources, and which of their operations an event belongs to. Owned by the event
/// manager; its operations may be called from any thread.
class EventSources {
  public:
    using EventsHandler = std::function<void(KSEventArray, OptionalError)>;

    explicit EventSources(const ServiceLookup& universe);

    /// Who answers for the owner's age and sex; may be missing.
    const std::shared_ptr<KSVitalsManager>& vitalsManager() const { return vitalsManager_; }

    /// In the order of collection.
    const std::vector<CollectionStep>& collectionSteps() const { return steps_; }

    /// Removes from the store what a group's source no longer has; a group without a source that
    /// can tell is left alone.
    void _purgeEventsDeletedAtSingleSource(const KSEventArray& group, ResultHandler handler) const;

    /// Fills a group in again from its source; a group without one comes back as it is.
    void _rehydrateEventsBySingleSource(const KSEventArray& group, EventsHandler handler) const;

  private:
    /// What the source of a category does with a group of its events.
    struct Route {
        std::function<void(const KSEventArray&, ResultHandler)> purge;  ///< None: left alone.
        std::function<void(const KSEventArray&, EventsHandler)> rehydrate;
    };

    // Both for a source that is registered alone.
    template <class Source, class FetchAndSave>
    void addStep(std::string_view successKey, const std::shared_ptr<Source>& source,
                 FetchAndSave fetchAndSave);
    template <class Source, class Purge, class Rehydrate>
    void addRoute(std::initializer_list<KSEventCategory> categories,
                  const std::shared_ptr<Source>& source, Purge purge, Rehydrate rehydrate);

    const Route* routeOf(const KSEventArray& group) const;

    std::shared_ptr<KSVitalsManager> vitalsManager_;
    std::shared_ptr<KSRoutineServiceManager> routineServiceManager_;
    std::shared_ptr<KSPhotoManager> photoManager_;
    std::shared_ptr<KSTopicManager> topicManager_;
    std::shared_ptr<KSLinkshelfManager> linkshelfManager_;
    std::shared_ptr<KSSuggestedEventManager> suggestedEventManager_;
    std::shared_ptr<KSForesightTravelManager> foresightTravelManager_;
    std::shared_ptr<KSNowPlayingMediaManager> nowPlayingMediaManager_;
    std::shared_ptr<KSSignificantContactManager> significantContactManager_;
    std::vector<CollectionStep> steps_;
    std::map<KSEventCategory, Route> routes_;
};

}  // namespace keepsakes
