// SPDX-License-Identifier: Apache-2.0
#include "sources/KSVisitExtensions.h"

namespace keepsakes::KSExtensions {

std::optional<std::string> getPlaceName(const RoutineVisit& visit) {
    const auto& inference = visit.placeInference;
    if (!inference) return std::nullopt;
    if (inference->preferredName) return inference->preferredName;
    return inference->mapItem ? inference->mapItem->name : std::nullopt;
}

std::optional<KSLocation> getLocation(const RoutineVisit& visit) {
    if (!visit.location) return std::nullopt;
    return KSLocation{visit.location->latitude, visit.location->longitude};
}

bool isEqualToVisitKeepsake(const RoutineVisit& visit, const KSEvent& event) {
    return visit.entry && visit.exit && *visit.entry == event.startDate() &&
           *visit.exit == event.endDate();
}

bool isEqualToLoiVisit(const RoutineVisit& visit, const LocationOfInterestVisit& other) {
    return visit.location == other.location && visit.entry == other.entryDate &&
           visit.exit == other.exitDate;
}

}  // namespace keepsakes::KSExtensions
