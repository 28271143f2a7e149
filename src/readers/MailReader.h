// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "readers/FileReaders.h"
#include "readers/XmlStream.h"

namespace keepsakes {

/// `readMailFile` and `readMailboxFile`, from any source of bytes. Of a mail that stands alone
/// no more than `limits::kLongestMail` behind the header is read.
std::expected<void, std::string> readMail(const ReadBlock& read, const ReaderContext& context,
                                          PeopleSink& sink);
std::expected<void, std::string> readMailbox(const ReadBlock& read, const ReaderContext& context,
                                             PeopleSink& sink);

}  // namespace keepsakes
