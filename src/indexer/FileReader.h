// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <optional>
#include <string>

#include "readers/FileReaders.h"
#include "readers/LocationRecords.h"

namespace keepsakes {

/// What a folder is searched for; the values are bits.
enum Wanted : int {
    kWantsTracks = 1,
    kWantsPhotos = 2,
    kWantsPlaces = 4,
    kWantsMessages = 8,
    kWantsContacts = 16,
    kWantsCalendars = 32
};

/// Turns an open file into records. It may throw, crash, hang or eat memory: the scan is made for
/// that.
class FileReader {
  public:
    virtual ~FileReader() = default;

    /// The records of a file whose content is of a kind in `wanted` (bits of `Wanted`), nothing
    /// for one of another kind, or why the file cannot be read, as one line. What the file tells of
    /// places and people goes to the sinks meanwhile; of a file that cannot be read it is not to be
    /// believed.
    virtual std::expected<std::optional<FileRecords>, std::string> read(
        int fd, int wanted, const ReaderContext& context, LocationSink& places,
        PeopleSink& people) = 0;
};

}  // namespace keepsakes
