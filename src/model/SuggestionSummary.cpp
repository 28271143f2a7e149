// SPDX-License-Identifier: Apache-2.0
#include "model/SuggestionSummary.h"

#include <fmt/format.h>

namespace keepsakes {

std::string_view suggestionWord(std::uint64_t suggestedEventCategory) {
    switch (suggestedEventCategory) {
        case KSSuggestedEventCategoryFlight:
            return "flight";
        case KSSuggestedEventCategoryFood:
            return "restaurant";
        case KSSuggestedEventCategoryTrain:
            return "train";
        case KSSuggestedEventCategoryBus:
            return "bus";
        case KSSuggestedEventCategoryBoat:
            return "boat";
        case KSSuggestedEventCategoryCarRentalPickup:
            return "car rental";
        case KSSuggestedEventCategoryCarRentalDropoff:
            return "car return";
        case KSSuggestedEventCategoryTicket:
            return "ticket";
        case KSSuggestedEventCategoryMovie:
            return "film";
        case KSSuggestedEventCategoryLodging:
            return "stay";
        case KSSuggestedEventCategorySocial:
            return "occasion";
        default:
            return {};
    }
}

std::string suggestionPlace(const KSEvent& event) {
    if (!event.suggestedEvent) return {};
    const auto* place = valueForKey(*event.suggestedEvent, "location").asString();
    // Coordinates tell a person nothing.
    const bool isPlace = place && place->find_first_not_of("0123456789.,;+- ") != std::string::npos;
    return isPlace ? *place : std::string();
}

std::string tripPartsText(const KSEvent& event) {
    if (!event.tripParts || event.tripParts->empty()) return {};
    const auto count = event.tripParts->size();
    return fmt::format("{} part{}", count, count == 1 ? "" : "s");
}

}  // namespace keepsakes
