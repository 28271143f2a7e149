// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "indexer/IndexWriter.h"

namespace keepsakes {

/// Forms the occasions anew from every photo of the index and writes what differs, inside the
/// index's pending changes. An occasion keeps its identifier as `continuedOccasions` says; a new
/// one takes one made from the file of its first photo, so that an index built anew gives the same.
///
/// A photo whose time stands on the owner's zone takes the zone of a track recorded at that time.
/// Photos of the same second and place (an edited copy beside its original) count as one.
void updateOccasions(IndexWriter& index);

}  // namespace keepsakes
