// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "readers/FileReaders.h"
#include "readers/XmlStream.h"

namespace keepsakes {

/// `readMessageBackupFile`, from any source of bytes.
std::expected<void, std::string> readMessageBackup(const ReadBlock& read,
                                                   const ReaderContext& context, PeopleSink& sink);

}  // namespace keepsakes
