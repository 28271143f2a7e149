// SPDX-License-Identifier: Apache-2.0
#pragma once

namespace SQLite {
class Database;
}

namespace keepsakes::schema {

/// The version that this program writes, kept in the file's `user_version`.
int currentVersion();

/// The version of a file; 0 for one that was just created.
int versionOf(SQLite::Database& database);

/// Takes a file of any older version to the current one, each step in a transaction of its own.
/// Throws SQLite::Exception; what was not committed leaves the file as it was.
void migrate(SQLite::Database& database);

}  // namespace keepsakes::schema
