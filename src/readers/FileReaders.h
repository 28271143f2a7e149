// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>
#include <expected>
#include <functional>
#include <optional>
#include <span>
#include <string>

#include "core/KSDate.h"
#include "readers/FileRecords.h"
#include "readers/LocationRecords.h"
#include "readers/PeopleRecords.h"

namespace keepsakes {

// The readers of strangers' files: from an open file to plain records, and nothing else. They are
// pure (what they answer depends on the bytes, the context and the owner's zone alone), keep no
// state, and may be called on any thread. Files are read with pread, so that where the descriptor
// stands does not matter and does not change. What a file cannot be read for comes back as one
// line that names the reason and, for XML, the line; no bytes make a reader throw.

enum class FileKind {
    unknown,
    track,
    photo,
    fit,
    ownTracks,
    locationHistory,
    geoJson,
    mail,
    mailbox,
    messageBackup,
    contacts,
    chatHistory,
    calendar
};

/// So many bytes from the start of a file are enough for `kindOf`.
inline constexpr std::size_t kHeadSize = 4096;

/// Tells the kind by the first bytes, never by a name: GPX and TCX by their root element (in UTF-8
/// or UTF-16, after comments and the like); JPEG, PNG, HEIF and FIT by their signatures; OwnTracks
/// recordings by their first line; JSON by the names that its first elements have; a mail by the
/// header fields that it begins with, a mailbox by the "From " line before them, a backup of
/// messages or calls by its root element, contacts by "BEGIN:VCARD", a messenger's history by
/// SQLite's signature, a calendar by "BEGIN:VCALENDAR".
FileKind kindOf(std::span<const std::byte> head);

struct ReaderContext {
    KSDate now;  ///< A day after it, times are no longer believed.
    /// Where the file lies, for a reader that needs what lies beside it.
    std::string path{};
    /// Told how many bytes of a large file were read, so that it is known to go on.
    std::function<void(std::uint64_t bytes)> progress{};
    /// The day around which what recurs is followed; `now` when absent.
    std::optional<KSDate> today{};
};

/// The one photo that a JPEG, PNG or HEIF file is, by its metadata.
std::expected<FileRecords, std::string> readPhotoFile(int fd, const ReaderContext& context);

/// The occurrences of the entries of an iCalendar file, and what the rules make of them.
std::expected<FileRecords, std::string> readCalendarFile(int fd, const ReaderContext& context);

// The following hand what the file says of places to the sink while they read. When they answer an
// error, the sink has got a part of a file that is not to be believed.

/// The recorded tracks of a GPX file, or the activities of a TCX file, as workouts; and the spans
/// for which their timestamps tell the zone. A valid file without any is empty records. Points with
/// a time, and a GPX file's waypoints with a name of the owner's, go to the sink.
std::expected<FileRecords, std::string> readTrackFile(int fd, const ReaderContext& context,
                                                      LocationSink& places);

/// The points and sessions (as workouts) of a FIT recording, and the zone that it states. What
/// stands in one that ends early counts up to there.
std::expected<FileRecords, std::string> readFitFile(int fd, const ReaderContext& context,
                                                    LocationSink& places);

/// The points of a recording that an OwnTracks recorder keeps (.rec), and the owner's waypoints.
std::expected<FileRecords, std::string> readOwnTracksFile(int fd, const ReaderContext& context,
                                                          LocationSink& places);

/// The points, stays and labelled places of a Google location history: raw records, the semantic
/// form, or what a device exports itself; and the zones that it states.
std::expected<FileRecords, std::string> readLocationHistoryFile(int fd,
                                                                const ReaderContext& context,
                                                                LocationSink& places);

/// Of a GeoJSON file the points with a time, and the points without one that have a name.
std::expected<FileRecords, std::string> readGeoJsonFile(int fd, const ReaderContext& context,
                                                        LocationSink& places);

// The readers of people tell what they find while they read; of a file that is refused in the end,
// too. A valid file without any is fine.

/// The one mail of a file (a Maildir's, or an .eml file).
std::expected<void, std::string> readMailFile(int fd, const ReaderContext& context,
                                              PeopleSink& sink);
/// The mails of an mbox file.
std::expected<void, std::string> readMailboxFile(int fd, const ReaderContext& context,
                                                 PeopleSink& sink);
/// Messages or calls in the XML that Android backup programs write.
std::expected<void, std::string> readMessageBackupFile(int fd, const ReaderContext& context,
                                                       PeopleSink& sink);
/// The cards of a vCard file, version 2.1, 3.0 or 4.0.
std::expected<void, std::string> readContactFile(int fd, const ReaderContext& context,
                                                 PeopleSink& sink);
/// Messages from the history database of Chatty, which may be in use meanwhile; found by the path.
/// False for a database that is not Chatty's.
std::expected<bool, std::string> readChatHistoryFile(const ReaderContext& context,
                                                     PeopleSink& sink);

}  // namespace keepsakes
