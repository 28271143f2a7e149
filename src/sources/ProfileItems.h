// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <vector>

#include "core/Log.h"
#include "platform/ProfileEventStore.h"

namespace keepsakes {

/// The trips or suggested events that the profile service has for the query, or nothing, with a
/// warning, when it fails.
template <class Item, class Query>
std::optional<std::vector<Item>> profileItems(ProfileEventStore& store, const Query& query) {
    std::vector<Item> items;
    const auto error = store.iterateScoredEvents(query, [&items](const Item& item) {
        items.push_back(item);
        return true;
    });
    if (!error) return items;
    logWarning(error->description());
    return std::nullopt;
}

}  // namespace keepsakes
