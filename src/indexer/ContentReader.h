// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "indexer/FileReader.h"

namespace keepsakes {

/// The reader of tracks and photos, by their content.
class ContentReader final : public FileReader {
  public:
    std::expected<std::optional<FileRecords>, std::string> read(int fd, int wanted,
                                                                KSDate now) override;
};

}  // namespace keepsakes
