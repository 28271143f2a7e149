// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "indexer/IndexWriter.h"

namespace keepsakes {

/// A name holds for the places within so many metres.
inline constexpr double kNameRadius = 150;
/// A place without any other name is called by the nearest town within so many metres.
inline constexpr double kTownRadius = 25000;

/// Forms the places (locations of interest) anew from all visits of high confidence, names them and
/// tells home and work, inside the index's pending changes; whether anything they are made of had
/// changed. A place keeps its identifier as `continuedPlaces` says; a new one takes one made of the
/// start of its first visit, so that an index built anew mostly gives the same.
bool updatePlaces(IndexWriter& index);

}  // namespace keepsakes
