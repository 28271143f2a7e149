// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <expected>
#include <span>
#include <string>

#include "core/KSDate.h"
#include "readers/FileRecords.h"

namespace keepsakes {

// The readers of strangers' files: from an open file to plain records, and nothing else. They are
// pure (what they answer depends on the bytes, the context and the owner's zone alone), keep no
// state, and may be called on any thread. Files are read with pread, so that where the descriptor
// stands does not matter and does not change. What a file cannot be read for comes back as one
// line that names the reason and, for XML, the line; no bytes make a reader throw.

enum class FileKind { unknown, track, photo };

/// So many bytes from the start of a file are enough for `kindOf`.
inline constexpr std::size_t kHeadSize = 4096;

/// Tells the kind by the first bytes, never by a name: GPX and TCX by their root element (in UTF-8
/// or UTF-16, after comments and the like), JPEG, PNG and HEIF by their signatures.
FileKind kindOf(std::span<const std::byte> head);

struct ReaderContext {
    KSDate now;  ///< A day after it, times are no longer believed.
};

/// The recorded tracks of a GPX file, or the activities of a TCX file, as workouts; and the spans
/// for which their timestamps tell the zone. A valid file without any is empty records.
std::expected<FileRecords, std::string> readTrackFile(int fd, const ReaderContext& context);

/// The one photo that a JPEG, PNG or HEIF file is, by its metadata.
std::expected<FileRecords, std::string> readPhotoFile(int fd, const ReaderContext& context);

}  // namespace keepsakes
