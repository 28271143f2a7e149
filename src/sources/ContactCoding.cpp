// SPDX-License-Identifier: Apache-2.0
#include "sources/ContactCoding.h"

#include <utility>

namespace keepsakes {

namespace {

KSDictionary encodePerson(const InteractionPerson& person) {
    KSDictionary dictionary;
    if (person.personId) dictionary.emplace("personId", *person.personId);
    if (person.identifier) dictionary.emplace("identifier", *person.identifier);
    return dictionary;
}

std::optional<std::string> textAt(const KSDictionary& dictionary, std::string_view key) {
    const auto* text = valueForKey(dictionary, key).asString();
    return text ? std::optional(*text) : std::nullopt;
}

InteractionPerson decodePerson(const KSDictionary& dictionary) {
    return {.personId = textAt(dictionary, "personId"),
            .identifier = textAt(dictionary, "identifier")};
}

}  // namespace

KSDictionary encodeContact(const RankedContact& contact) {
    return {{"identifier", contact.identifier}, {"name", contact.name}, {"score", contact.score}};
}

std::optional<RankedContact> decodeContact(const KSDictionary& dictionary) {
    auto identifier = textAt(dictionary, "identifier");
    auto name = textAt(dictionary, "name");
    const auto score = valueForKey(dictionary, "score").asNumber();
    if (!identifier || !name || !score) return std::nullopt;
    return RankedContact{
        .identifier = std::move(*identifier), .name = std::move(*name), .score = *score};
}

KSDictionary encodeInteraction(const Interaction& interaction) {
    KSArray recipients;
    for (const auto& person : interaction.recipients) {
        recipients.emplace_back(encodePerson(person));
    }
    return {{"uuid", interaction.uuid},
            {"startDate", interaction.startDate},
            {"endDate", interaction.endDate},
            {"mechanism", static_cast<int>(interaction.mechanism)},
            {"direction", static_cast<int>(interaction.direction)},
            {"sender", encodePerson(interaction.sender)},
            {"recipients", std::move(recipients)}};
}

std::optional<Interaction> decodeInteraction(const KSDictionary& dictionary) {
    auto uuid = textAt(dictionary, "uuid");
    const auto start = valueForKey(dictionary, "startDate").asDate();
    const auto end = valueForKey(dictionary, "endDate").asDate();
    const auto mechanism = valueForKey(dictionary, "mechanism").asInteger();
    const auto direction = valueForKey(dictionary, "direction").asInteger();
    const auto* sender = valueForKey(dictionary, "sender").asDictionary();
    const auto* recipients = valueForKey(dictionary, "recipients").asArray();
    if (!uuid || !start || !end || !mechanism || !direction || !sender || !recipients) {
        return std::nullopt;
    }
    Interaction interaction{.uuid = std::move(*uuid),
                            .startDate = *start,
                            .endDate = *end,
                            .mechanism = static_cast<InteractionMechanism>(*mechanism),
                            .direction = static_cast<InteractionDirection>(*direction),
                            .sender = decodePerson(*sender),
                            .recipients = {}};
    for (const auto& item : *recipients) {
        const auto* person = item.asDictionary();
        if (!person) return std::nullopt;
        interaction.recipients.push_back(decodePerson(*person));
    }
    return interaction;
}

}  // namespace keepsakes
