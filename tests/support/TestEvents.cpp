// SPDX-License-Identifier: Apache-2.0
#include "support/TestEvents.h"

#include "model/KSEventBundle.h"
#include "model/ValueCoding.h"

namespace keepsakes {

KSUUID testUUID(std::uint32_t number) {
    KSUUID id;
    for (std::size_t byte = 0; byte < 4; ++byte) {
        id.bytes[15 - byte] = static_cast<std::uint8_t>(number >> (8 * byte));
    }
    return id;
}

std::shared_ptr<KSEvent> makeEvent(std::uint32_t number, double start, double end,
                                   KSEventProvider provider, KSEventCategory category) {
    return KSEvent::initWithEventIdentifier(testUUID(number), KSDate{start}, KSDate{end},
                                            KSDate{end + 1}, provider, category);
}

std::shared_ptr<KSEvent> makeWorkout(std::uint32_t number, double start, double end,
                                     std::string type) {
    auto event = makeEvent(number, start, end, KSEventProvider::health, KSEventCategory::workout);
    event->workoutType = std::move(type);
    return event;
}

std::shared_ptr<KSEvent> makePhotos(std::uint32_t number, double start, double end,
                                    std::vector<std::string> inferences) {
    auto event =
        makeEvent(number, start, end, KSEventProvider::photo, KSEventCategory::photoKeepsake);
    auto attributes =
        KSEventExtendedAttributes::initWithLocalIdentifier("keepsake" + std::to_string(number));
    attributes->photoKeepsakeInferences = std::move(inferences);
    event->identifierFromProvider = attributes->photoKeepsakeLocalIdentifier;
    event->extendedAttributes = std::move(attributes);
    return event;
}

std::shared_ptr<KSEvent> makeVisit(std::uint32_t number, double start, double end,
                                   std::string placeName) {
    auto event = makeEvent(number, start, end, KSEventProvider::routine, KSEventCategory::visit);
    event->placeName = std::move(placeName);
    return event;
}

std::shared_ptr<KSEvent> makeFullEvent(std::uint32_t number) {
    auto event =
        makeEvent(number, 1000.25, 2000.5, KSEventProvider::foresight, KSEventCategory::travel);
    event->storedSourceCreationDate = KSDate{1500};
    event->expirationDate = KSDate{9000};
    event->identifierFromProvider = "identifier";
    event->placeUserType = 3;
    event->placeName = "Café Größenwahn ☕";
    event->placeDiscovery = 1;
    event->location = KSLocation{48.2, 16.37};
    event->mode = KSPlaceMode::tourist;
    event->workoutType = "Hiking";
    auto attributes = KSEventExtendedAttributes::initWithLocalIdentifier("keepsake");
    attributes->photoKeepsakeInferences = {"mountain", "hiking"};
    attributes->photoKeepsakeHolidays = {"christmas"};
    attributes->photoKeepsakePublicEvents = {{"Concert", {{"Band", "Other band"}}, "Hall"}};
    attributes->photoKeepsakePersons = {{"p1", "Anna", "c1", "yes"}, {"p2", {}, {}, {}}};
    event->extendedAttributes = std::move(attributes);
    event->suggestedEventTitle = "Flight";
    event->suggestedEventIdentifier = "suggested";
    event->suggestedEventCategory = KSSuggestedEventCategoryFlight;
    event->suggestedEvent = KSDictionary{{"title", "Flight"}, {"stops", 2}};
    event->tripTitle = "Trip";
    event->tripParts = std::vector<KSDictionary>{{{"name", "Vienna"}}, {{"name", "Graz"}}};
    event->mediaTitle = "Title";
    event->mediaAlbum = "Album";
    event->mediaPlayerBundleId = "player";
    event->mediaProductId = "product";
    event->mediaGenre = "Genre";
    event->mediaType = "Type";
    event->mediaArtist = "Artist";
    event->mediaRepetitions = 3;
    event->mediaSumTimePlayed = 612.5;
    event->itemUniqueIdentifier = "item";
    event->itemURL = "https://example.org/?q=1";
    event->itemContentCreationDate = KSDate{800};
    event->itemAuthorAddresses = {"a@example.org", "b@example.org"};
    event->itemAuthorContactIdentifiers = std::vector<std::string>{};
    event->itemAccountHandles = {"handle"};
    event->itemRecipientAddresses = {"c@example.org"};
    event->itemDisplayName = "Display";
    event->itemLinkTitle = "Link";
    event->itemLinkDescription = "Described";
    event->itemIsShared = true;
    event->itemSyndicationStatus = 7;
    event->interactionContactScore = 0.875;
    event->interactionScoredContact = KSDictionary{{"name", "Ben"}};
    event->interactions = std::vector<KSDictionary>{{{"kind", "call"}}};
    event->scoredTopics = KSDictionary{{"T1", 0.75}, {"T2", 1}};
    event->trends = KSDictionary{{"keyword", "workout"}, {"values", KSArray{1, 2.5, "x"}}};
    return event;
}

template <class Record>
KSValue archiveOf(const Record& record) {
    ValueEncoder encoder;
    record.encodeWithCoder(encoder);
    return encoder.take();
}

template KSValue archiveOf(const KSEvent&);
template KSValue archiveOf(const KSEventBundle&);

}  // namespace keepsakes
