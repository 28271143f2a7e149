// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>

#include "model/KSEvent.h"
#include "platform/RoutineService.h"

namespace keepsakes {

/// Helpers on the routine service's visits. Any thread may call them.
namespace KSExtensions {

/// What the owner calls the place, else what a map does.
std::optional<std::string> getPlaceName(const RoutineVisit& visit);
std::optional<KSLocation> getLocation(const RoutineVisit& visit);

/// Whether the event was made of the visit: both began and ended at exactly the same instants.
bool isEqualToVisitKeepsake(const RoutineVisit& visit, const KSEvent& event);

/// Whether both tell of the same stay; what both leave out is the same.
bool isEqualToLoiVisit(const RoutineVisit& visit, const LocationOfInterestVisit& other);

}  // namespace KSExtensions

}  // namespace keepsakes
