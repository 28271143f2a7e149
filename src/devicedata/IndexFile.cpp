// SPDX-License-Identifier: Apache-2.0
#include "devicedata/IndexFile.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <fmt/format.h>
#include <sqlite3.h>
#include <sys/stat.h>

#include <cerrno>

#include "core/Files.h"
#include "devicedata/IndexSchema.h"

namespace keepsakes {

std::expected<bool, KSError> IndexFile::ask(
    const std::function<void(SQLite::Database&)>& question) const {
    struct stat info {};
    if (::stat(path_.c_str(), &info) != 0) {
        if (errno == ENOENT || errno == ENOTDIR) return false;
        return std::unexpected(posixError(errno, "open", path_));
    }
    try {
        SQLite::Database database(path_.string(), SQLite::OPEN_READONLY, kIndexBusyMilliseconds);
        // One snapshot for the whole question, though the indexer may write meanwhile.
        SQLite::Transaction snapshot(database);
        const int version = database.execAndGet("PRAGMA user_version").getInt();
        // The indexer has made the file and not yet filled it.
        if (version == 0) return false;
        if (version != kIndexVersion) {
            return std::unexpected(KSError::make(
                kSQLiteErrorDomain, SQLITE_SCHEMA,
                fmt::format("read {}: of version {}, not {}; the next scan rebuilds it",
                            path_.string(), version, kIndexVersion)));
        }
        question(database);
        return true;
    } catch (const SQLite::Exception& error) {
        return std::unexpected(
            KSError::make(kSQLiteErrorDomain, error.getExtendedErrorCode(),
                          fmt::format("read {}: {}", path_.string(), error.what())));
    }
}

}  // namespace keepsakes
