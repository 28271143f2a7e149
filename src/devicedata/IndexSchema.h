// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string_view>

namespace keepsakes {

/// The index's schema version (`user_version`). A file of another version is not migrated: the next
/// scan deletes it and reads the owner's files anew.
inline constexpr int kIndexVersion = 5;

/// How long either side waits for the other's lock, in milliseconds.
inline constexpr int kIndexBusyMilliseconds = 5000;

/// Rows of the table "meta".
inline constexpr std::string_view kMetaLastChanged = "lastChanged";  ///< Seconds since 2001.
inline constexpr std::string_view kMetaOccasionsStale = "occasionsStale";
inline constexpr std::string_view kMetaPlacesStale = "placesStale";
inline constexpr std::string_view kMetaPeopleStale = "peopleStale";
inline constexpr std::string_view kMetaPeopleRanked = "peopleRanked";  ///< Seconds since 2001.
inline constexpr std::string_view kMetaPeopleOwner = "peopleOwner";    ///< A hash of addresses.
inline constexpr std::string_view kMetaHandlesLoose = "handlesLoose";
inline constexpr std::string_view kMetaTripsStale = "tripsStale";
inline constexpr std::string_view kMetaNextFile = "nextFile";

/// What a file of the index is known as (column "state").
enum class FileState : int {
    read = 0,      ///< Its records are in the index.
    foreign = 1,   ///< Of no kind that its folder is searched for; it has no records.
    refused = 2,   ///< Broken or not readable.
    condemned = 3  ///< It ended the process that read it.
};

/// Every statement that makes an empty index, without its version.
std::string_view indexSchema();

}  // namespace keepsakes
