// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <optional>
#include <string>

#include "model/KSEvent.h"

namespace keepsakes {

/// What a significant-contact event tells people: who, how often, how close. Empty for an event
/// whose contact and interactions are not filled in.
struct ContactSummary {
    std::string name;
    std::size_t messages = 0;
    std::size_t calls = 0;
    std::size_t others = 0;  ///< Participants beside the owner and the contact.
    std::optional<double> score;

    /// "3 messages and 1 call"; empty when there are none.
    std::string countText() const;
    /// "Anna Beispiel and 2 others".
    std::string peopleText() const;
};

ContactSummary contactSummaryOf(const KSEvent& event);

}  // namespace keepsakes
