// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>

#include "indexer/IndexWriter.h"

namespace keepsakes {

/// Finds the visits anew of the days on which points or stated visits came, changed or vanished,
/// inside the index's pending changes; whether there were any. The result is that of all files'
/// points in the order of time, as if every day had been looked at: the work begins with the last
/// stay before such a day and ends where it comes upon a stay that is known already. A visit that
/// stays as it was keeps its row, and so its place and the date on which it was recorded; `now` is
/// that of the others. `alive` is called for each day.
///
/// High-confidence visits that a file states are taken as stated; points during them find nothing.
bool updateVisits(IndexWriter& index, KSDate now, const std::function<void()>& alive);

}  // namespace keepsakes
