// SPDX-License-Identifier: Apache-2.0
#include "devicedata/MediaStreamFile.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <fcntl.h>
#include <fmt/chrono.h>
#include <fmt/format.h>
#include <sqlite3.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cmath>
#include <string_view>
#include <utility>

#include "core/Clock.h"
#include "core/Files.h"
#include "core/KSDate.h"
#include "core/Log.h"
#include "core/Problems.h"

namespace keepsakes {

namespace {

constexpr int kVersion = 1;
constexpr int kBusyMilliseconds = 5000;

// Instants are seconds since 2001-01-01 UTC; "duration" is the item's length in whole seconds,
// "state" as the port counts it. Records stand in the order of their arrival.
constexpr const char* kSchema = R"sql(
CREATE TABLE records(
    id INTEGER PRIMARY KEY AUTOINCREMENT,
    timestamp REAL NOT NULL,
    state INTEGER NOT NULL,
    duration INTEGER NOT NULL,
    title TEXT,
    album TEXT,
    artist TEXT,
    genre TEXT,
    mediaType TEXT,
    bundleID TEXT,
    storeProductIdentifier TEXT);
CREATE INDEX recordsByTimestamp ON records(timestamp);
)sql";

/// The texts of a record, in the order of their columns.
constexpr std::array kRecordTexts = {
    &NowPlayingRecord::title,
    &NowPlayingRecord::album,
    &NowPlayingRecord::artist,
    &NowPlayingRecord::genre,
    &NowPlayingRecord::mediaType,
    &NowPlayingRecord::bundleID,
    &NowPlayingRecord::storeProductIdentifier,
};
constexpr int kFirstText = 3;

bool meansDamage(const KSError& error) {
    const int code = error.code & 0xff;
    return error.domain == kSQLiteErrorDomain && (code == SQLITE_CORRUPT || code == SQLITE_NOTADB);
}

/// Made here so that it has mode 0600 from its first byte on; side files take its mode.
OptionalError makeFile(const std::filesystem::path& path) {
    if (auto error = makePrivateFolder(path.parent_path())) return error;
    const int made = ::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NONBLOCK, 0600);
    if (made < 0) return posixError(errno, "open", path);
    ::close(made);
    return std::nullopt;
}

void makeSchema(SQLite::Database& database) {
    database.exec("PRAGMA synchronous = FULL; PRAGMA secure_delete = ON");
    const int version = database.execAndGet("PRAGMA user_version").getInt();
    if (version > kVersion) {
        throw SQLite::Exception(
            fmt::format("written by a newer version of this program (schema {}, this one knows "
                        "{}); it is left as it is",
                        version, kVersion),
            SQLITE_SCHEMA);
    }
    if (version == kVersion) return;
    SQLite::Transaction transaction(database, SQLite::TransactionBehavior::IMMEDIATE);
    database.exec(kSchema);
    database.exec(fmt::format("PRAGMA user_version = {}", kVersion));
    transaction.commit();
}

NowPlayingRecord recordOf(SQLite::Statement& row) {
    NowPlayingRecord record;
    record.absoluteTimestamp = {row.getColumn(0).getDouble()};
    record.playbackState = static_cast<PlaybackState>(row.getColumn(1).getInt64());
    record.duration = row.getColumn(2).getInt64();
    int index = kFirstText;
    for (const auto member : kRecordTexts) {
        const auto column = row.getColumn(index++);
        if (!column.isNull()) record.*member = column.getString();
    }
    return record;
}

}  // namespace

MediaStreamFile::MediaStreamFile(std::filesystem::path path, const Clock& clock, Problems& problems)
    : path_(std::move(path)), clock_(clock), problems_(problems) {
    if (const auto error = perform([](SQLite::Database&) {})) {
        logError(error->description());
        problems_.add(error->description());
    }
}

OptionalError MediaStreamFile::append(const NowPlayingRecord& record) {
    return perform([&record](SQLite::Database& database) {
        SQLite::Transaction transaction(database, SQLite::TransactionBehavior::IMMEDIATE);
        SQLite::Statement insert(
            database,
            "INSERT INTO records(timestamp, state, duration, title, album, artist, genre,"
            " mediaType, bundleID, storeProductIdentifier) VALUES(?, ?, ?, ?, ?, ?, ?, ?, ?, ?)");
        insert.bind(1, record.absoluteTimestamp.seconds);
        insert.bind(2, static_cast<std::int64_t>(record.playbackState));
        insert.bind(3, record.duration);
        int index = kFirstText + 1;
        for (const auto member : kRecordTexts) {
            if (const auto& text = record.*member) insert.bind(index, *text);
            ++index;
        }
        insert.exec();
        SQLite::Statement drop(database,
                               "DELETE FROM records WHERE id <= (SELECT max(id) FROM records) - ?");
        drop.bind(1, kMostRecords);
        drop.exec();
        transaction.commit();
    });
}

void MediaStreamFile::read(KSDate start, const EachRecord& each,
                           const std::function<void(OptionalError)>& completion) {
    const std::lock_guard lock(mutex_);
    auto error = attempt([&](SQLite::Database& database) {
        SQLite::Statement query(
            database,
            "SELECT timestamp, state, duration, title, album, artist, genre, mediaType,"
            " bundleID, storeProductIdentifier FROM records WHERE timestamp >= ? ORDER BY id");
        query.bind(1, start.seconds);
        while (query.executeStep()) each(recordOf(query));
    });
    // Not asked again of a new file: its records would pass for all there were.
    if (error && meansDamage(*error)) {
        if (auto kept = setAside(*error)) error = std::move(kept);
    }
    completion(std::move(error));
}

OptionalError MediaStreamFile::perform(const Work& work) {
    const std::lock_guard lock(mutex_);
    auto error = attempt(work);
    if (!error || !meansDamage(*error)) return error;
    if (auto kept = setAside(*error)) return kept;
    return attempt(work);
}

OptionalError MediaStreamFile::attempt(const Work& work) {
    if (auto error = makeFile(path_)) return error;
    try {
        SQLite::Database database(path_.string(), SQLite::OPEN_READWRITE, kBusyMilliseconds);
        makeSchema(database);
        dropOldRecords(database);
        work(database);
        return std::nullopt;
    } catch (const SQLite::Exception& error) {
        return KSError::make(kSQLiteErrorDomain, error.getExtendedErrorCode(),
                             fmt::format("{}: {}", path_.string(), error.what()));
    }
}

/// Once a day, also by a clock that was set back.
void MediaStreamFile::dropOldRecords(SQLite::Database& database) {
    const KSDate now = clock_.now();
    if (lastDrop_ && std::abs(now - *lastDrop_) < kDay) return;
    SQLite::Statement drop(database, "DELETE FROM records WHERE timestamp < ?");
    drop.bind(1, (now - kKeptSeconds).seconds);
    drop.exec();
    lastDrop_ = now;
}

OptionalError MediaStreamFile::setAside(const KSError& damage) {
    const auto kept =
        fmt::format("{}.damaged-{}", path_.string(),
                    fmt::format("{:%Y%m%dT%H%M%SZ}",
                                fmt::gmtime(static_cast<std::time_t>(clock_.now().unixSeconds()))));
    for (const std::string_view side : {"", "-journal"}) {
        std::error_code error;
        std::filesystem::rename(path_.string() + std::string(side), kept + std::string(side),
                                error);
        if (error && error != std::errc::no_such_file_or_directory) {
            return posixError(error.value(), "set aside", path_);
        }
    }
    const auto line = fmt::format("what the players played was damaged ({}); it is kept as {}",
                                  damage.description(), kept);
    logError(line);
    problems_.add(line);
    return std::nullopt;
}

}  // namespace keepsakes
