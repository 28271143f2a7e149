// SPDX-License-Identifier: Apache-2.0
#include "readers/MessageBackupReader.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "PeopleText.h"
#include "SampleFiles.h"
#include "support/TemporaryFolder.h"

namespace keepsakes {
namespace {

using testing::HasSubstr;

std::string toldBackup(const std::string& bytes, std::size_t pieces = 3) {
    PeopleText told;
    const auto done = readMessageBackup(inPieces(bytes, pieces), kReadOn, told);
    return done ? told.text : "error: " + done.error();
}

// 2024-06-14T06:00:00Z
const std::string kDate = " date='1718344800000' ";
const std::string kWhen = "2024-06-14T06:00:00Z ";

TEST(MessageBackup, TellsMessagesAndCalls) {
    const std::vector<std::tuple<std::string, std::string, std::string>> cases{
        {"received", "<sms address='+43 660 555 12 34' type='1' contact_name='Anna'/>",
         "card , Anna: tel:605551234\n2 <- " + kWhen + "tel:605551234: \n"},
        {"sent, with a text that no parser takes",
         "<sms address='06605551234' type='2' body='&#55357;&#56832; &lt;\" &bad;' text='a&'"
         " contact_name='(Unknown)'/>",
         "2 -> " + kWhen + ": tel:605551234\n"},
        {"half a character in a name",
         "<sms address='06605551234' type='1' contact_name="
         "'Anna &#55357;&#x1F600;&#56832;&amp; B'/>",
         "card , Anna 😀& B: tel:605551234\n2 <- " + kWhen + "tel:605551234: \n"},
        {"a draft", "<sms address='06605551234' type='3'/>", "6 -> " + kWhen + ": tel:605551234\n"},
        {"services", "<sms address='Vodafone' type='1'/><sms address='12345' type='1'/>",
         "7 <- " + kWhen + ": \n7 <- " + kWhen + "code:12345: \n"},
        {"a group",
         "<mms msg_box='1' address='111111111~222222222' contact_name='A, B'><parts><part data='"
         "<>/' /></parts><addrs><addr address='111111111' type='137'/><addr address='333333333'"
         " type='151'/><addr address='222222222' type='151'/></addrs></mms>",
         "10 <- " + kWhen + "tel:111111111: tel:333333333 tel:222222222\n"},
        {"sent by a number that is then the owner's",
         "<mms msg_box='2' address='111111111'><addrs><addr address='333333333' type='137'/>"
         "<addr address='111111111' type='151'/></addrs></mms>",
         "owner tel:333333333\n3 -> " + kWhen + ": tel:111111111\n"},
        {"without addresses of its own",
         "<mms msg_box='1' address='111111111' tr_id='proto:x'><addrs><addr address="
         "'insert-address-token' type='151'/></addrs></mms>",
         "17 <- " + kWhen + "tel:111111111: \n"},
        {"calls: answered, not answered, missed, withheld, of no kind",
         "<call number='111111111' type='1' duration='90'/><call number='111111111' type='2'"
         " duration='0'/><call number='111111111' type='3'/><call number='' type='1'"
         " duration='1e9'/><call number='111111111' type='99'/>",
         "4 <- 2024-06-14T06:00:00Z..2024-06-14T06:01:30Z tel:111111111: \n"
         "5 -> " +
             kWhen + ": tel:111111111\n5 <- " + kWhen +
             "tel:111111111: \n"
             "4 <- 2024-06-14T06:00:00Z..2024-06-15T06:00:00Z : \n"},
    };
    for (auto [what, elements, expected] : cases) {
        for (const std::string name : {"<sms ", "<mms ", "<call "}) {
            for (auto at = elements.find(name); at != std::string::npos;
                 at = elements.find(name, at + 1)) {
                elements.insert(at + name.size(), kDate);
            }
        }
        EXPECT_EQ(
            toldBackup("<?xml version='1.0'?><!-- it's \" --><smses>" + elements + "</smses>"),
            expected)
            << what;
    }
    const auto picture = "<smses><sms address='111111111' type='1'" + kDate + "body=\"" +
                         std::string(3000000, 'A') + "\"/></smses>";
    EXPECT_EQ(toldBackup(picture, 100000), "2 <- " + kWhen + "tel:111111111: \n");
}

TEST(MessageBackup, IsRefusedWithTheReason) {
    const std::vector<std::pair<std::string, std::string>> cases{
        {"", "no element found"},
        {"<smses><sms address='1'", "unclosed token"},
        {"<gpx/>", "the root element <gpx> is neither a backup of messages nor of calls"},
        {"<smses><sms address='111111111' type='1' date='0'/></smses>",
         "no date in it is believed"},
        {"<smses><sms body='unending", "unclosed token"},
    };
    for (const auto& [bytes, reason] : cases)
        EXPECT_THAT(toldBackup(bytes), HasSubstr(reason)) << bytes;
    EXPECT_EQ(toldBackup("<smses count='0'/>"), "");
    const auto whole = "<smses><sms address='111111111' type='1'" + kDate + "/></smses>";
    for (std::size_t length = 0; length < whole.size(); ++length) {
        EXPECT_THAT(toldBackup(whole.substr(0, length)), HasSubstr("error: ")) << length;
    }
}

/// A history as Chatty keeps it, still open.
class ChatHistory : public testing::Test {
  protected:
    ChatHistory() : database_(path_, SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE) {
        database_.exec(R"(PRAGMA journal_mode = WAL;
            CREATE TABLE users(id INTEGER PRIMARY KEY, username TEXT, alias TEXT, type INTEGER);
            CREATE TABLE accounts(id INTEGER PRIMARY KEY, user_id INTEGER, protocol INTEGER);
            CREATE TABLE threads(id INTEGER PRIMARY KEY, name TEXT, account_id INTEGER,
                                 type INTEGER);
            CREATE TABLE thread_members(id INTEGER PRIMARY KEY, thread_id INTEGER,
                                        user_id INTEGER);
            CREATE TABLE messages(id INTEGER PRIMARY KEY, uid TEXT, thread_id INTEGER,
                sender_id INTEGER, body TEXT, direction INTEGER, time INTEGER, status INTEGER);
            INSERT INTO users VALUES(1, 'invalid-0000000000000000', NULL, 1),
                (2, '+436605551234', 'Anna', 1), (3, '@ich:x.org', NULL, 4),
                (4, '@bo:x.org', NULL, 4), (5, '@cy:x.org', NULL, 4);
            INSERT INTO accounts VALUES(1, 1, 1), (2, 3, 4);
            INSERT INTO threads VALUES(1, '+436605551234', 1, 0), (2, '!room:x.org', 2, 1);
            INSERT INTO thread_members VALUES(1, 1, 2), (2, 2, 4), (3, 2, 5);
            INSERT INTO messages VALUES(1, 'a', 1, 2, 'secret', 1, 1718344800, NULL),
                (2, 'b', 1, NULL, 'secret', -1, 1718344801, 1),
                (3, 'c', 2, 4, 'secret', 1, 1718344802, NULL),
                (4, 'd', 2, NULL, 'joined', 0, 1718344803, NULL),
                (5, 'e', 2, 3, 'secret', -1, 1718344804, NULL);)");
    }

    std::string read() {
        PeopleText told;
        const auto isChattys = readChatHistoryFile({.now = kReadOn.now, .path = path_}, told);
        if (!isChattys) return "error: " + isChattys.error();
        return *isChattys ? told.text : "another's";
    }

    TemporaryFolder folder_;
    const std::string path_ = (folder_ / "it's 100%.db").string();
    SQLite::Database database_;
};

TEST_F(ChatHistory, IsReadWhileItsOwnerWrites) {
    const std::string expected =
        "owner im:@ich:x.org\n2 <- 2024-06-14T06:00:00Z tel:605551234: \n"
        "6 -> 2024-06-14T06:00:01Z : tel:605551234\n"
        "9 <- 2024-06-14T06:00:02Z im:@bo:x.org: im:@cy:x.org\n"
        "9 -> 2024-06-14T06:00:04Z : im:@bo:x.org im:@cy:x.org\n";
    EXPECT_EQ(read(), expected);
    SQLite::Transaction open(database_, SQLite::TransactionBehavior::IMMEDIATE);
    database_.exec("DELETE FROM messages");
    EXPECT_EQ(read(), expected) << "what is not committed has not happened";
    open.commit();
    EXPECT_EQ(read(), "owner im:@ich:x.org\n");
}

TEST_F(ChatHistory, IsNeverWritten) {
    const auto listing = [this] {
        std::vector<std::string> files;
        for (const auto& entry : std::filesystem::directory_iterator(folder_.path())) {
            files.push_back(fmt::format("{} {} {}", entry.path().filename().string(),
                                        entry.file_size(),
                                        entry.last_write_time().time_since_epoch().count()));
        }
        std::ranges::sort(files);
        return files;
    };
    const auto live = listing();
    EXPECT_EQ(live.size(), 3u);
    EXPECT_THAT(read(), HasSubstr("tel:605551234"));
    EXPECT_EQ(listing(), live);
    database_ = SQLite::Database(":memory:");
    const auto closed = listing();
    EXPECT_EQ(closed.size(), 1u);
    EXPECT_THAT(read(), HasSubstr("tel:605551234")) << "nobody has it open";
    EXPECT_EQ(listing(), closed);
    folder_.write("it's 100%.db-wal", "what a crash left");
    EXPECT_THAT(read(), HasSubstr("error: read the database: nobody"));
}

TEST_F(ChatHistory, AnothersDatabaseIsNone) {
    database_.exec("DROP TABLE thread_members");
    EXPECT_EQ(read(), "another's");
    database_ = SQLite::Database(":memory:");
    std::filesystem::resize_file(path_, 5000);
    EXPECT_THAT(read(), HasSubstr("error: read the database"));
}

}  // namespace
}  // namespace keepsakes
