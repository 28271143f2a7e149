// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "core/KSError.h"
#include "platform/ContactStore.h"
#include "platform/InteractionStore.h"

namespace keepsakes {

inline constexpr std::string_view kKSConversationErrorDomain = "KSConversationOCNTErrorDomain";

/// The interactions of one group of people on one day, with the best-ranked contact among them. An
/// immutable value, shared and never changed; any thread may use it.
class KSConversation final {
  public:
    using Pointer = std::shared_ptr<const KSConversation>;
    using Interactions = std::vector<Interaction>;

    /// Ascending by start. A missing identifier or missing interactions fail the assertion that
    /// names them and yield nothing.
    static Pointer initWithContactIdentifier(std::optional<std::string> contactIdentifier,
                                             std::optional<RankedContact> scoredContact,
                                             std::optional<Interactions> interactions);
    static Pointer conversationWithContactIdentifier(std::optional<std::string> contactIdentifier,
                                                     std::optional<RankedContact> scoredContact,
                                                     std::optional<Interactions> interactions);

    /// The participants' sorted identifiers, joined by "_".
    const std::string& contactIdentifier() const { return contactIdentifier_; }
    const std::optional<RankedContact>& scoredContact() const { return scoredContact_; }
    const Interactions& interactions() const { return interactions_; }

    Pointer copyWithReplacementContactIdentifier(std::optional<std::string> identifier) const;
    Pointer copyWithReplacementScoredContact(std::optional<RankedContact> contact) const;
    Pointer copyWithReplacementInteractions(std::optional<Interactions> interactions) const;

    bool isEqual(const KSConversation& other) const;
    std::uint64_t hash() const;
    std::string description() const;

    KSDictionary encodeWithCoder() const;
    /// Reads an archive. What it lacks, or holds of another kind, is an error of
    /// `kKSConversationErrorDomain` (2 missing, 3 another kind) and yields nothing; an error that
    /// stands already is kept instead of one for a missing field.
    static Pointer initWithCoder(const KSDictionary& archive, OptionalError& error);

  private:
    static constexpr std::string_view kUnit = "KSConversation";

    KSConversation(std::string contactIdentifier, std::optional<RankedContact> scoredContact,
                   Interactions interactions);

    const std::string contactIdentifier_;
    const std::optional<RankedContact> scoredContact_;
    const Interactions interactions_;
};

}  // namespace keepsakes
