// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "readers/FileReaders.h"
#include "readers/XmlStream.h"

namespace keepsakes {

/// `readCalendarFile`, from any source of bytes.
std::expected<FileRecords, std::string> readCalendar(const ReadBlock& read,
                                                     const ReaderContext& context);

}  // namespace keepsakes
