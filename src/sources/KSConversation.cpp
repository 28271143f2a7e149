// SPDX-License-Identifier: Apache-2.0
#include "sources/KSConversation.h"

#include <fmt/format.h>

#include <functional>
#include <utility>

#include "core/KSAssertion.h"
#include "model/Description.h"
#include "sources/ArchiveErrors.h"
#include "sources/ContactCoding.h"

namespace keepsakes {

namespace {

constexpr int kMissing = 2;

KSError missing(std::string_view key) {
    return KSError::make(
        kKSConversationErrorDomain, kMissing,
        fmt::format("Retrieved nil serialized value for nonnull KSConversation.{}", key));
}

KSError conversationError(std::string_view key, std::string_view expected, const KSValue& decoded) {
    return unexpectedClass(kKSConversationErrorDomain, "KSConversation", key, expected, decoded);
}

/// The archive's value under the key; null, with the error set, for one that is not of the class.
const KSValue* required(const KSDictionary& archive, std::string_view key,
                        std::string_view expected, OptionalError& error) {
    const auto& value = valueForKey(archive, key);
    if (value.isNull()) {
        if (!error) error = missing(key);
        return nullptr;
    }
    if (className(value) != expected) {
        error = conversationError(key, expected, value);
        return nullptr;
    }
    return &value;
}

}  // namespace

KSConversation::KSConversation(std::string contactIdentifier,
                               std::optional<RankedContact> scoredContact,
                               Interactions interactions)
    : contactIdentifier_(std::move(contactIdentifier)),
      scoredContact_(std::move(scoredContact)),
      interactions_(std::move(interactions)) {}

KSConversation::Pointer KSConversation::initWithContactIdentifier(
    std::optional<std::string> contactIdentifier, std::optional<RankedContact> scoredContact,
    std::optional<Interactions> interactions) {
    if (!assertParameter(contactIdentifier.has_value(), "contactIdentifier != nil", kUnit, 41) ||
        !assertParameter(interactions.has_value(), "interactions != nil", kUnit, 42)) {
        return nullptr;
    }
    return Pointer(new KSConversation(std::move(*contactIdentifier), std::move(scoredContact),
                                      std::move(*interactions)));
}

KSConversation::Pointer KSConversation::conversationWithContactIdentifier(
    std::optional<std::string> contactIdentifier, std::optional<RankedContact> scoredContact,
    std::optional<Interactions> interactions) {
    return initWithContactIdentifier(std::move(contactIdentifier), std::move(scoredContact),
                                     std::move(interactions));
}

KSConversation::Pointer KSConversation::copyWithReplacementContactIdentifier(
    std::optional<std::string> identifier) const {
    return initWithContactIdentifier(std::move(identifier), scoredContact_, interactions_);
}

KSConversation::Pointer KSConversation::copyWithReplacementScoredContact(
    std::optional<RankedContact> contact) const {
    return initWithContactIdentifier(contactIdentifier_, std::move(contact), interactions_);
}

KSConversation::Pointer KSConversation::copyWithReplacementInteractions(
    std::optional<Interactions> interactions) const {
    return initWithContactIdentifier(contactIdentifier_, scoredContact_, std::move(interactions));
}

bool KSConversation::isEqual(const KSConversation& other) const {
    return contactIdentifier_ == other.contactIdentifier_ &&
           scoredContact_ == other.scoredContact_ && interactions_ == other.interactions_;
}

std::uint64_t KSConversation::hash() const {
    const std::uint64_t contact =
        scoredContact_ ? std::hash<std::string>()(scoredContact_->identifier) : 0;
    std::uint64_t result = std::hash<std::string>()(contactIdentifier_) * 31 + contact;
    // As many lists that differ do, they differ in length.
    return result * 31 + interactions_.size();
}

std::string KSConversation::description() const {
    std::optional<KSDictionary> contact;
    if (scoredContact_) contact = encodeContact(*scoredContact_);
    std::vector<KSDictionary> interactions;
    for (const auto& interaction : interactions_) {
        interactions.push_back(encodeInteraction(interaction));
    }
    return fmt::format("<KSConversation | contactIdentifier:{} scoredContact:{} interactions:{}>",
                       contactIdentifier_, describe(contact), describe(interactions));
}

KSDictionary KSConversation::encodeWithCoder() const {
    KSArray interactions;
    for (const auto& interaction : interactions_) {
        interactions.emplace_back(encodeInteraction(interaction));
    }
    KSDictionary archive{{"contactIdentifier", contactIdentifier_},
                         {"interactions", std::move(interactions)}};
    if (scoredContact_) archive.emplace("scoredContact", encodeContact(*scoredContact_));
    return archive;
}

KSConversation::Pointer KSConversation::initWithCoder(const KSDictionary& archive,
                                                      OptionalError& error) {
    const auto* identifier = required(archive, "contactIdentifier", "String", error);
    if (!identifier) return nullptr;
    std::optional<RankedContact> contact;
    if (const auto& value = valueForKey(archive, "scoredContact"); !value.isNull()) {
        const auto* dictionary = value.asDictionary();
        if (dictionary) contact = decodeContact(*dictionary);
        if (!contact) error = conversationError("scoredContact", "RankedContact", value);
    }
    if (error) return nullptr;
    const auto* list = required(archive, "interactions", "Array", error);
    if (!list) return nullptr;
    Interactions interactions;
    for (const auto& item : *list->asArray()) {
        const auto* dictionary = item.asDictionary();
        auto interaction = dictionary ? decodeInteraction(*dictionary) : std::nullopt;
        if (!interaction) {
            error = conversationError("interactions", "Interaction", item);
            return nullptr;
        }
        interactions.push_back(std::move(*interaction));
    }
    return initWithContactIdentifier(*identifier->asString(), std::move(contact),
                                     std::move(interactions));
}

}  // namespace keepsakes
