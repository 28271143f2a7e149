// SPDX-License-Identifier: Apache-2.0
#include "store/ManagedObjectContext.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <fmt/format.h>
#include <sqlite3.h>
#include <sys/stat.h>

#include <chrono>
#include <utility>

#include "core/Files.h"
#include "core/Log.h"
#include "core/Problems.h"
#include "store/Schema.h"

namespace keepsakes {

namespace {

constexpr int kBusyTimeoutMilliseconds = 5000;
constexpr int kNewerVersion = -1;

bool meansDamage(int code) { return code == SQLITE_CORRUPT || code == SQLITE_NOTADB; }

std::string dateSuffix() {
    const auto now = std::chrono::system_clock::to_time_t(std::chrono::system_clock::now());
    std::tm utc{};
    gmtime_r(&now, &utc);
    char text[32];
    return {text, std::strftime(text, sizeof text, "%Y%m%dT%H%M%SZ", &utc)};
}

}  // namespace

ManagedObjectContext::ManagedObjectContext(std::filesystem::path path, Problems& problems,
                                           ChangeObserver observer)
    : path_(std::move(path)), problems_(problems), observer_(std::move(observer)) {}

ManagedObjectContext::~ManagedObjectContext() = default;

std::expected<std::unique_ptr<ManagedObjectContext>, KSError> ManagedObjectContext::open(
    const std::filesystem::path& path, Problems& problems, ChangeObserver observer) {
    if (auto error = makePrivateFolder(path.parent_path())) return std::unexpected(*error);
    std::unique_ptr<ManagedObjectContext> context(
        new ManagedObjectContext(path, problems, std::move(observer)));
    auto error = context->load();
    if (error && error->domain == kSQLiteErrorDomain && meansDamage(error->code & 0xff)) {
        if (auto kept = context->setAside(error->description())) return std::unexpected(*kept);
        error = context->load();
    }
    if (error) return std::unexpected(*error);
    return context;
}

OptionalError ManagedObjectContext::load() {
    try {
        // 0600 from the first byte on: SQLite gives its side files the mode of the main file.
        const auto before = ::umask(0077);
        database_ = std::make_unique<SQLite::Database>(
            path_.string(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE, kBusyTimeoutMilliseconds);
        const int version = schema::versionOf(*database_);
        if (version > schema::currentVersion()) {
            ::umask(before);
            database_.reset();
            return KSError::make(
                kSQLiteErrorDomain, kNewerVersion,
                fmt::format("{} was written by a newer version of this program (schema {}, this "
                            "one knows {}); it is left as it is",
                            path_.string(), version, schema::currentVersion()));
        }
        database_->exec("PRAGMA journal_mode = WAL");
        ::umask(before);
        database_->exec("PRAGMA synchronous = FULL");
        database_->exec("PRAGMA foreign_keys = ON");
        database_->exec("PRAGMA temp_store = MEMORY");
        // What was deleted is gone from the file too.
        database_->exec("PRAGMA secure_delete = ON");
        const std::string verdict = database_->execAndGet("PRAGMA quick_check(1)").getString();
        if (verdict != "ok") {
            database_.reset();
            return KSError::make(kSQLiteErrorDomain, SQLITE_CORRUPT, verdict);
        }
        schema::migrate(*database_);
        return std::nullopt;
    } catch (const SQLite::Exception& error) {
        database_.reset();
        return KSError::make(kSQLiteErrorDomain, error.getExtendedErrorCode(),
                             fmt::format("{}: {}", path_.string(), error.what()));
    }
}

OptionalError ManagedObjectContext::setAside(std::string_view reason) {
    statements_.clear();
    database_.reset();
    const auto suffix = ".damaged-" + dateSuffix();
    for (const char* side : {"", "-wal", "-shm"}) {
        std::error_code error;
        const auto from = path_.string() + side;
        std::filesystem::rename(from, path_.string() + suffix + side, error);
        if (error && error != std::errc::no_such_file_or_directory) {
            return posixError(error.value(), "set aside", from);
        }
    }
    const auto line = fmt::format(
        "the database was damaged ({}); it is kept as {}{} and a new one "
        "was begun",
        reason, path_.filename().string(), suffix);
    logError(line);
    problems_.add(line);
    return std::nullopt;
}

SQLite::Statement& ManagedObjectContext::statement(const std::string& sql) {
    if (!database_) throw SQLite::Exception("the database is closed", SQLITE_CANTOPEN);
    if (const auto known = statements_.find(sql); known != statements_.end()) {
        known->second->tryReset();
        known->second->clearBindings();
        return *known->second;
    }
    auto prepared = std::make_unique<SQLite::Statement>(*database_, sql);
    return *statements_.emplace(sql, std::move(prepared)).first->second;
}

int ManagedObjectContext::changes() const { return database_->getChanges(); }

std::int64_t ManagedObjectContext::lastInsertedRow() const {
    return database_->getLastInsertRowid();
}

OptionalError ManagedObjectContext::perform(const std::function<void()>& work) {
    try {
        work();
        for (auto& [sql, prepared] : statements_) prepared->tryReset();
        return std::nullopt;
    } catch (const SQLite::Exception& error) {
        return failed(error.getErrorCode(), error.getExtendedErrorCode(), error.what());
    }
}

OptionalError ManagedObjectContext::save(Changes touched, const std::function<void()>& work) {
    try {
        statement("BEGIN IMMEDIATE").exec();
        const auto before = database_->getTotalChanges();
        work();
        for (auto& [sql, prepared] : statements_) prepared->tryReset();
        statement("COMMIT").exec();
        if (observer_ && database_->getTotalChanges() != before) observer_(touched);
        return std::nullopt;
    } catch (const SQLite::Exception& error) {
        rollBack();
        return failed(error.getErrorCode(), error.getExtendedErrorCode(), error.what());
    }
}

void ManagedObjectContext::rollBack() {
    if (!database_) return;
    for (auto& [sql, prepared] : statements_) prepared->tryReset();
    if (sqlite3_get_autocommit(database_->getHandle()) == 0) database_->tryExec("ROLLBACK");
}

KSError ManagedObjectContext::failed(int code, int extendedCode, std::string_view text) {
    auto error = KSError::make(kSQLiteErrorDomain, extendedCode, fmt::format("database: {}", text));
    logError(error.description());
    if (meansDamage(code)) {
        auto reopened = setAside(text);
        if (!reopened) reopened = load();
        if (reopened) logError(reopened->description());
    }
    return error;
}

std::uint64_t ManagedObjectContext::countOf(std::string_view table) {
    std::uint64_t count = 0;
    perform([&] {
        auto& rows = statement(fmt::format("SELECT count(*) FROM {}", table));
        if (rows.executeStep()) count = static_cast<std::uint64_t>(rows.getColumn(0).getInt64());
    });
    return count;
}

std::int64_t rowLimit(double limit) {
    constexpr double kMost = 9e15;
    return limit < kMost ? static_cast<std::int64_t>(limit) : -1;
}

}  // namespace keepsakes
