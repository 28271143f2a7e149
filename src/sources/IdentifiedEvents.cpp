// SPDX-License-Identifier: Apache-2.0
#include "sources/IdentifiedEvents.h"

#include "store/KSEventStore.h"

namespace keepsakes {

std::expected<std::unordered_set<std::string>, KSError> storedIdentifiers(
    KSEventStore& store, KSDate earliest, KSEventCategory category) {
    std::unordered_set<std::string> identifiers;
    OptionalError failed;
    store.fetchEventsWithStartDateAfter(
        earliest, category,
        [&identifiers, &failed](const KSEventArray& events, const OptionalError& error) {
            failed = error;
            for (const auto& event : events) {
                if (event->identifierFromProvider) {
                    identifiers.insert(*event->identifierFromProvider);
                }
            }
        });
    if (failed) return std::unexpected(std::move(*failed));
    return identifiers;
}

}  // namespace keepsakes
