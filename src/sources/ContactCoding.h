// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>

#include "core/KSValue.h"
#include "platform/ContactStore.h"
#include "platform/InteractionStore.h"

namespace keepsakes {

// How contacts and interactions stand in events and archives: dictionaries whose keys are the
// fields' names; a person is a dictionary, mechanism and direction are their numbers. Reading
// answers nothing for a dictionary that lacks a field or holds one of another kind.

KSDictionary encodeContact(const RankedContact& contact);
std::optional<RankedContact> decodeContact(const KSDictionary& dictionary);

KSDictionary encodeInteraction(const Interaction& interaction);
std::optional<Interaction> decodeInteraction(const KSDictionary& dictionary);

}  // namespace keepsakes
