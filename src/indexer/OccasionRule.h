// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "core/KSValue.h"
#include "readers/FileRecords.h"

namespace keepsakes {

// Which photos belong to one occasion. Pure functions of the photos; what they are told in another
// order they answer in the same.

/// Neighbouring photos of an occasion are at most so many seconds apart.
inline constexpr double kLongestGap = 3600;
/// ... and at most so many metres, where both have a position: an hour's hike.
inline constexpr double kLongestDistance = 5000;
/// An occasion's photos lie within so many seconds, however dense they are.
inline constexpr double kLongestOccasion = 86400;
/// What the interval of an occasion extends beyond its first and last photo, in seconds, so that a
/// single photo can overlap the walk on which it was taken.
inline constexpr double kOccasionMargin = 60;
/// Occasions that may grow at the same time in different places (photos that several people took);
/// beyond it the one that has waited longest is over.
inline constexpr std::size_t kMostOpenOccasions = 16;

/// What the rule looks at of a photo.
struct OccasionPhoto {
    KSDate taken;
    std::optional<GeoPoint> position;
    /// The occasion that it was part of until now; a smaller number is an older occasion.
    std::optional<std::int64_t> before;
};

/// Indexes into the photos, by time, at least one.
using OccasionMembers = std::vector<std::uint32_t>;

/// The occasions, by the time of their first photo; each photo is in exactly one. A photo joins the
/// occasion nearest to it among those that reach so far in time and place; one without a position
/// joins the one that grew last.
std::vector<OccasionMembers> formOccasions(std::span<const OccasionPhoto> photos);

/// For each occasion the former one that it continues, if any. A former occasion goes on in the one
/// that holds its first photo of those left; where several go on in one, the oldest gives the name.
std::vector<std::optional<std::int64_t>> continuedOccasions(
    std::span<const OccasionPhoto> photos, std::span<const OccasionMembers> occasions);

/// Seconds east of UTC by the tracks recorded at a time.
class TrackZones {
  public:
    explicit TrackZones(std::vector<ZoneSpan> spans);

    /// The offset of the shortest span during which clocks there showed `localTime` (written as
    /// though it were UTC).
    std::optional<int> offsetAt(KSDate localTime) const;

  private:
    // By the local time of their start; `latestEnd_` is the latest local end of a span and all
    // before it.
    std::vector<ZoneSpan> spans_;
    std::vector<double> latestEnd_;
};

/// What a photo says of an occasion besides its time and place.
struct OccasionWords {
    std::vector<std::string> inferences;
    std::vector<std::string> persons;
    std::vector<std::string> holidays;
    std::vector<PublicEventRecord> publicEvents;
};

/// The keys of a keepsake dictionary that its photos' words fill: inferences, holidays, persons and
/// public events, each distinct, the most frequent first, then by name. A person's identifier is
/// made of the name alone, so that it is the same in every occasion.
KSDictionary occasionContent(std::span<const OccasionWords> photos);

/// A UUID made of the SHA-256 of a text: the same text, the same identifier.
KSUUID identifierOf(std::string_view text);

}  // namespace keepsakes
