// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

#include "model/KSEventBundle.h"

namespace SQLite {
class Statement;
}

namespace keepsakes {

class ManagedObjectContext;

/// The rows of bundles. Used on the context's queue, inside its `perform` or `save`. Throws
/// SQLite::Exception.
struct KSEventBundleMO {
    /// The columns that `initWithEventBundleMO` reads, the row's key first.
    static std::string columnNames();

    /// Adds a row for the bundle and makes the stored ones of its events its members.
    static void managedObjectWithEventBundle(const KSEventBundle& bundle,
                                             ManagedObjectContext& context);

    /// The bundle of the row that the statement stands on, without its events, and the row's key.
    struct Stored {
        std::int64_t row = 0;
        std::shared_ptr<KSEventBundle> bundle;
    };
    static Stored initWithEventBundleMO(SQLite::Statement& row);

    /// The events of a bundle's row, by start.
    static KSEventArray eventsOf(std::int64_t row, ManagedObjectContext& context);
};

}  // namespace keepsakes
