// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <string>

#include "readers/FileReaders.h"
#include "readers/XmlStream.h"

namespace keepsakes {

/// `readGeoJsonFile` for bytes from anywhere.
std::expected<FileRecords, std::string> readGeoJson(const ReadBlock& read,
                                                    const ReaderContext& context,
                                                    LocationSink& places);

}  // namespace keepsakes
