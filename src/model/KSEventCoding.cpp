// SPDX-License-Identifier: Apache-2.0
#include <array>

#include "model/KSEvent.h"

namespace keepsakes {

namespace {

using coding::field;

/// What an archive is read into before the designated initialiser can be called.
struct Core {
    std::optional<KSUUID> eventIdentifier;
    std::optional<KSDate> startDate;
    std::optional<KSDate> endDate;
    std::optional<KSDate> creationDate;
    std::optional<std::uint64_t> provider;
    std::optional<std::uint64_t> category;
};

constexpr auto kCoreFields = std::to_array<KeyedField<Core>>({
    field<&Core::eventIdentifier>("eventIdentifier"),
    field<&Core::startDate>("startDate"),
    field<&Core::endDate>("endDate"),
    field<&Core::creationDate>("creationDate"),
    field<&Core::provider>("provider"),
    field<&Core::category>("category"),
});

template <auto Member>
constexpr KeyedField<KSEvent> json(std::string_view key) {
    return {
        key,
        [](KeyedEncoder& out, std::string_view name, const KSEvent& event) {
            if (event.*Member) out.writeJson(name, *(event.*Member));
        },
        [](KeyedDecoder& in, KSEvent& event) { return in.readJson((event.*Member).emplace()); }};
}

template <auto Member>
constexpr KeyedField<KSEvent> dictionary(std::string_view key) {
    return {key,
            [](KeyedEncoder& out, std::string_view name, const KSEvent& event) {
                if (event.*Member) out.writeDictionary(name, *(event.*Member));
            },
            [](KeyedDecoder& in, KSEvent& event) {
                return in.readDictionary((event.*Member).emplace());
            }};
}

template <auto Member>
constexpr KeyedField<KSEvent> dictionaries(std::string_view key) {
    return {key,
            [](KeyedEncoder& out, std::string_view name, const KSEvent& event) {
                if (event.*Member) out.writeDictionaries(name, *(event.*Member));
            },
            [](KeyedDecoder& in, KSEvent& event) {
                return in.readDictionaries((event.*Member).emplace());
            }};
}

void writeMode(KeyedEncoder& out, std::string_view key, const KSEvent& event) {
    out.writeUnsigned(key, static_cast<std::uint64_t>(event.mode));
}

bool readMode(KeyedDecoder& in, KSEvent& event) {
    std::uint64_t mode = 0;
    if (!in.readUnsigned(mode)) return false;
    event.mode = static_cast<KSPlaceMode>(mode);
    return true;
}

void writeLocation(KeyedEncoder& out, std::string_view key, const KSEvent& event) {
    if (event.location) out.writeLocation(key, event.location->latitude, event.location->longitude);
}

bool readLocation(KeyedDecoder& in, KSEvent& event) {
    auto& place = event.location.emplace();
    return in.readLocation(place.latitude, place.longitude);
}

void writeAttributes(KeyedEncoder& out, std::string_view key, const KSEvent& event) {
    if (!event.extendedAttributes) return;
    out.writeRecord(
        key, [&event](KeyedEncoder& nested) { event.extendedAttributes->encodeWithCoder(nested); });
}

bool readAttributes(KeyedDecoder& in, KSEvent& event) {
    return KSEventExtendedAttributes::initWithCoder(in, event.extendedAttributes);
}

void writeSourceCreationDate(KeyedEncoder& out, std::string_view key, const KSEvent& event) {
    out.writeDate(key, event.sourceCreationDate());
}

bool readSourceCreationDate(KeyedDecoder& in, KSEvent& event) {
    return in.readDate(event.storedSourceCreationDate.emplace());
}

// Written as 64 bits, read back as 32: the asymmetry is part of the archive's form.
bool readPlaceDiscovery(KeyedDecoder& in, KSEvent& event) {
    std::uint64_t value = 0;
    if (!in.readUnsigned(value)) return false;
    event.placeDiscovery = static_cast<std::uint32_t>(value);
    return true;
}

void writePlaceDiscovery(KeyedEncoder& out, std::string_view key, const KSEvent& event) {
    out.writeUnsigned(key, event.placeDiscovery);
}

/// In the archive's order, behind the core.
constexpr auto kDetailFields = std::to_array<KeyedField<KSEvent>>({
    field<&KSEvent::identifierFromProvider>("identifierFromProvider"),
    field<&KSEvent::expirationDate>("expirationDate"),
    field<&KSEvent::placeName>("placeName"),
    {"location", writeLocation, readLocation},
    field<&KSEvent::workoutType>("workoutType"),
    field<&KSEvent::suggestedEventTitle>("suggestedEventTitle"),
    field<&KSEvent::suggestedEventIdentifier>("suggestedEventIdentifier"),
    field<&KSEvent::suggestedEventCategory>("suggestedEventCategory"),
    dictionary<&KSEvent::suggestedEvent>("suggestedEvent"),
    field<&KSEvent::tripTitle>("tripTitle"),
    dictionaries<&KSEvent::tripParts>("tripParts"),
    field<&KSEvent::mediaTitle>("mediaTitle"),
    field<&KSEvent::mediaAlbum>("mediaAlbum"),
    field<&KSEvent::mediaPlayerBundleId>("mediaPlayerBundleId"),
    field<&KSEvent::mediaProductId>("mediaProductId"),
    field<&KSEvent::mediaGenre>("mediaGenre"),
    field<&KSEvent::mediaType>("mediaType"),
    field<&KSEvent::mediaArtist>("mediaArtist"),
    field<&KSEvent::mediaRepetitions>("mediaRepetitions"),
    field<&KSEvent::mediaSumTimePlayed>("mediaSumTimePlayed"),
    field<&KSEvent::itemUniqueIdentifier>("itemUniqueIdentifier"),
    field<&KSEvent::itemURL>("itemURL"),
    field<&KSEvent::itemContentCreationDate>("itemContentCreationDate"),
    field<&KSEvent::itemAuthorAddresses>("itemAuthorAddresses"),
    field<&KSEvent::itemAuthorContactIdentifiers>("itemAuthorContactIdentifiers"),
    field<&KSEvent::itemAccountHandles>("itemAccountHandles"),
    field<&KSEvent::itemRecipientAddresses>("itemRecipientAddresses"),
    field<&KSEvent::itemDisplayName>("itemDisplayName"),
    field<&KSEvent::itemLinkTitle>("itemLinkTitle"),
    field<&KSEvent::itemLinkDescription>("itemLinkDescription"),
    field<&KSEvent::itemIsShared>("itemIsShared"),
    field<&KSEvent::itemSyndicationStatus>("itemSyndicationStatus"),
    field<&KSEvent::interactionContactScore>("interactionContactScore"),
    dictionary<&KSEvent::interactionScoredContact>("interactionScoredContact"),
    dictionaries<&KSEvent::interactions>("interactions"),
    json<&KSEvent::scoredTopics>("scoredTopics"),
    {"extendedAttributes", writeAttributes, readAttributes},
    json<&KSEvent::trends>("trends"),
    {"sourceCreationDate", writeSourceCreationDate, readSourceCreationDate},
    field<&KSEvent::placeUserType>("placeUserType"),
    {"mode", writeMode, readMode},
    {"placeDiscovery", writePlaceDiscovery, readPlaceDiscovery},
});

/// The key of the first core field that is missing or holds what no event may hold; empty when
/// all is well.
std::string_view firstBadCoreKey(const Core& core) {
    if (!core.eventIdentifier) return "eventIdentifier is missing";
    if (!core.startDate) return "startDate is missing";
    if (!core.endDate) return "endDate is missing";
    if (!core.creationDate) return "creationDate is missing";
    if (!core.provider) return "provider is missing";
    if (*core.provider == 0) return "provider is 0";
    if (!core.category) return "category is missing";
    if (*core.category == 0) return "category is 0";
    return {};
}

}  // namespace

void KSEvent::encodeWithCoder(KeyedEncoder& encoder) const {
    encodeFields<Core>(
        encoder,
        {eventIdentifier_, startDate_, endDate_, creationDate_,
         static_cast<std::uint64_t>(provider_), static_cast<std::uint64_t>(category_)},
        kCoreFields);
    encodeFields<KSEvent>(encoder, *this, kDetailFields);
}

std::shared_ptr<KSEvent> KSEvent::initWithCoder(KeyedDecoder& decoder) {
    static const KeyedFieldIndex<Core> coreFields{std::span<const KeyedField<Core>>(kCoreFields)};
    static const KeyedFieldIndex<KSEvent> detailFields{
        std::span<const KeyedField<KSEvent>>(kDetailFields)};

    // Fields come in any order, so the details are read into a record whose core is set last.
    Core core;
    std::shared_ptr<KSEvent> event(new KSEvent({}, {}, {}, {}, {}, {}));
    const bool good = decoder.readRecord([&](std::string_view key, KeyedDecoder& in) {
        if (coreFields.holds(key)) return coreFields.read(key, in, core);
        return detailFields.read(key, in, *event);
    });
    if (!good) return nullptr;
    if (const auto reason = firstBadCoreKey(core); !reason.empty()) {
        decoder.fail(reason);
        return nullptr;
    }
    event->eventIdentifier_ = *core.eventIdentifier;
    event->startDate_ = *core.startDate;
    event->endDate_ = *core.endDate;
    event->creationDate_ = *core.creationDate;
    event->provider_ = static_cast<KSEventProvider>(*core.provider);
    event->category_ = static_cast<KSEventCategory>(*core.category);
    return event;
}

}  // namespace keepsakes
