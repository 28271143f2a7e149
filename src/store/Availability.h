// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "core/KSError.h"
#include "core/WorkQueue.h"

namespace keepsakes {

class KSPersistenceManager;

/// Runs `work` on `queue` once the database is open. Without one calls `unavailable`, before this
/// returns, with error 16 and {"stateDatabaseAvailable": false}.
void whenAvailable(KSPersistenceManager& persistenceManager, WorkQueue& queue, Task work,
                   const ResultHandler& unavailable);

/// The handler, with {"stateDatabaseAvailable": true} added to what it is given.
ResultHandler addingAvailability(ResultHandler handler);

}  // namespace keepsakes
