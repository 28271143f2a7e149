// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <optional>
#include <string>

#include "indexer/IndexWriter.h"
#include "platform/GeoPoint.h"

namespace keepsakes {

/// Takes the towns of the gazetteer into the index, inside its pending changes, when the file is
/// new or changed; without one (an empty path) there are none. The file is on `mark` while it is
/// read; one that ended the process that read it is passed over until it changes. A file that
/// cannot be listed keeps its towns. Answers what is wrong with the file, as a line.
std::optional<std::string> updateGazetteer(IndexWriter& index, const std::filesystem::path& path,
                                           ReadMark& mark);

/// Finds the towns of the index by where they are.
class TownFinder {
  public:
    explicit TownFinder(SQLite::Database& database);

    /// The name of the nearest town within so many metres, or nothing.
    std::string nearest(const GeoPoint& point, double metres);

  private:
    SQLite::Statement query_;
};

}  // namespace keepsakes
