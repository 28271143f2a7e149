// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "core/KSDate.h"
#include "readers/FileRecords.h"
#include "readers/JsonStream.h"
#include "readers/LocationRecords.h"

namespace keepsakes {

// What the readers of location histories share: how files write times, positions and labels.

/// Believes the times of one file, and tells in the end whether any of them was.
class TimeTally {
  public:
    explicit TimeTally(KSDate now) : now_(now) {}

    /// The time when it could be read and is believed.
    std::optional<ParsedDate> take(const std::optional<ParsedDate>& parsed);

    /// The file holds a place, which needs no time.
    void addPlace() { ++taken_; }

    /// Why the file is refused: it has times, and not one is believed, nor any place.
    std::optional<std::string> complaint() const;

  private:
    KSDate now_;
    std::uint64_t taken_ = 0;
    std::uint64_t insane_ = 0;
    std::uint64_t unreadable_ = 0;
};

/// ISO 8601; or a number, also as a string, of seconds or (from 10^11 on) milliseconds since 1970.
std::optional<ParsedDate> timeOf(const JsonScalar& value);

/// "geo:48.1,11.5" (RFC 5870, its parameters are passed over), "48.1°, 11.5°" or "48.1, 11.5".
std::optional<GeoPoint> positionOfText(std::string_view text);

/// Metres; NaN for what is none, 0 included, which files write for "unknown".
float accuracyOf(const JsonScalar& value);

/// A name that a file states, as clean text; empty when there is none or it is too long.
std::string nameOf(const JsonScalar& value);

/// What a label ("INFERRED_HOME", "TYPE_WORK", "Home") says of a place's use.
PlaceUse useOfLabel(std::string_view label);

/// What the owner's own name for a place says of its use: "Home", "Zuhause", "Office" as a whole.
PlaceUse useOfPlaceName(std::string_view name);

/// Adds the span of a known offset; a span that follows the last within a day, with the same
/// offset, prolongs it.
void addZone(std::vector<ZoneSpan>& zones, KSDateInterval span, int offsetSeconds);

}  // namespace keepsakes
