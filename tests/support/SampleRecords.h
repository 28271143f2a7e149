// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <string>

#include "model/KSEvent.h"
#include "model/KSEventBundle.h"

namespace keepsakes::samples {

/// A small event; its identifier is made of `number`, its start is an hour after the one before.
inline std::shared_ptr<KSEvent> event(std::uint32_t number = 1) {
    KSUUID identifier;
    for (std::size_t byte = 0; byte < 4; ++byte) {
        identifier.bytes[byte] = static_cast<std::uint8_t>(number >> (8 * byte));
    }
    const KSDate start{700000000.0 + 3600.0 * number};
    auto made = KSEvent::initWithEventIdentifier(identifier, start, start + 1800, start + 1801.5,
                                                 KSEventProvider::routine, KSEventCategory::visit);
    made->placeName = "Café \u6771\u4eac";
    return made;
}

/// An event that has every detail, whatever its category.
inline std::shared_ptr<KSEvent> fullEvent(std::uint32_t number = 1) {
    auto made = event(number);
    made->storedSourceCreationDate = KSDate{699999999.25};
    made->expirationDate = KSDate{800000000};
    made->identifierFromProvider = "provider-1";
    made->placeUserType = 2;
    made->placeDiscovery = 1;
    made->location = KSLocation{48.137154, -11.576124};
    made->mode = KSPlaceMode::tourist;
    made->workoutType = "running";
    const auto attributes = std::make_shared<KSEventExtendedAttributes>();
    attributes->photoKeepsakeLocalIdentifier = "keepsake-7";
    attributes->photoKeepsakeInferences = {{"beach", "sunset"}};
    attributes->photoKeepsakeHolidays = std::vector<std::string>();
    attributes->photoKeepsakePublicEvents = {
        {KSPublicEvent{"Concert", std::vector<std::string>{"A", "B"}, "Hall"}}};
    attributes->photoKeepsakePersons = {{KSPerson{"p1", "Ada", "c1", std::nullopt}, KSPerson{}}};
    made->extendedAttributes = attributes;
    made->suggestedEventTitle = "Dinner";
    made->suggestedEventIdentifier = "s-1";
    made->suggestedEventCategory = KSSuggestedEventCategoryFood;
    made->suggestedEvent =
        KSDictionary{{"title", "Dinner"},
                     {"guests", 4},
                     {"price", 12.5},
                     {"paid", true},
                     {"raw", KSValue::Bytes{0, 255}},
                     {"names", KSArray{"a", "b"}},
                     {"mixed", KSArray{1, "b", KSArray{false}, KSDictionary{{"k", "v"}}}},
                     {"parts", KSArray{KSDictionary{{"n", 1}}, KSDictionary{}}},
                     {"venue", KSDictionary{{"name", "Inn"}, {"stars", 3}}}};
    made->tripTitle = "North";
    made->tripParts = {{KSDictionary{{"leg", 1}}, KSDictionary{{"leg", 2}}}};
    made->mediaTitle = "Song";
    made->mediaAlbum = "Album";
    made->mediaPlayerBundleId = "player";
    made->mediaProductId = "product";
    made->mediaGenre = "jazz";
    made->mediaType = "song";
    made->mediaArtist = "Artist";
    made->mediaRepetitions = 17.0;
    made->mediaSumTimePlayed = 3600.5;
    made->itemUniqueIdentifier = "item";
    made->itemURL = "https://example.org/?a=b&c";
    made->itemContentCreationDate = KSDate{690000000.125};
    made->itemAuthorAddresses = {{"a@example.org"}};
    made->itemAuthorContactIdentifiers = {{"c1"}};
    made->itemAccountHandles = {{"h1"}};
    made->itemRecipientAddresses = {{"b@example.org", "c@example.org"}};
    made->itemDisplayName = "Item";
    made->itemLinkTitle = "Title";
    made->itemLinkDescription = "";
    made->itemIsShared = true;
    made->itemSyndicationStatus = UINT64_MAX;
    made->interactionContactScore = 0.75;
    made->interactionScoredContact = KSDictionary{{"name", "Ada"}};
    made->interactions = {{KSDictionary{{"kind", "call"}}}};
    made->scoredTopics = KSDictionary{{"topic-1", 0.5}};
    made->trends = KSDictionary{{"weekly", KSDictionary{{"slope", 1.5}}}};
    return made;
}

inline std::shared_ptr<KSEventBundle> bundle(KSEventArray events) {
    auto made = KSEventBundle::initWithEventSet(std::move(events), true, {710000000});
    made->promptLanguage = "A hike with photos";
    return made;
}

}  // namespace keepsakes::samples
