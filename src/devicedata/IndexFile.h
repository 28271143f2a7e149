// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <filesystem>
#include <functional>

#include "core/KSError.h"

namespace SQLite {
class Database;
}

namespace keepsakes {

/// The daemon's view of the index: opened for one question at a time and only for reading, so that
/// a file that appears, is replaced or is deleted between two questions is simply what it is then,
/// and nothing of it stays in memory. Any thread may ask.
class IndexFile {
  public:
    explicit IndexFile(std::filesystem::path path) : path_(std::move(path)) {}

    /// Calls `question` with the open index. False, without calling it, when there is no index
    /// yet. An index that is damaged, of another version, locked for long or not readable is an
    /// error; so is an exception of the database's library that leaves `question`.
    std::expected<bool, KSError> ask(const std::function<void(SQLite::Database&)>& question) const;

  private:
    std::filesystem::path path_;
};

}  // namespace keepsakes
