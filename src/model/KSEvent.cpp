// SPDX-License-Identifier: Apache-2.0
#include "model/KSEvent.h"

#include <fmt/format.h>

#include <array>

#include "core/Calendar.h"
#include "core/KSAssertion.h"
#include "model/Description.h"

namespace keepsakes {

namespace {

constexpr std::size_t kMostDescribedInteractions = 10;

constexpr std::array<std::string_view, 6> kProviderNames = {
    "Unknown Provider", "Health", "Photo", "Foresight", "Routine", "Post Analytics"};

// 6 has no name on purpose: no source ever used it.
constexpr std::array<std::string_view, 13> kCategoryNames = {"Unknown Category",
                                                             "Visit",
                                                             "Workout",
                                                             "Media On Repeat",
                                                             "Leisure Media",
                                                             "Photo Keepsake",
                                                             "",
                                                             "Topic",
                                                             "Travel",
                                                             "Linkshelf",
                                                             "Significant Contact",
                                                             "Structured Event",
                                                             "Social Event"};

constexpr std::array<std::string_view, 13> kSuggestedEventNames = {
    "KSSuggestedEventCategoryNone",
    "KSSuggestedEventCategoryFlight",
    "KSSuggestedEventCategoryFood",
    "KSSuggestedEventCategoryTrain",
    "KSSuggestedEventCategoryBus",
    "KSSuggestedEventCategoryBoat",
    "KSSuggestedEventCategoryCarRentalPickup",
    "KSSuggestedEventCategoryCarRentalDropoff",
    "KSSuggestedEventCategoryTicket",
    "KSSuggestedEventCategoryMovie",
    "KSSuggestedEventCategoryLodging",
    "KSSuggestedEventCategorySocial",
    "KSSuggestedEventCategoryNLEvent"};

template <std::size_t N>
std::string nameOrUnknown(std::uint64_t value, const std::array<std::string_view, N>& names) {
    if (value < N && !names[value].empty()) return std::string(names[value]);
    return fmt::format("Unknown ({})", value);
}

}  // namespace

KSEvent::KSEvent(const KSUUID& eventIdentifier, KSDate startDate, KSDate endDate,
                 KSDate creationDate, KSEventProvider provider, KSEventCategory category)
    : eventIdentifier_(eventIdentifier),
      startDate_(startDate),
      endDate_(endDate),
      creationDate_(creationDate),
      provider_(provider),
      category_(category) {}

std::shared_ptr<KSEvent> KSEvent::initWithEventIdentifier(std::optional<KSUUID> eventIdentifier,
                                                          std::optional<KSDate> startDate,
                                                          std::optional<KSDate> endDate,
                                                          std::optional<KSDate> creationDate,
                                                          KSEventProvider provider,
                                                          KSEventCategory category) {
    const bool good =
        assertParameter(eventIdentifier.has_value(), "eventIdentifier", kUnit, 63) &&
        assertParameter(startDate.has_value(), "startDate", kUnit, 64) &&
        assertParameter(endDate.has_value(), "endDate", kUnit, 65) &&
        assertParameter(creationDate.has_value(), "creationDate", kUnit, 66) &&
        assertParameter(provider != KSEventProvider::unknown, "provider", kUnit, 67) &&
        assertParameter(category != KSEventCategory::unknown, "category", kUnit, 68);
    if (!good) return nullptr;
    return std::shared_ptr<KSEvent>(
        new KSEvent(*eventIdentifier, *startDate, *endDate, *creationDate, provider, category));
}

bool KSEvent::isHomeWorkVisit() const {
    return category_ == KSEventCategory::visit && (placeUserType == 1 || placeUserType == 2);
}

std::shared_ptr<KSEvent> KSEvent::copy() const {
    auto other = initWithEventIdentifier(eventIdentifier_, startDate_, endDate_, creationDate_,
                                         provider_, category_);
    if (!other) return nullptr;
    other->expirationDate = expirationDate;
    other->storedSourceCreationDate = sourceCreationDate();
    other->mode = mode;
    return other;
}

std::string KSEvent::describeProvider(KSEventProvider provider) {
    return nameOrUnknown(static_cast<std::uint64_t>(provider), kProviderNames);
}

std::string KSEvent::describeCategory(KSEventCategory category) {
    return nameOrUnknown(static_cast<std::uint64_t>(category), kCategoryNames);
}

std::string_view KSEvent::_descriptionOf(std::uint64_t suggestedEventCategory) {
    if (suggestedEventCategory >= kSuggestedEventNames.size()) return "Unknown";
    return kSuggestedEventNames[suggestedEventCategory];
}

std::string_view KSEvent::descriptionOfMode(KSPlaceMode mode) {
    switch (mode) {
        case KSPlaceMode::local:
            return "Local";
        case KSPlaceMode::tourist:
            return "Tourist";
        default:
            return "Unknown";
    }
}

std::optional<std::string> KSEvent::FormatDate(std::optional<KSDate> date) {
    if (!date) return std::nullopt;
    return calendar::fullDateLongTime(*date);
}

std::string KSEvent::describeDetails() const {
    if (provider_ == KSEventProvider::postAnalytics) {
        return fmt::format("trends data, {{{}}}", describe(trends));
    }
    switch (category_) {
        case KSEventCategory::visit: {
            const auto place = location.value_or(KSLocation{});
            return fmt::format(
                "placeName, {}, latitude, {:f}, longitude, {:f}, locationMode, {}, new place, {}",
                describe(placeName), place.latitude, place.longitude, descriptionOfMode(mode),
                placeDiscovery);
        }
        case KSEventCategory::workout:
            return fmt::format("workoutType, {}", describe(workoutType));
        case KSEventCategory::mediaOnRepeat:
        case KSEventCategory::leisureMedia:
            return fmt::format(
                "mediaTitle, {}, mediaAlbum, {}, mediaPlayerBundleId, {}, mediaProductId, {}, "
                "mediaGenre, {}, mediaType, {}, mediaArtist, {}, mediaRepetitions, {}, "
                "mediaSumTimePlayed, {}",
                describe(mediaTitle), describe(mediaAlbum), describe(mediaPlayerBundleId),
                describe(mediaProductId), describe(mediaGenre), describe(mediaType),
                describe(mediaArtist), describe(mediaRepetitions), describe(mediaSumTimePlayed));
        case KSEventCategory::photoKeepsake:
            return fmt::format("extendedAttributes, {}", describe(extendedAttributes));
        case KSEventCategory::topic: {
            auto named = scoredTopics;
            if (named) named = _displayNameOfScoredTopics(*named);
            return fmt::format("scoredTopics, {}", describe(named));
        }
        case KSEventCategory::travel:
            return fmt::format("tripTitle, {}, tripParts, {}", describe(tripTitle),
                               describe(tripParts));
        case KSEventCategory::linkshelf:
            return fmt::format(
                "itemUniqueIdentifier, {}, itemURL, {}, itemContentCreationDate, {}, "
                "itemAuthorAddresses, {}, itemAuthorContactIdentifiers, {}, itemAccountHandles, "
                "{}, itemRecipientAddresses, {}, itemDisplayName, {}, itemLinkTitle, {}, "
                "itemLinkDescription, {}, itemIsShared, {}, itemSyndicationStatus, {}",
                describe(itemUniqueIdentifier), describe(itemURL),
                describe(FormatDate(itemContentCreationDate)), describe(itemAuthorAddresses),
                describe(itemAuthorContactIdentifiers), describe(itemAccountHandles),
                describe(itemRecipientAddresses), describe(itemDisplayName),
                describe(itemLinkTitle), describe(itemLinkDescription), itemIsShared ? "YES" : "NO",
                static_cast<std::int64_t>(itemSyndicationStatus));
        case KSEventCategory::significantContact: {
            const auto count = interactions ? interactions->size() : 0;
            if (count <= kMostDescribedInteractions) {
                return fmt::format("interactionScoredContact, {}, interactions, {}",
                                   describe(interactionScoredContact), describe(interactions));
            }
            const std::vector<KSDictionary> first(
                interactions->begin(), interactions->begin() + kMostDescribedInteractions);
            return fmt::format(
                "interactionScoredContact, {}, interactions, {} \n ... and {} others",
                describe(interactionScoredContact), describe(first),
                count - kMostDescribedInteractions);
        }
        case KSEventCategory::structuredEvent:
        case KSEventCategory::socialEvent:
            return fmt::format(
                "suggestedEventTitle, {}, suggestedEventIdentifier, {}, suggestedEventCategory, "
                "{}, suggestedEvent, {}",
                describe(suggestedEventTitle), describe(suggestedEventIdentifier),
                _descriptionOf(suggestedEventCategory), describe(suggestedEvent));
        default:
            return "no other details";
    }
}

std::string KSEvent::description() const {
    return fmt::format(
        "<KSEvent eventIdentifier, {}, identifierFromProvider, {}, startDate, {}, endDate, {}, "
        "creationDate, {}, sourceCreationDate, {}, expirationDate, {}, provider, {}, category, "
        "{}, {}>",
        eventIdentifier_.string(), describe(identifierFromProvider),
        describe(FormatDate(startDate_)), describe(FormatDate(endDate_)),
        describe(FormatDate(creationDate_)), describe(FormatDate(sourceCreationDate())),
        describe(FormatDate(expirationDate)), describeProvider(), describeCategory(),
        describeDetails());
}

}  // namespace keepsakes
