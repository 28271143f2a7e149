// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "core/WorkQueue.h"
#include "devicedata/IndexFile.h"
#include "platform/RoutineService.h"

namespace keepsakes {

class Clock;

/// Farther from home than so many metres, the owner is a tourist.
inline constexpr double kLocalRadius = 50000;
/// A visit at the end of what was recorded counts as over when nothing came for so many seconds:
/// no later point could be of the same visit.
inline constexpr double kVisitGivenUpAfter = 43200;

/// The routine service answered from the visits and places of the index. Before the first scan
/// there are none. Handlers run on the service's own queue; its owner's destruction waits for
/// questions under way. `clock` outlives it.
class IndexedRoutineService final : public RoutineService {
  public:
    IndexedRoutineService(std::filesystem::path index, const Clock& clock);

    void fetchStoredVisits(const VisitFetchOptions& options,
                           std::function<void(Visits)> handler) override;
    void fetchLocationsOfInterestVisitedBetween(KSDate start, KSDate end,
                                                std::function<void(Locations)> handler) override;
    /// By the distance from the nearest home; unknown without one.
    void fetchRoutineModeFromLocation(GeoPoint location,
                                      std::function<void(Mode)> handler) override;

  private:
    Visits visits(const VisitFetchOptions& options) const;
    Locations locations(KSDate start, KSDate end) const;
    Mode mode(GeoPoint location) const;

    const IndexFile index_;
    const Clock& clock_;
    WorkQueue queue_{"IndexedRoutineService"};
};

}  // namespace keepsakes
