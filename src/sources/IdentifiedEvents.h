// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <string>
#include <unordered_set>

#include "core/KSError.h"
#include "model/KSEvent.h"

namespace keepsakes {

class KSEventStore;

// For sources that know their events again by `identifierFromProvider`. An index is a set of such
// identifiers, or a map from them to what the source has now. Any thread may call these.

/// The identifiers of the stored events of the category that start at `earliest` or later.
std::expected<std::unordered_set<std::string>, KSError> storedIdentifiers(KSEventStore& store,
                                                                          KSDate earliest,
                                                                          KSEventCategory category);

/// The events that are not in the index, with those that have no identifier.
template <class Index>
KSEventArray eventsMissingIn(const Index& index, const KSEventArray& events) {
    KSEventArray missing;
    for (const auto& event : events) {
        const auto& identifier = event->identifierFromProvider;
        if (!identifier || !index.contains(*identifier)) missing.push_back(event);
    }
    return missing;
}

/// Calls `each` with the events that are in the index, and what stands there for them.
template <class Index, class Each>
void forEachFoundIn(const Index& index, const KSEventArray& events, const Each& each) {
    for (const auto& event : events) {
        if (!event->identifierFromProvider) continue;
        const auto found = index.find(*event->identifierFromProvider);
        if (found != index.end()) each(*event, found->second);
    }
}

}  // namespace keepsakes
