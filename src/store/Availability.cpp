// SPDX-License-Identifier: Apache-2.0
#include "store/Availability.h"

#include <string>
#include <utility>

#include "core/ResultKeys.h"
#include "store/KSPersistenceManager.h"

namespace keepsakes {

void whenAvailable(KSPersistenceManager& persistenceManager, WorkQueue& queue, Task work,
                   const ResultHandler& unavailable) {
    persistenceManager.checkAvailabilityWithCompletionHandler(
        [&](bool available, const OptionalError&) {
            if (available) {
                queue.async(std::move(work));
            } else {
                unavailable(databaseUnavailableError(),
                            {{std::string(kStateDatabaseAvailable), false}});
            }
        });
}

ResultHandler addingAvailability(ResultHandler handler) {
    return [handler = std::move(handler)](OptionalError error, KSDictionary result) {
        result.insert_or_assign(std::string(kStateDatabaseAvailable), true);
        handler(std::move(error), std::move(result));
    };
}

}  // namespace keepsakes
