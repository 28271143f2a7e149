// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "indexer/IndexWriter.h"

namespace keepsakes {

/// Puts the trips together anew from the calendars' suggestions of travel and lodging, inside the
/// index's pending changes, unless no calendar changed since; whether it did. What recurs (the way
/// to work) is no journey; an entry that several files hold counts once.
bool updateTrips(IndexWriter& index);

}  // namespace keepsakes
