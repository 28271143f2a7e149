// SPDX-License-Identifier: Apache-2.0
#include "indexer/IndexWriter.h"

#include <fmt/ranges.h>
#include <sqlite3.h>

#include <cmath>

#include "core/Json.h"
#include "core/Log.h"
#include "indexer/FolderListing.h"
#include "indexer/PhotoText.h"

namespace keepsakes {

namespace {

constexpr int kOpenFlags = SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE;

/// The file's version; nothing when it is no database.
std::optional<int> versionOf(const std::filesystem::path& path) {
    try {
        SQLite::Database database(path.string(), kOpenFlags, kIndexBusyMilliseconds);
        return database.execAndGet("PRAGMA user_version").getInt();
    } catch (const SQLite::Exception& error) {
        if (error.getErrorCode() != SQLITE_NOTADB && error.getErrorCode() != SQLITE_CORRUPT) throw;
        return std::nullopt;
    }
}

SQLite::Database open(const std::filesystem::path& path) {
    const auto version = versionOf(path);
    if (version != 0 && version != kIndexVersion) {
        logWarning("the index is damaged or of another version: it is built anew");
        IndexWriter::remove(path);
    }
    SQLite::Database database(path.string(), kOpenFlags, kIndexBusyMilliseconds);
    // The index can always be made again: a power cut may cost its last second, not its form.
    database.exec("PRAGMA journal_mode = WAL; PRAGMA synchronous = NORMAL;");
    // What the owner deletes shall not be found in the file's unused pages.
    database.exec("PRAGMA secure_delete = ON; PRAGMA temp_store = MEMORY;");
    if (database.execAndGet("PRAGMA user_version").getInt() == 0) {
        SQLite::Transaction made(database);
        database.exec(std::string(indexSchema()));
        database.exec("PRAGMA user_version = " + std::to_string(kIndexVersion));
        made.commit();
    }
    return database;
}

void bindBytes(SQLite::Statement& statement, int position, const std::string& bytes) {
    statement.bind(position, static_cast<const void*>(bytes.data()),
                   static_cast<int>(bytes.size()));
}

bool isSane(KSDate date) { return std::isfinite(date.seconds); }

}  // namespace

IndexWriter::IndexWriter(const std::filesystem::path& path) : database_(open(path)) {
    nextFile_ = static_cast<std::int64_t>(meta(kMetaNextFile, 1));
}

void IndexWriter::remove(const std::filesystem::path& path) {
    for (const char* suffix : {"", "-wal", "-shm", "-journal"}) {
        std::error_code ignored;
        std::filesystem::remove(path.string() + suffix, ignored);
    }
}

SQLite::Statement& IndexWriter::statement(const char* text) {
    auto found = statements_.find(text);
    if (found == statements_.end()) {
        found = statements_.try_emplace(text, database_, text).first;
    }
    found->second.reset();
    return found->second;
}

std::unordered_map<std::string, std::int64_t> IndexWriter::folders() {
    std::unordered_map<std::string, std::int64_t> folders;
    auto& query = statement("SELECT path, id FROM folders");
    while (query.executeStep()) {
        folders.emplace(query.getColumn(0).getString(), query.getColumn(1).getInt64());
    }
    return folders;
}

void IndexWriter::forEachFile(std::int64_t folder,
                              const std::function<void(std::string&&, IndexedFile&&)>& visit) {
    auto& query = statement(
        "SELECT name, id, size, mtime, inode, wanted, state, hash, reason, refusedAt,"
        " mailbox FROM files"
        " WHERE folder = ? ORDER BY name");
    query.bind(1, folder);
    while (query.executeStep()) {
        IndexedFile file{.id = query.getColumn(1).getInt64(),
                         .stamp = {.size = query.getColumn(2).getInt64(),
                                   .mtime = query.getColumn(3).getInt64(),
                                   .inode = query.getColumn(4).getInt64()},
                         .wanted = query.getColumn(5).getInt(),
                         .state = static_cast<FileState>(query.getColumn(6).getInt()),
                         .mailbox = static_cast<MailboxRole>(query.getColumn(10).getInt()),
                         .hash = query.getColumn(7).getString(),
                         .reason = std::nullopt,
                         .refusedAt = {}};
        if (!query.isColumnNull(8)) {
            file.reason = query.getColumn(8).getString();
            file.refusedAt = {query.getColumn(9).getDouble()};
        }
        visit(query.getColumn(0).getString(), std::move(file));
    }
    query.reset();
}

IndexWriter::Totals IndexWriter::totals() {
    const auto count = [this](const char* query) {
        auto& counting = statement(query);
        const bool isThere = counting.executeStep();
        const auto number = isThere ? counting.getColumn(0).getInt64() : 0;
        counting.reset();
        return static_cast<std::uint64_t>(number);
    };
    return {.files = count("SELECT count(*) FROM files"),
            .refused = count("SELECT count(*) FROM files WHERE refusedAt IS NOT NULL"),
            .workouts = count("SELECT count(*) FROM (SELECT DISTINCT start, end, type"
                              " FROM workouts)"),
            .photos = count("SELECT count(*) FROM photos"),
            .occasions = count("SELECT count(*) FROM occasions"),
            .visits = count("SELECT count(*) FROM visits WHERE place IS NOT NULL"),
            .places = count("SELECT count(*) FROM places"),
            .interactions = count("SELECT count(*) FROM interactions"),
            .links = count("SELECT count(*) FROM links"),
            .people = count("SELECT count(*) FROM people"),
            .calendarEvents = count("SELECT count(*) FROM calendarEvents"),
            .suggestions = count("SELECT count(*) FROM calendarEvents"
                                 " WHERE category IS NOT NULL")};
}

std::vector<RefusedFile> IndexWriter::refusedFiles(std::size_t most) {
    std::vector<RefusedFile> refused;
    auto& query = statement(
        "SELECT path, name, reason FROM files JOIN folders ON folders.id = files.folder"
        " WHERE refusedAt IS NOT NULL ORDER BY refusedAt DESC, path, name LIMIT ?");
    query.bind(1, static_cast<std::int64_t>(most));
    while (query.executeStep()) {
        refused.push_back(
            {.path = query.getColumn(0).getString() + "/" + query.getColumn(1).getString(),
             .reason = query.getColumn(2).getString()});
    }
    query.reset();
    return refused;
}

std::int64_t IndexWriter::folderId(const std::string& path) {
    if (const auto known = newFolders_.find(path); known != newFolders_.end()) {
        return known->second;
    }
    begin();
    auto& insert = statement("INSERT OR IGNORE INTO folders(path) VALUES(?)");
    bindBytes(insert, 1, path);
    insert.exec();
    auto& query = statement("SELECT id FROM folders WHERE path = ?");
    bindBytes(query, 1, path);
    query.executeStep();
    const auto id = query.getColumn(0).getInt64();
    query.reset();
    newFolders_.emplace(path, id);
    return id;
}

std::int64_t IndexWriter::newFileId() { return nextFile_++; }

void IndexWriter::putFile(std::int64_t folder, const std::string& name, const IndexedFile& file) {
    begin();
    auto& put = statement(
        "INSERT OR REPLACE INTO files(folder, name, id, size, mtime, inode, wanted, state, hash,"
        " reason, refusedAt, mailbox) VALUES(?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)");
    put.clearBindings();
    put.bind(1, folder);
    bindBytes(put, 2, name);
    put.bind(3, file.id);
    put.bind(4, file.stamp.size);
    put.bind(5, file.stamp.mtime);
    put.bind(6, file.stamp.inode);
    put.bind(7, file.wanted);
    put.bind(8, static_cast<int>(file.state));
    bindBytes(put, 9, file.hash);
    if (file.reason) {
        put.bind(10, escaped(*file.reason));
        put.bind(11, file.refusedAt.seconds);
    }
    put.bind(12, static_cast<int>(file.mailbox));
    put.exec();
}

void IndexWriter::removeFile(std::int64_t folder, const std::string& name) {
    begin();
    auto& remove = statement("DELETE FROM files WHERE folder = ? AND name = ?");
    remove.bind(1, folder);
    bindBytes(remove, 2, name);
    remove.exec();
}

void IndexWriter::removeEmptyFolders() {
    begin();
    statement(
        "DELETE FROM folders WHERE NOT EXISTS"
        " (SELECT 1 FROM files WHERE files.folder = folders.id)")
        .exec();
    newFolders_.clear();
}

void IndexWriter::putRecords(std::int64_t file, const FileRecords& records) {
    std::unordered_map<std::int64_t, std::int64_t> occasions;
    auto& before = statement("SELECT number, occasion FROM photos WHERE file = ?");
    before.bind(1, file);
    while (before.executeStep()) {
        if (before.isColumnNull(1)) continue;
        occasions.emplace(before.getColumn(0).getInt64(), before.getColumn(1).getInt64());
    }
    before.reset();
    removeOtherRecords(file);
    for (const auto& workout : records.workouts) {
        if (!isSane(workout.start) || !isSane(workout.end)) continue;
        auto& put = statement("INSERT INTO workouts(file, start, end, type) VALUES(?, ?, ?, ?)");
        put.bind(1, file);
        put.bind(2, workout.start.seconds);
        put.bind(3, workout.end.seconds);
        put.bind(4, workout.activityType);
        put.exec();
    }
    for (const auto& zone : records.zones) {
        if (!isSane(zone.span.start) || !isSane(zone.span.end)) continue;
        auto& put = statement("INSERT INTO zones(file, start, end, offset) VALUES(?, ?, ?, ?)");
        put.bind(1, file);
        put.bind(2, zone.span.start.seconds);
        put.bind(3, zone.span.end.seconds);
        put.bind(4, zone.offsetSeconds);
        put.exec();
    }
    std::int64_t number = 0;
    for (const auto& photo : records.photos) {
        if (!isSane(photo.taken) || !isSane(photo.localTime)) continue;
        auto& put = statement(
            "INSERT INTO photos(file, number, taken, timeSource, localTime, latitude, longitude,"
            " words, occasion, keywords) VALUES(?, ?, ?, ?, ?, ?, ?, ?, ?, ?)");
        put.clearBindings();
        put.bind(1, file);
        put.bind(2, number);
        put.bind(3, photo.taken.seconds);
        put.bind(4, static_cast<int>(photo.timeSource));
        put.bind(5, photo.localTime.seconds);
        if (photo.position && std::isfinite(photo.position->latitude) &&
            std::isfinite(photo.position->longitude)) {
            put.bind(6, photo.position->latitude);
            put.bind(7, photo.position->longitude);
        }
        if (const auto words = wordsText(photo)) put.bind(8, *words);
        if (const auto former = occasions.find(number); former != occasions.end()) {
            put.bind(9, former->second);
        }
        if (!photo.keywords.empty()) {
            put.bind(10, fmt::format("{}", fmt::join(photo.keywords, "\n")));
        }
        put.exec();
        ++number;
    }
    if (number > 0 || !records.zones.empty()) setMeta(kMetaOccasionsStale, 1);
}

void IndexWriter::removeRecords(std::int64_t file) {
    removeLocations(file);
    removePeople(file);
    removeOtherRecords(file);
}

void IndexWriter::removePeople(std::int64_t file) {
    begin();
    for (const char* text :
         {"DELETE FROM links WHERE file = ?", "DELETE FROM interactions WHERE file = ?",
          "DELETE FROM cards WHERE file = ?", "DELETE FROM relations WHERE file = ?",
          "DELETE FROM ownerHandles WHERE file = ?"}) {
        auto& remove = statement(text);
        remove.bind(1, file);
        if (remove.exec() == 0) continue;
        setMeta(kMetaPeopleStale, 1);
        setMeta(kMetaHandlesLoose, 1);
    }
}

void IndexWriter::removeOtherRecords(std::int64_t file) {
    begin();
    for (const char* text :
         {"DELETE FROM workouts WHERE file = ?", "DELETE FROM zones WHERE file = ?",
          "DELETE FROM photos WHERE file = ?", "DELETE FROM calendarEvents WHERE file = ?",
          "DELETE FROM recurrenceWindows WHERE file = ?"}) {
        auto& remove = statement(text);
        remove.bind(1, file);
        const bool removed = remove.exec() > 0;
        if (removed && std::string_view(text).contains("calendarEvents")) {
            setMeta(kMetaTripsStale, 1);
        } else if (removed && (std::string_view(text).contains("zones") ||
                               std::string_view(text).contains("photos"))) {
            setMeta(kMetaOccasionsStale, 1);
        }
    }
}

void IndexWriter::removeLocations(std::int64_t file) {
    begin();
    for (const char* text :
         {"INSERT OR IGNORE INTO staleDays SELECT day FROM points WHERE file = ?",
          "DELETE FROM points WHERE file = ?",
          "INSERT OR IGNORE INTO staleDays"
          " WITH RECURSIVE days(day, lastDay) AS (SELECT firstDay, lastDay FROM statedVisits"
          " WHERE file = ? UNION SELECT day + 1, lastDay FROM days WHERE day < lastDay)"
          " SELECT day FROM days",
          "DELETE FROM statedVisits WHERE file = ?"}) {
        auto& remove = statement(text);
        remove.bind(1, file);
        remove.exec();
    }
    auto& remove = statement("DELETE FROM namedPlaces WHERE file = ?");
    remove.bind(1, file);
    if (remove.exec() > 0) setMeta(kMetaPlacesStale, 1);
}

void IndexWriter::putPoints(std::int64_t file, std::int64_t day, const std::string& bytes) {
    begin();
    auto& put = statement("INSERT INTO points(file, day, data) VALUES(?, ?, ?)");
    put.bind(1, file);
    put.bind(2, day);
    bindBytes(put, 3, bytes);
    put.exec();
    auto& mark = statement("INSERT OR IGNORE INTO staleDays VALUES(?)");
    mark.bind(1, day);
    mark.exec();
}

void IndexWriter::putStatedVisit(std::int64_t file, const StatedVisit& visit, std::int64_t firstDay,
                                 std::int64_t lastDay) {
    begin();
    auto& put = statement(
        "INSERT INTO statedVisits(file, firstDay, lastDay, start, end, latitude, longitude, name,"
        " use, confidence) VALUES(?, ?, ?, ?, ?, ?, ?, ?, ?, ?)");
    put.clearBindings();
    put.bind(1, file);
    put.bind(2, firstDay);
    put.bind(3, lastDay);
    put.bind(4, visit.stay.start.seconds);
    put.bind(5, visit.stay.end.seconds);
    put.bind(6, visit.position.latitude);
    put.bind(7, visit.position.longitude);
    if (!visit.name.empty()) put.bind(8, escaped(visit.name));
    put.bind(9, static_cast<int>(visit.use));
    put.bind(10, visit.confidence);
    put.exec();
    auto& mark = statement("INSERT OR IGNORE INTO staleDays VALUES(?)");
    for (auto day = firstDay; day <= lastDay; ++day) {
        mark.reset();
        mark.bind(1, day);
        mark.exec();
    }
}

void IndexWriter::putNamedPlace(std::int64_t file, const NamedPlace& place) {
    begin();
    auto& put = statement(
        "INSERT INTO namedPlaces(file, latitude, longitude, name, use, origin)"
        " VALUES(?, ?, ?, ?, ?, ?)");
    put.bind(1, file);
    put.bind(2, place.position.latitude);
    put.bind(3, place.position.longitude);
    put.bind(4, escaped(place.name));
    put.bind(5, static_cast<int>(place.use));
    put.bind(6, static_cast<int>(place.origin));
    put.exec();
    setMeta(kMetaPlacesStale, 1);
}

double IndexWriter::meta(std::string_view key, double otherwise) {
    auto& query = statement("SELECT value FROM meta WHERE key = ?");
    query.bind(1, std::string(key));
    const double value = query.executeStep() ? query.getColumn(0).getDouble() : otherwise;
    query.reset();
    return value;
}

void IndexWriter::setMeta(std::string_view key, double value) {
    begin();
    auto& put = statement("INSERT OR REPLACE INTO meta(key, value) VALUES(?, ?)");
    put.bind(1, std::string(key));
    put.bind(2, value);
    put.exec();
}

void IndexWriter::begin() {
    if (!transaction_) transaction_.emplace(database_, SQLite::TransactionBehavior::IMMEDIATE);
}

void IndexWriter::commit(KSDate now) {
    if (!transaction_) return;
    setMeta(kMetaLastChanged, now.seconds);
    setMeta(kMetaNextFile, static_cast<double>(nextFile_));
    for (auto& [text, prepared] : statements_) prepared.reset();
    transaction_->commit();
    transaction_.reset();
}

void IndexWriter::tidy() {
    // Without this, what was deleted would stay legible in the write-ahead log.
    database_.exec("PRAGMA wal_checkpoint(TRUNCATE)");
}

}  // namespace keepsakes
