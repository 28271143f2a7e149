// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <memory>
#include <optional>

#include "core/KSError.h"
#include "core/ServiceLookup.h"
#include "core/WorkQueue.h"
#include "model/KSEvent.h"

namespace keepsakes {

class Clock;
class KSEventStore;
class PhotoAnalysis;

/// Turns photo keepsakes into events, refreshes what the database does not keep of them, and
/// removes those that are gone from the photo library. Owned by the registry as "PhotoManager";
/// fetch-and-save runs on the caller's thread, rehydration and removal on its queue. Questions to
/// the photo analysis block.
class KSPhotoManager final : public KSService {
  public:
    using EventsHandler = std::function<void(KSEventArray, OptionalError)>;

    /// Needs "EventStore".
    static std::shared_ptr<KSPhotoManager> initWithUniverse(const ServiceLookup& universe);

    /// The keepsake summary of the interval; nothing on any error.
    std::optional<KSDictionary> fetchPhotoKeepsakesBetweenStartDate(KSDate start, KSDate end);
    /// A failed fetch is reported as no error and an empty result.
    void fetchAndSavePhotoKeepsakesBetweenStartDate(KSDate start, KSDate end,
                                                    const ResultHandler& handler);
    /// Stores an event for each keepsake that started after the newest stored one.
    void saveKeepsakes(const KSArray& keepsakes, std::optional<KSDate> creationDate,
                       const ResultHandler& handler);
    /// Nothing for a dictionary without identifier or interval.
    std::shared_ptr<KSEvent> createEventFromPhotoKeepsake(const KSDictionary& keepsake) const;

    /// Copies of the events with fresh attributes; events whose keepsake is gone are missing, and
    /// a failed request yields no events at all, with its error.
    void rehydratePhotoKeepsakes(KSEventArray events, EventsHandler handler);
    static KSEventPointer rehydrateEventFromEvent(const KSEvent& event,
                                                  const KSDictionary& keepsake);
    /// Removes the events whose keepsake is not in the summary of the time that they span; a
    /// failed summary counts as an empty one.
    void removePhotoEventsDeletedAtSource(KSEventArray events, ResultHandler handler);

  private:
    KSPhotoManager(PhotoAnalysis& photoAnalysis, Clock& clock,
                   std::shared_ptr<KSEventStore> eventStore);

    void _rehydratePhotoKeepsakes(const KSEventArray& events, const EventsHandler& handler);
    void _removePhotoEventsDeletedAtSource(const KSEventArray& events,
                                           const ResultHandler& handler);

    PhotoAnalysis& photoAnalysis_;
    Clock& clock_;
    const std::shared_ptr<KSEventStore> eventStore_;
    WorkQueue queue_;
};

}  // namespace keepsakes
