// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>

#include "core/KSDate.h"
#include "indexer/IndexWriter.h"
#include "readers/FileRecords.h"

namespace keepsakes {

/// Recurring entries are followed anew when the followed time ends so many seconds after a scan,
/// or begins less than that before it.
inline constexpr double kRecurrenceMargin = 60 * 86400.0;

/// Writes what a calendar file holds; what the index knew of it is removed already.
void putCalendar(IndexWriter& index, std::int64_t file, const FileRecords& records);

/// Has the files read again whose recurring entries were followed for another time than about now.
void rereadUsedUp(IndexWriter& index, KSDate now);

}  // namespace keepsakes
