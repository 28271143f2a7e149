// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "readers/FileReaders.h"
#include "readers/XmlStream.h"

namespace keepsakes {

/// `readContactFile`, from any source of bytes.
std::expected<void, std::string> readContacts(const ReadBlock& read, PeopleSink& sink);

}  // namespace keepsakes
