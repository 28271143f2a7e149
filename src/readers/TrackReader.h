// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <string>

#include "readers/FileReaders.h"
#include "readers/XmlStream.h"

namespace keepsakes {

/// `readTrackFile` for bytes from anywhere.
std::expected<FileRecords, std::string> readTrack(const ReadBlock& read,
                                                  const ReaderContext& context,
                                                  LocationSink& places);

}  // namespace keepsakes
