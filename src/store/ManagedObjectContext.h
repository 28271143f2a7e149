// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <expected>
#include <filesystem>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <string_view>

#include "core/KSError.h"

namespace SQLite {
class Database;
class Statement;
}  // namespace SQLite

namespace keepsakes {

class Problems;

/// The open database: prepared statements, made once and reused, and transactions. Made and owned
/// by the persistence manager and used only on its context queue. Exceptions of the SQLite library
/// leave only `statement`; operations run inside `perform` or `save`, which turn them into errors.
class ManagedObjectContext final {
  public:
    /// What the store's changes touched, for those who announce them.
    struct Changes {
        bool events = false;
        bool bundles = false;
    };
    using ChangeObserver = std::function<void(Changes)>;

    /// Opens or creates the file and brings its schema up to date. A file that is damaged, or no
    /// database at all, is set aside under a dated name with its side files, which is logged and
    /// noted in `problems`, and a new one opened. A file of a newer version is refused untouched.
    static std::expected<std::unique_ptr<ManagedObjectContext>, KSError> open(
        const std::filesystem::path& path, Problems& problems, ChangeObserver observer);
    ~ManagedObjectContext();

    /// The prepared statement of this text, reset and without bindings. Throws SQLite::Exception.
    SQLite::Statement& statement(const std::string& sql);
    /// Rows changed by the last statement.
    int changes() const;
    std::int64_t lastInsertedRow() const;

    /// Runs reading work; the error when it fails.
    OptionalError perform(const std::function<void()>& work);

    /// Runs work in one transaction and commits it to disk; the error when it fails, after which
    /// nothing of it is stored. The observer hears of `touched` after a commit in which rows
    /// changed.
    OptionalError save(Changes touched, const std::function<void()>& work);

    /// How many rows a table of the schema holds; 0 when it cannot be read.
    std::uint64_t countOf(std::string_view table);

  private:
    ManagedObjectContext(std::filesystem::path path, Problems& problems, ChangeObserver observer);

    OptionalError load();
    KSError failed(int code, int extendedCode, std::string_view text);
    void rollBack();
    OptionalError setAside(std::string_view reason);

    const std::filesystem::path path_;
    Problems& problems_;
    const ChangeObserver observer_;
    std::unique_ptr<SQLite::Database> database_;
    std::map<std::string, std::unique_ptr<SQLite::Statement>> statements_;
};

/// A fetch limit as SQLite takes it: beyond what it counts to means no limit.
std::int64_t rowLimit(double limit);

}  // namespace keepsakes
