// SPDX-License-Identifier: Apache-2.0
#include <SQLiteCpp/Backup.h>
#include <SQLiteCpp/SQLiteCpp.h>
#include <fmt/format.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <map>
#include <optional>

#include "core/MurmurHash3.h"
#include "readers/FileReaders.h"
#include "readers/Handles.h"
#include "readers/ReaderLimits.h"
#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

using Mechanism = InteractionMechanism;

constexpr std::uint32_t kChatIdentitySeed = 0x63686174;
constexpr int kBusyMilliseconds = 2000;
/// So many pages are copied at a time; in between the messenger may write.
constexpr int kPagesPerStep = 256;
/// A copy starts anew when the messenger writes; one that does not come to an end is given up.
constexpr int kMostSteps = 10000;

// Values of the history's columns.
constexpr int kProtocolPhone = 1;
constexpr int kThreadGroup = 1;
constexpr int kDirectionOut = -1;
constexpr int kStatusDraft = 1;
constexpr std::string_view kNoAccount = "invalid-0000000000000000";

std::int64_t sizeOf(const std::string& path) {
    struct stat info {};
    return ::stat(path.c_str(), &info) == 0 ? info.st_size : 0;
}

bool exists(const std::string& path) { return ::access(path.c_str(), F_OK) == 0; }

std::string uriOf(const std::string& path, std::string_view options) {
    std::string uri = "file:";
    for (const char c : path) {
        const bool isPlain = (c >= '0' && c <= '9') || (c >= 'A' && c <= 'Z') ||
                             (c >= 'a' && c <= 'z') || c == '/' || c == '.' || c == '-';
        if (isPlain) {
            uri += c;
        } else {
            uri += fmt::format("%{:02X}", static_cast<unsigned char>(c));
        }
    }
    return fmt::format("{}?{}", uri, options);
}

/// Opens without ever writing: neither the database nor the index of its log, and without making
/// either. Where nobody has it open there is neither, and the file alone is all there is.
SQLite::Database openForeign(const std::string& path) {
    const int flags = SQLite::OPEN_READONLY | SQLite::OPEN_URI;
    const bool isLive = exists(path + "-wal") && exists(path + "-shm");
    if (!isLive && sizeOf(path + "-wal") > 0) {
        throw SQLite::Exception("nobody who could take in its log has it open", SQLITE_CANTOPEN);
    }
    const auto* options = isLive ? "mode=ro&readonly_shm=1" : "mode=ro&immutable=1";
    return {uriOf(path, options), flags, kBusyMilliseconds};
}

/// A copy in memory, made a step at a time.
void copy(SQLite::Database& from, SQLite::Database& to) {
    SQLite::Backup backup(to, from);
    for (int step = 0; step < kMostSteps; ++step) {
        const int result = backup.executeStep(kPagesPerStep);
        if (result == SQLITE_DONE) return;
        if (result == SQLITE_BUSY || result == SQLITE_LOCKED) sqlite3_sleep(1);
    }
    throw SQLite::Exception("it is written to all the time", SQLITE_BUSY);
}

std::string handleOfUser(const std::string& name, int protocol) {
    if (name == kNoAccount) return {};
    auto handle = phoneHandle(name);
    if (!handle.empty() || protocol == kProtocolPhone) return handle;
    return chatHandle(name);
}

/// The history of the copy.
class History {
  public:
    History(SQLite::Database& database, const ReaderContext& context, PeopleSink& sink)
        : database_(database), context_(context), sink_(sink) {}

    bool isChattys() {
        SQLite::Statement tables(database_,
                                 "SELECT count(*) FROM sqlite_master WHERE type = 'table' AND name"
                                 " IN ('users', 'accounts', 'threads', 'thread_members',"
                                 " 'messages')");
        return tables.executeStep() && tables.getColumn(0).getInt() == 5;
    }

    void read() {
        readOwner();
        readMembers();
        const bool isAliased =
            database_
                .execAndGet(
                    "SELECT count(*) FROM pragma_table_info('threads') WHERE name = 'alias'")
                .getInt() > 0;
        SQLite::Statement query(
            database_,
            std::string("SELECT m.uid, m.time, m.direction, coalesce(m.status, 0), t.id, t.type,"
                        " t.name, a.protocol, coalesce(u.username, ''), m.body, o.username, ") +
                (isAliased ? "t.alias" : "''") +
                " FROM messages m"
                " JOIN threads t ON t.id = m.thread_id JOIN accounts a ON a.id = t.account_id"
                " LEFT JOIN users o ON o.id = a.user_id"
                " LEFT JOIN users u ON u.id = m.sender_id WHERE m.direction IN (1, -1)");
        while (query.executeStep()) message(query);
    }

  private:
    void readOwner() {
        SQLite::Statement query(database_,
                                "SELECT DISTINCT u.username, a.protocol FROM accounts a"
                                " JOIN users u ON u.id = a.user_id");
        while (query.executeStep()) {
            const auto handle =
                handleOfUser(query.getColumn(0).getString(), query.getColumn(1).getInt());
            if (!handle.empty()) sink_.ownerHandle(handle);
        }
    }

    void readMembers() {
        SQLite::Statement query(
            database_,
            "SELECT m.thread_id, u.username, a.protocol FROM thread_members m"
            " JOIN users u ON u.id = m.user_id JOIN threads t ON t.id = m.thread_id"
            " JOIN accounts a ON a.id = t.account_id");
        while (query.executeStep()) {
            auto& members = members_[query.getColumn(0).getInt64()];
            auto handle = handleOfUser(query.getColumn(1).getString(), query.getColumn(2).getInt());
            if (handle.empty() || members.size() >= limits::kMostRecipients) continue;
            members.push_back(std::move(handle));
        }
    }

    void message(SQLite::Statement& row) {
        const auto date = KSDate::fromUnix(row.getColumn(1).getDouble());
        if (!limits::isSane(date, context_.now)) return;
        const bool isOut = row.getColumn(2).getInt() == kDirectionOut;
        const bool isGroup = row.getColumn(5).getInt() == kThreadGroup;
        const auto thread = row.getColumn(6).getString();
        const int protocol = row.getColumn(7).getInt();
        InteractionRecord record{.start = date, .end = date};
        if (row.getColumn(3).getInt() == kStatusDraft) {
            record.mechanism = Mechanism::unsentMessage;
        } else if (protocol == kProtocolPhone) {
            record.mechanism = isGroup ? Mechanism::groupTextMessage : Mechanism::textMessage;
        } else {
            record.mechanism = isGroup ? Mechanism::groupChatMessage : Mechanism::chatMessage;
        }
        if (isGroup) {
            record.recipients = members_[row.getColumn(4).getInt64()];
        } else if (auto other = handleOfUser(thread, protocol); !other.empty()) {
            if (isServiceCode(other)) record.mechanism = Mechanism::serviceMessage;
            record.recipients = {std::move(other)};
        }
        if (isOut) {
            record.direction = InteractionDirection::outgoing;
        } else {
            record.direction = InteractionDirection::incoming;
            record.sender = handleOfUser(row.getColumn(8).getString(), protocol);
            if (record.sender.empty() && !isGroup && !record.recipients.empty()) {
                record.sender = record.recipients.front();
            }
            std::erase(record.recipients, record.sender);
        }
        std::ranges::sort(record.recipients);
        const auto [first, last] = std::ranges::unique(record.recipients);
        record.recipients.erase(first, last);
        record.identity = murmurHash3(
            fmt::format("{}\n{}\n{}", row.getColumn(0).getString(), thread, date.seconds),
            kChatIdentitySeed);
        sink_.interaction(record);
        links(row, isGroup ? thread : "");
    }

    void links(SQLite::Statement& row, const std::string& room) {
        const auto body = row.getColumn(9).getString();
        LinkList found;
        findLinks(std::string_view(body).substr(0, limits::kLongestText), found);
        for (const auto& link : found.links()) {
            sink_.link({.link = link,
                        .room = shortName(room),
                        .roomName = room.empty() ? "" : shortName(row.getColumn(11).getString()),
                        .account = handleOfUser(row.getColumn(10).getString(),
                                                row.getColumn(7).getInt())});
        }
    }

    static std::string shortName(const std::string& name) {
        return name.size() > limits::kLongestName ? std::string() : cleanText(name);
    }

    SQLite::Database& database_;
    const ReaderContext& context_;
    PeopleSink& sink_;
    std::map<std::int64_t, std::vector<std::string>> members_;
};

}  // namespace

std::expected<bool, std::string> readChatHistoryFile(const ReaderContext& context,
                                                     PeopleSink& sink) {
    const auto size = sizeOf(context.path) + sizeOf(context.path + "-wal");
    if (static_cast<std::uint64_t>(size) > limits::kLargestChatHistory) {
        return std::unexpected("the database is too large");
    }
    try {
        auto foreign = openForeign(context.path);
        SQLite::Database database(":memory:", SQLite::OPEN_READWRITE);
        copy(foreign, database);
        database.exec("PRAGMA trusted_schema = OFF; PRAGMA query_only = ON");
        History history(database, context, sink);
        if (!history.isChattys()) return false;
        history.read();
        return true;
    } catch (const SQLite::Exception& error) {
        return std::unexpected(fmt::format("read the database: {}", error.what()));
    }
}

}  // namespace keepsakes
