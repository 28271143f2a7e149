// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <SQLiteCpp/SQLiteCpp.h>

#include <cstdint>
#include <filesystem>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "devicedata/IndexSchema.h"
#include "devicedata/MailboxRole.h"
#include "indexer/ReadMark.h"
#include "readers/FileRecords.h"
#include "readers/LocationRecords.h"

namespace keepsakes {

/// A file as the index knows it.
struct IndexedFile {
    std::int64_t id = 0;
    FileStamp stamp;
    int wanted = 0;  ///< What its folder was searched for.
    FileState state = FileState::read;
    MailboxRole mailbox = MailboxRole::other;
    std::string hash;                   ///< Empty when the file could not be read.
    std::optional<std::string> reason;  ///< Why it is passed over.
    KSDate refusedAt;                   ///< Since when; only beside a reason.
};

struct RefusedFile {
    std::string path;
    std::string reason;
};

/// Runs a statement that answers no rows, and makes it ready for the next time.
inline void runOnce(SQLite::Statement& statement) {
    statement.exec();
    statement.reset();
}

/// The one writer of the index. Lives on the scan's thread. Its changes are kept together and
/// become visible with `commit`. Throws `SQLite::Exception`, which the scan catches.
class IndexWriter {
  public:
    /// Opens or makes the file; one of another version, or that is no database, is deleted first.
    explicit IndexWriter(const std::filesystem::path& path);

    /// Deletes the file with what belongs to it.
    static void remove(const std::filesystem::path& path);

    // Asking.

    /// Every folder that holds files, by path.
    std::unordered_map<std::string, std::int64_t> folders();

    /// Calls `visit` with the folder's files by name.
    void forEachFile(std::int64_t folder,
                     const std::function<void(std::string&& name, IndexedFile&& file)>& visit);

    struct Totals {
        std::uint64_t files = 0;
        std::uint64_t refused = 0;
        std::uint64_t workouts = 0;
        std::uint64_t photos = 0;
        std::uint64_t occasions = 0;
        std::uint64_t visits = 0;
        std::uint64_t places = 0;  ///< Locations of interest.
        std::uint64_t interactions = 0;
        std::uint64_t links = 0;
        std::uint64_t people = 0;
        std::uint64_t calendarEvents = 0;
        std::uint64_t suggestions = 0;  ///< Of them.
    };
    Totals totals();

    /// The files passed over, newest first, at most `most`.
    std::vector<RefusedFile> refusedFiles(std::size_t most);

    // Changing.

    std::int64_t folderId(const std::string& path);
    std::int64_t newFileId();

    /// Writes the file's row, in place of one of the same name.
    void putFile(std::int64_t folder, const std::string& name, const IndexedFile& file);
    void removeFile(std::int64_t folder, const std::string& name);
    void removeEmptyFolders();

    /// Replaces the records of a file. Photos stay in their occasions by their number in the file,
    /// until occasions are formed anew. Records with numbers that are no times are left out. What
    /// the file tells of places and people stays.
    void putRecords(std::int64_t file, const FileRecords& records);
    /// All that the file told, also of places and people.
    void removeRecords(std::int64_t file);

    /// What the file told of people; `PeopleRows` writes that.
    void removePeople(std::int64_t file);

    // What a file tells of places, and the days whose visits are to be found anew.

    void removeLocations(std::int64_t file);
    /// A day's points, as `encodePoints` makes them.
    void putPoints(std::int64_t file, std::int64_t day, const std::string& bytes);
    void putStatedVisit(std::int64_t file, const StatedVisit& visit, std::int64_t firstDay,
                        std::int64_t lastDay);
    void putNamedPlace(std::int64_t file, const NamedPlace& place);

    double meta(std::string_view key, double otherwise);
    void setMeta(std::string_view key, double value);

    /// Makes what was changed last, as of a scan at `now`.
    void commit(KSDate now);

    /// Gives what was deleted back to the file system.
    void tidy();

    SQLite::Database& database() { return database_; }

    /// Begins what `commit` makes last; for changes made through `database`.
    void begin();

  private:
    void removeOtherRecords(std::int64_t file);

    SQLite::Database database_;
    std::unordered_map<std::string, SQLite::Statement> statements_;
    std::optional<SQLite::Transaction> transaction_;
    std::unordered_map<std::string, std::int64_t> newFolders_;
    std::int64_t nextFile_ = 1;

    SQLite::Statement& statement(const char* text);
};

}  // namespace keepsakes
