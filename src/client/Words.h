// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "core/KSDate.h"
#include "model/KSEvent.h"

namespace keepsakes {

/// The words that people give on the command line.

/// A time: ISO 8601 (the owner's zone unless it names one), "now", "today", "yesterday", or how
/// long ago: "90m", "12h", "3d", "2w". A whole day is given by its beginning.
struct GivenTime {
    KSDate date;
    bool wholeDay = false;

    /// The same, or for a whole day its end.
    KSDate end() const;
};
std::optional<GivenTime> parseTime(std::string_view word, KSDate now);

/// A category by its display name, in any case, or by its number.
std::optional<KSEventCategory> parseCategory(std::string_view word);
/// The display names, separated by commas.
std::string categoryNames();

}  // namespace keepsakes
