// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "indexer/FileReader.h"

namespace keepsakes {

/// The reader of everything that folders are searched for, by the files' content.
class ContentReader final : public FileReader {
  public:
    std::expected<std::optional<FileRecords>, std::string> read(int fd, int wanted,
                                                                const ReaderContext& context,
                                                                LocationSink& places,
                                                                PeopleSink& people) override;
};

}  // namespace keepsakes
