// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <string>

#include "model/KSEvent.h"

namespace SQLite {
class Statement;
}

namespace keepsakes {

class ManagedObjectContext;

/// The rows of events: which column holds which field, and the statements made of that. Used on
/// the context's queue, inside its `perform` or `save`. Throws SQLite::Exception.
struct KSEventMO {
    /// The columns, in the order that `initWithEventMO` reads them, each behind `prefix`.
    static std::string columnNames(std::string_view prefix = "");

    /// Adds a row with the event's values; answers the row's key.
    static std::int64_t managedObjectWithEvent(const KSEvent& event, ManagedObjectContext& context);

    /// Overwrites a row with the event's values.
    static void setPropertiesOfEventMO(std::int64_t row, const KSEvent& event,
                                       ManagedObjectContext& context);

    /// The last row with this identifier; 0 when there is none.
    static std::int64_t rowWithIdentifier(const KSUUID& identifier, ManagedObjectContext& context);

    /// The event of the row that the statement stands on, whose result holds the columns from
    /// `firstColumn` on. A row of unknown provider or category yields nothing; it is purged.
    static KSEventPointer initWithEventMO(SQLite::Statement& row, int firstColumn = 0);
};

}  // namespace keepsakes
