// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <span>
#include <string>
#include <string_view>

#include "core/KSDate.h"
#include "core/KSError.h"

namespace keepsakes {

/// Keys of a keepsake summary: a dictionary with the date of the analysis and "events", an array
/// of keepsake dictionaries.
inline constexpr std::string_view kKSKeyGraphCreationDate = "graphCreationDate";
inline constexpr std::string_view kKSKeyEvents = "events";

/// Keys of a keepsake dictionary. The interval is a dictionary of "start" and "end" dates; persons
/// and public events are arrays of dictionaries, the others strings and arrays of strings.
inline constexpr std::string_view kKSKeyEventUniversalDateInterval = "eventUniversalDateInterval";
inline constexpr std::string_view kKSKeyIntervalStart = "start";
inline constexpr std::string_view kKSKeyIntervalEnd = "end";
inline constexpr std::string_view kKSKeyLocalIdentifier = "localIdentifier";
inline constexpr std::string_view kKSKeyInferences = "inferences";
inline constexpr std::string_view kKSKeyHolidays = "holidays";
inline constexpr std::string_view kKSKeyPublicEvents = "publicEvents";
inline constexpr std::string_view kKSKeyPersons = "persons";
/// How many photos the occasion holds (an integer); ours, for what a client is shown.
inline constexpr std::string_view kKSKeyPhotoCount = "photoCount";

/// Keys of a person and of a public event.
inline constexpr std::string_view kKSKeyName = "name";
inline constexpr std::string_view kKSKeyPersonName = "name";
inline constexpr std::string_view kKSKeyPersonLocalIdentifier = "localIdentifier";
inline constexpr std::string_view kKSKeyContactIdentifier = "contactIdentifier";
inline constexpr std::string_view kKSKeyFamily = "family";
inline constexpr std::string_view kKSKeyPerformers = "performers";
inline constexpr std::string_view kKSKeyVenue = "venue";

/// The photo analysis service: groups of photos recognised as one occasion. Any thread may call it;
/// both questions block the caller and change nothing.
class PhotoAnalysis {
  public:
    using Summary = std::expected<KSDictionary, KSError>;

    static constexpr std::size_t kMostIdentifiers = 50;

    virtual ~PhotoAnalysis() = default;

    /// The keepsakes whose interval overlaps `interval`, oldest start first.
    virtual Summary summary(KSDateInterval interval) = 0;

    /// Those with the given identifiers (at most `kMostIdentifiers`) that still exist.
    virtual Summary summary(std::span<const std::string> identifiers) = 0;
};

}  // namespace keepsakes
