// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

#include "core/KSDate.h"
#include "core/KSError.h"
#include "indexer/FileReader.h"
#include "indexer/ReadMark.h"
#include "indexer/ScanReporter.h"

namespace keepsakes {

// Bounds of a scan.

/// Folders within folders; what lies deeper is passed over and reported.
inline constexpr std::size_t kDeepestFolder = 128;
/// Pending changes are committed after so many files or seconds: a crash costs no more.
inline constexpr std::size_t kFilesPerCommit = 128;
inline constexpr double kSecondsPerCommit = 1;
/// While a long scan runs, occasions and visits are formed so often that the owner sees the newest.
inline constexpr double kSecondsPerForming = 30;
/// Problem lines of one scan.
inline constexpr std::size_t kMostProblems = 50;

struct ScanOptions {
    std::filesystem::path index;
    std::vector<std::filesystem::path> tracks;       ///< Folders searched for tracks.
    std::vector<std::filesystem::path> photos;       ///< Folders searched for photos.
    std::vector<std::filesystem::path> places;       ///< Folders searched for named places.
    std::filesystem::path gazetteer;                 ///< A file of towns, or empty.
    std::vector<std::filesystem::path> messages{};   ///< Folders searched for mails and messages.
    std::vector<std::filesystem::path> calendars{};  ///< Folders searched for calendars.
    std::vector<std::filesystem::path> contacts{};   ///< Folders searched for address books.
    std::vector<std::string> ownerAddresses{};       ///< The owner's own, beside those found.
    /// Those of the folders that were not asked for by name: that one is missing is no problem.
    std::vector<std::filesystem::path> standardFolders{};
    KSDate now;
    /// What files may claim as their time, at most: for a daemon that replays older recordings, the
    /// system's time, so that its files are not taken for ones of the future.
    KSDate latest = now;
};

/// Brings the index up to date with the owner's folders: stats every file, reads those that are
/// new or changed (newest first), drops the records of those that are gone, carries the records of
/// a moved file to its new path, and forms occasions, visits and places anew where what they are
/// made of changed, and works out who is who where messages or contacts did.
///
/// A folder that is configured and cannot be listed keeps its records: a disk that is not mounted
/// is no deletion. Symbolic links inside the folders are not followed. The file on `mark` is passed
/// over until it changes. Blocks until done. An index that turns out to be damaged is built anew
/// once; any other failure of the database is the answer, and what was committed stays.
OptionalError scanFolders(const ScanOptions& options, FileReader& reader, ReadMark& mark,
                          ScanReporter& reporter);

}  // namespace keepsakes
