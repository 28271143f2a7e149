// SPDX-License-Identifier: Apache-2.0
#include "model/KSEventExtendedAttributes.h"

#include <fmt/format.h>

#include <array>

#include "core/KSAssertion.h"
#include "core/Text.h"
#include "model/Description.h"
#include "platform/PhotoAnalysis.h"

namespace keepsakes {

namespace {

constexpr auto kPersonFields = std::to_array<KeyedField<KSPerson>>({
    coding::field<&KSPerson::localIdentifier>(kKSKeyPersonLocalIdentifier),
    coding::field<&KSPerson::name>(kKSKeyPersonName),
    coding::field<&KSPerson::contactIdentifier>(kKSKeyContactIdentifier),
    coding::field<&KSPerson::family>(kKSKeyFamily),
});

constexpr auto kPublicEventFields = std::to_array<KeyedField<KSPublicEvent>>({
    coding::field<&KSPublicEvent::name>(kKSKeyName),
    coding::field<&KSPublicEvent::performers>(kKSKeyPerformers),
    coding::field<&KSPublicEvent::venue>(kKSKeyVenue),
});

template <class Record>
void writeAll(KeyedEncoder& out, std::string_view key,
              const std::optional<std::vector<Record>>& records) {
    if (!records) return;
    out.writeRecords(key, records->size(), [&records](std::size_t index, KeyedEncoder& nested) {
        (*records)[index].encodeWithCoder(nested);
    });
}

template <class Record>
bool readAll(KeyedDecoder& in, std::optional<std::vector<Record>>& records) {
    records.emplace();
    return in.readRecords([&records](KeyedDecoder& nested) {
        return Record::initWithCoder(nested, records->emplace_back());
    });
}

using Attributes = KSEventExtendedAttributes;

constexpr auto kAttributeFields = std::to_array<KeyedField<Attributes>>({
    coding::field<&Attributes::photoKeepsakeLocalIdentifier>("photoKeepsakeLocalIdentifier"),
    coding::field<&Attributes::photoKeepsakeInferences>("photoKeepsakeInferences"),
    coding::field<&Attributes::photoKeepsakeHolidays>("photoKeepsakeHolidays"),
    {"photoKeepsakePublicEvents",
     [](KeyedEncoder& out, std::string_view key, const Attributes& record) {
         writeAll(out, key, record.photoKeepsakePublicEvents);
     },
     [](KeyedDecoder& in, Attributes& record) {
         return readAll(in, record.photoKeepsakePublicEvents);
     }},
    {"photoKeepsakePersons",
     [](KeyedEncoder& out, std::string_view key, const Attributes& record) {
         writeAll(out, key, record.photoKeepsakePersons);
     },
     [](KeyedDecoder& in, Attributes& record) { return readAll(in, record.photoKeepsakePersons); }},
});

template <class Record, std::size_t N>
bool readInto(KeyedDecoder& decoder, Record& record,
              const std::array<KeyedField<Record>, N>& table) {
    static const KeyedFieldIndex<Record> index{std::span<const KeyedField<Record>>(table)};
    return decoder.readRecord(
        [&record](std::string_view key, KeyedDecoder& in) { return index.read(key, in, record); });
}

std::optional<std::string> stringAt(const KSDictionary& dictionary, std::string_view key) {
    const auto* text = valueForKey(dictionary, key).asString();
    return text ? std::optional(*text) : std::nullopt;
}

std::optional<std::vector<std::string>> stringsAt(const KSDictionary& dictionary,
                                                  std::string_view key) {
    const auto* array = valueForKey(dictionary, key).asArray();
    return array ? std::optional(stringsOf(*array)) : std::nullopt;
}

template <class Record>
std::optional<std::vector<Record>> recordsAt(const KSDictionary& dictionary, std::string_view key,
                                             Record (*make)(const KSDictionary&)) {
    const auto* array = valueForKey(dictionary, key).asArray();
    if (!array) return std::nullopt;
    std::vector<Record> records;
    for (const auto& item : *array) {
        if (const auto* entry = item.asDictionary()) records.push_back(make(*entry));
    }
    return records;
}

}  // namespace

std::vector<std::string> stringsOf(const KSArray& array) {
    std::vector<std::string> strings;
    for (const auto& item : array) {
        if (const auto* text = item.asString()) strings.push_back(*text);
    }
    return strings;
}

KSPerson KSPerson::initWithPersonDictionary(const KSDictionary& dictionary) {
    return {stringAt(dictionary, kKSKeyPersonLocalIdentifier),
            stringAt(dictionary, kKSKeyPersonName), stringAt(dictionary, kKSKeyContactIdentifier),
            stringAt(dictionary, kKSKeyFamily)};
}

std::string KSPerson::description() const {
    return fmt::format(
        "<KSPerson localIdentifier , {}, name, {}, contactIdentifier, {}, family, {}, >",
        describe(localIdentifier), describe(name), describe(contactIdentifier), describe(family));
}

void KSPerson::encodeWithCoder(KeyedEncoder& encoder) const {
    encodeFields<KSPerson>(encoder, *this, kPersonFields);
}

bool KSPerson::initWithCoder(KeyedDecoder& decoder, KSPerson& person) {
    return readInto(decoder, person, kPersonFields);
}

KSPublicEvent KSPublicEvent::initWithEventDictionary(const KSDictionary& dictionary) {
    return {stringAt(dictionary, kKSKeyName), stringsAt(dictionary, kKSKeyPerformers),
            stringAt(dictionary, kKSKeyVenue)};
}

std::string KSPublicEvent::description() const {
    return fmt::format("<KSPublicEvent name, {}, performers, {}, venue, {}, >", describe(name),
                       describe(performers), describe(venue));
}

void KSPublicEvent::encodeWithCoder(KeyedEncoder& encoder) const {
    encodeFields<KSPublicEvent>(encoder, *this, kPublicEventFields);
}

bool KSPublicEvent::initWithCoder(KeyedDecoder& decoder, KSPublicEvent& event) {
    return readInto(decoder, event, kPublicEventFields);
}

std::shared_ptr<KSEventExtendedAttributes> KSEventExtendedAttributes::initWithLocalIdentifier(
    std::optional<std::string> identifier) {
    if (!assertParameter(identifier.has_value(), "localIdentifier", "KSEventExtendedAtrributes",
                         169)) {
        return nullptr;
    }
    auto attributes = std::make_shared<KSEventExtendedAttributes>();
    attributes->photoKeepsakeLocalIdentifier = std::move(*identifier);
    return attributes;
}

KSEventExtendedAttributes::Pointer KSEventExtendedAttributes::initWithKeepsake(
    const KSDictionary& keepsake) {
    auto attributes = initWithLocalIdentifier(stringAt(keepsake, kKSKeyLocalIdentifier));
    if (!attributes) return nullptr;
    const auto lowerCased = [&keepsake](std::string_view key) {
        auto words = stringsAt(keepsake, key);
        return words ? std::optional(lowerCaseArrayOfStrings(*words)) : std::nullopt;
    };
    attributes->photoKeepsakeInferences = lowerCased(kKSKeyInferences);
    attributes->photoKeepsakeHolidays = lowerCased(kKSKeyHolidays);
    attributes->photoKeepsakePublicEvents =
        recordsAt(keepsake, kKSKeyPublicEvents, &KSPublicEvent::initWithEventDictionary);
    attributes->photoKeepsakePersons =
        recordsAt(keepsake, kKSKeyPersons, &KSPerson::initWithPersonDictionary);
    attributes->photoCount = valueForKey(keepsake, kKSKeyPhotoCount).asInteger();
    return attributes;
}

std::vector<std::string> KSEventExtendedAttributes::lowerCaseArrayOfStrings(
    const std::vector<std::string>& strings) {
    std::vector<std::string> lowered;
    lowered.reserve(strings.size());
    for (const auto& text : strings) lowered.push_back(lowerCased(text));
    return lowered;
}

std::string KSEventExtendedAttributes::description() const {
    return fmt::format(
        "<KSEventExtendedAttributes localIdentifier, {}, photoKeepsakeInferences, {}, "
        "photoKeepsakeHolidays, {}, photoKeepsakePublicEvents, {}, photoKeepsakePersons, {}, >",
        photoKeepsakeLocalIdentifier, describe(photoKeepsakeInferences),
        describe(photoKeepsakeHolidays), describe(photoKeepsakePublicEvents),
        describe(photoKeepsakePersons));
}

void KSEventExtendedAttributes::encodeWithCoder(KeyedEncoder& encoder) const {
    encodeFields<KSEventExtendedAttributes>(encoder, *this, kAttributeFields);
}

bool KSEventExtendedAttributes::initWithCoder(KeyedDecoder& decoder, Pointer& attributes) {
    auto read = std::make_shared<KSEventExtendedAttributes>();
    bool identified = false;
    static const KeyedFieldIndex<Attributes> index{
        std::span<const KeyedField<Attributes>>(kAttributeFields)};
    const bool good = decoder.readRecord([&](std::string_view key, KeyedDecoder& in) {
        identified |= key == "photoKeepsakeLocalIdentifier";
        return index.read(key, in, *read);
    });
    if (!good) return false;
    if (!identified) return decoder.fail("photoKeepsakeLocalIdentifier is missing");
    attributes = std::move(read);
    return true;
}

}  // namespace keepsakes
