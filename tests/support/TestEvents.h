// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <string>

#include "core/KSValue.h"
#include "model/KSEvent.h"

namespace keepsakes {

/// An identifier that is the same in every run: all zero but for the number.
KSUUID testUUID(std::uint32_t number);

/// An event with its core alone.
std::shared_ptr<KSEvent> makeEvent(std::uint32_t number, double start, double end,
                                   KSEventProvider provider, KSEventCategory category);

std::shared_ptr<KSEvent> makeWorkout(std::uint32_t number, double start, double end,
                                     std::string type);
std::shared_ptr<KSEvent> makePhotos(std::uint32_t number, double start, double end,
                                    std::vector<std::string> inferences);
std::shared_ptr<KSEvent> makeVisit(std::uint32_t number, double start, double end,
                                   std::string placeName);

/// The record as a dictionary of its coding keys, for whole comparisons that print well.
template <class Record>
KSValue archiveOf(const Record& record);

}  // namespace keepsakes
