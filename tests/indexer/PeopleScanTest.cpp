// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>
#include <fmt/ranges.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <fstream>

#include "ScanOnce.h"
#include "devicedata/IndexedContactStore.h"
#include "devicedata/IndexedInteractionStore.h"
#include "indexer/AddressBook.h"
#include "indexer/ContactRanking.h"
#include "indexer/ContentReader.h"
#include "support/TemporaryFolder.h"

namespace keepsakes {
namespace {

namespace fs = std::filesystem;
using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

/// Counts what it reads.
class CountingReader final : public FileReader {
  public:
    std::expected<std::optional<FileRecords>, std::string> read(int fd, int wanted,
                                                                const ReaderContext& context,
                                                                LocationSink& places,
                                                                PeopleSink& people) override {
        ++reads;
        return reader_.read(fd, wanted, context, places, people);
    }
    int reads = 0;

  private:
    ContentReader reader_;
};

std::string mail(int number, const std::string& from, const std::string& to,
                 const std::string& fields = "") {
    return fmt::format(
        "From: {}\nTo: {}\nDate: {} Jun 2024 08:00:00 +0000\nMessage-ID: <{}@x>\n{}"
        "\nsecret\n",
        from, to, number, number, fields);
}

std::string card(const std::string& name, const std::string& lines) {
    return "BEGIN:VCARD\nFN:" + name + "\n" + lines + "\nEND:VCARD\n";
}

class PeopleScan : public testing::Test {
  protected:
    void SetUp() override {
        for (const auto* name : {"Mail", "Contacts"}) fs::create_directories(folder_ / name);
    }

    ScanOutcome scan(std::vector<std::string> owner = {}, KSDate now = kNow) {
        reader_.reads = 0;
        return scanOnce({.index = index_,
                         .tracks = {},
                         .photos = {},
                         .messages = {folder_ / "Mail"},
                         .contacts = {folder_ / "Contacts"},
                         .ownerAddresses = std::move(owner),
                         .now = now},
                        reader_);
    }

    static std::string shown(const InteractionPerson& person) {
        return (person.personId ? "*" : "") + person.identifier.value_or("?");
    }

    /// The personal interactions as "<day> <sender>: <recipients>", the newest first; a star marks
    /// people of the address book.
    std::vector<std::string> interactions(std::size_t limit = 100) {
        const auto found =
            IndexedInteractionStore(index_).queryInteractions({.startsFrom = kNow - 30 * 86400.0,
                                                               .endsUntil = kNow,
                                                               .mechanisms = kPersonalMechanisms,
                                                               .limit = limit});
        EXPECT_TRUE(found);
        std::vector<std::string> told;
        for (const auto& one : *found) {
            std::vector<std::string> recipients;
            for (const auto& person : one.recipients) recipients.push_back(shown(person));
            told.push_back(fmt::format("{} {}: {}", formatISO8601(one.startDate).substr(8, 2),
                                       shown(one.sender), fmt::join(recipients, " ")));
        }
        return told;
    }

    /// The contacts of those who took part, by name.
    std::map<std::string, double> contacts() {
        std::vector<std::string> persons;
        const auto found =
            IndexedInteractionStore(index_).queryInteractions({.startsFrom = kNow - 400 * 86400.0,
                                                               .endsUntil = kNow,
                                                               .mechanisms = kPersonalMechanisms,
                                                               .limit = 100});
        for (const auto& one : *found) {
            if (one.sender.personId) persons.push_back(*one.sender.personId);
            for (const auto& person : one.recipients) {
                if (person.personId) persons.push_back(*person.personId);
            }
        }
        std::map<std::string, double> scores;
        const auto ranked = IndexedContactStore(index_).rankedContacts(persons);
        EXPECT_TRUE(ranked);
        for (const auto& contact : ranked.value_or(std::vector<RankedContact>())) {
            EXPECT_TRUE(contact.identifier.starts_with("CN:"));
            scores[contact.name] = contact.score;
        }
        return scores;
    }

    TemporaryFolder folder_;
    const fs::path index_ = folder_ / "deviceData.sqlite";
    CountingReader reader_;
};

TEST_F(PeopleScan, KnowsRelatedPeopleAlsoByTheirOwnCards) {
    folder_.write(
        "Contacts/a.vcf",
        card("Anna", "UID:urn:uuid:1\nRELATED;TYPE=spouse:urn:uuid:2\nCATEGORIES:Friends"));
    folder_.write("Contacts/b.vcf",
                  card("Bo", "UID:2\nRELATED;TYPE=friend:urn:uuid:1\nX-SPOUSE:Anna"));
    const auto related = [this] {
        scan();
        return IndexedContactStore(index_).relatedPeople().value();
    };
    EXPECT_THAT(related(),
                ElementsAre(RelatedPerson{"family", "Anna"}, RelatedPerson{"family", "Bo"},
                            RelatedPerson{"friend", "Anna"}));
    fs::remove(folder_ / "Contacts/b.vcf");
    EXPECT_THAT(related(),
                ElementsAre(RelatedPerson{"family", "2"}, RelatedPerson{"friend", "Anna"}));
}

TEST_F(PeopleScan, KnowsTheOwnerByWhatWasSentAndPeopleByTheirCards) {
    folder_.write("Mail/cur/1:2,S", mail(10, "Anna@x.org", "me@x.org, bo@x.org"));
    folder_.write("Mail/.Sent/cur/2:2,S", mail(11, "me@x.org", "anna@work.org"));
    folder_.write("Mail/new/3", mail(12, "anna@x.org", "undisclosed:;"));
    folder_.write("Mail/tmp/4", mail(12, "anna@x.org", "unfinished@x.org"));
    folder_.write("Contacts/a.vcf", card("Anna", "EMAIL:anna@x.org\nEMAIL:anna@work.org"));
    scan();
    EXPECT_THAT(interactions(), ElementsAre("12 *anna@x.org: OWNER", "11 OWNER: *anna@work.org",
                                            "10 *anna@x.org: OWNER bo@x.org"));
    EXPECT_THAT(interactions(1), ElementsAre("12 *anna@x.org: OWNER"));
    const auto score = contacts()["Anna"];
    EXPECT_GT(score, 0.5);
    // An address of the configuration is the owner's, too, and scores fade.
    scan({"bo@x.org"});
    EXPECT_EQ(reader_.reads, 0);
    EXPECT_THAT(interactions()[2], "10 *anna@x.org: OWNER");
    scan({"bo@x.org"}, kNow + 20 * 86400.0);
    EXPECT_LT(contacts()["Anna"], score);
}

TEST_F(PeopleScan, CountsCopiesOnceAndLeavesOutWhatNobodyWroteToSomebody) {
    for (const auto* place : {"cur/1", "Archive/cur/1", "Archive.mbox"}) {
        const std::string separator =
            std::string_view(place).ends_with("mbox") ? "From a Fri Jun 14 08:00:00 2024\n" : "";
        folder_.write(std::string("Mail/") + place, separator + mail(10, "anna@x.org", "me@x.org"));
    }
    folder_.write("Mail/Drafts/1", mail(11, "me@x.org", "anna@x.org"));
    folder_.write("Mail/cur/2:2,DS", mail(12, "me@x.org", "anna@x.org"));
    folder_.write("Mail/cur/3:2,S", mail(13, "news@x.org", "me@x.org", "List-Id: x\n"));
    folder_.write("Mail/Spam/cur/4:2,", mail(14, "evil@x.org", "me@x.org"));
    folder_.write("Mail/.Trash/cur/5:2,", mail(9, "bo@x.org", "me@x.org"));
    for (const auto* name : {"a.xml", "b.xml"}) {
        folder_.write(std::string("Mail/") + name,
                      "<smses><sms address='0660111222' date='1717833600000' type='2'"
                      " contact_name='Cy'/></smses>");
    }
    scan({"me@x.org"});
    EXPECT_THAT(interactions(), ElementsAre("10 anna@x.org: OWNER", "08 OWNER: *660111222"));
    // Taken out of the drafts, it is a mail.
    fs::rename(folder_ / "Mail/cur/2:2,DS", folder_ / "Mail/cur/2:2,S");
    scan({"me@x.org"});
    EXPECT_EQ(reader_.reads, 0);
    EXPECT_THAT(interactions()[0], "12 OWNER: anna@x.org");
}

TEST_F(PeopleScan, AMailThatMovesKeepsItsRecordsUnread) {
    folder_.write("Mail/new/1", mail(10, "anna@x.org", "me@x.org"));
    folder_.write("Mail/new/2", mail(11, "anna@x.org", "me@x.org"));
    scan();
    fs::create_directories(folder_ / "Mail/cur");
    fs::rename(folder_ / "Mail/new/1", folder_ / "Mail/cur/1:2,S");
    fs::create_directories(folder_ / "Mail/.Work/cur");
    fs::rename(folder_ / "Mail/new/2", folder_ / "Mail/.Work/cur/2:2,RS");
    const auto reporter = scan();
    EXPECT_EQ(reporter.summary.renamed, 2u);
    EXPECT_EQ(reader_.reads, 0);
    EXPECT_EQ(interactions().size(), 2u);
}

TEST_F(PeopleScan, WhatIsDeletedLeavesNothingBehind) {
    folder_.write("Mail/a/1", mail(10, "anna@unique-one.org", "me@x.org"));
    folder_.write("Mail/b/2", mail(11, "me@x.org", "anna@unique-one.org"));
    const auto book =
        folder_.write("Contacts/a.vcf", card("Ann-unique-two", "EMAIL:anna@unique-one.org"));
    scan({"me@x.org"});
    EXPECT_THAT(interactions(),
                ElementsAre("11 OWNER: *anna@unique-one.org", "10 *anna@unique-one.org: OWNER"));
    EXPECT_GT(contacts()["Ann-unique-two"], 0.5);
    fs::remove(book);
    scan({"me@x.org"});
    EXPECT_THAT(interactions(),
                ElementsAre("11 OWNER: anna@unique-one.org", "10 anna@unique-one.org: OWNER"));
    EXPECT_THAT(contacts(), IsEmpty());
    fs::remove_all(folder_ / "Mail/a");
    fs::remove_all(folder_ / "Mail/b");
    scan({"me@x.org"});
    EXPECT_THAT(interactions(), IsEmpty());
    for (const char* suffix : {"", "-wal"}) {
        std::ifstream in(index_.string() + suffix, std::ios::binary);
        const std::string bytes(std::istreambuf_iterator<char>(in), {});
        EXPECT_THAT(bytes, AllOf(Not(HasSubstr("unique-one")), Not(HasSubstr("unique-two")),
                                 Not(HasSubstr("secret"))));
    }
}

TEST_F(PeopleScan, OfARefusedFileNothingIsKept) {
    const auto backup = folder_.write(
        "Mail/a.xml", "<smses><sms address='0660111222' date='1717833600000' type='2'/></smses>");
    scan();
    EXPECT_EQ(interactions().size(), 1u);
    std::ofstream(backup, std::ios::app) << "<more";
    EXPECT_THAT(scan().problems, ElementsAre(HasSubstr("a.xml: line 1: ")));
    EXPECT_THAT(interactions(), IsEmpty());
}

TEST_F(PeopleScan, ALargeMailboxGivesSignsOfGoingOn) {
    std::string mails;
    for (int i = 0; i < 40; ++i) {
        mails += "From a Fri Jun 14 08:00:00 2024\n" + mail(1 + i % 9, "a@x.org", "b@x.org") +
                 std::string(100000, 'x') + "\n\n";
    }
    folder_.write("Mail/Inbox", mails);
    EXPECT_GE(scan().mostDone, 4u);
}

TEST_F(PeopleScan, AStandardFolderMayBeMissingUntilItWasThere) {
    const auto scanOf = [this](const fs::path& standard) {
        return scanOnce({.index = index_,
                         .tracks = {folder_ / "Tracks"},
                         .photos = {},
                         .messages = {folder_ / "Post"},
                         .standardFolders = {standard},
                         .now = kNow},
                        reader_)
            .problems;
    };
    EXPECT_THAT(scanOf(folder_ / "Post"), ElementsAre(HasSubstr("Tracks")));
    folder_.write("Post/1", mail(10, "a@x.org", "b@x.org"));
    folder_.write("Tracks/notes", "");
    EXPECT_THAT(scanOf(folder_ / "Post"), IsEmpty());
    fs::rename(folder_ / "Post", folder_ / "elsewhere");
    EXPECT_THAT(scanOf(folder_ / "Post"), ElementsAre(HasSubstr("Post")));
    EXPECT_EQ(interactions().size(), 1u);
}

TEST_F(PeopleScan, ALiveDatabaseIsReadAgainWhenItsLogChanges) {
    const auto path = (folder_ / "Mail/chatty-history.db").string();
    SQLite::Database chatty(path, SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE);
    chatty.exec(
        "PRAGMA journal_mode = WAL; CREATE TABLE users(id, username);"
        "CREATE TABLE accounts(id, user_id, protocol);"
        "CREATE TABLE threads(id, name, account_id, type);"
        "CREATE TABLE thread_members(thread_id, user_id);"
        "CREATE TABLE messages(uid, thread_id, sender_id, direction, time, status, body);"
        "INSERT INTO accounts VALUES(1, 1, 1);"
        "INSERT INTO threads VALUES(1, '0660111222', 1, 0);"
        "INSERT INTO messages VALUES('a', 1, NULL, 1, 1718013600, NULL, '')");
    EXPECT_EQ(scan().summary.totals.files, 1u);
    EXPECT_THAT(interactions(), ElementsAre("10 660111222: OWNER"));
    scan();
    EXPECT_EQ(reader_.reads, 0);
    chatty.exec("INSERT INTO messages VALUES('b', 1, NULL, -1, 1718100000, NULL, '')");
    scan();
    EXPECT_EQ(reader_.reads, 1);
    EXPECT_EQ(interactions().size(), 2u);
}

TEST(AddressBook, JoinsTheCardsOfOnePerson) {
    struct Case {
        std::string what;
        std::vector<BookCard> cards;
        std::vector<std::string> people;
    };
    const std::vector<Case> cases{
        {"a card that two files hold",
         {{"u", "Anna", {"tel:1"}}, {"u", "Anna B.", {"mailto:a"}}},
         {"Anna: mailto:a tel:1"}},
        {"a name and a handle in common",
         {{"", "Änna", {"tel:1", "tel:2"}}, {"", "anna", {"tel:2", "tel:3"}}},
         {"Änna: tel:1 tel:2 tel:3"}},
        {"namesakes",
         {{"", "Anna", {"tel:1"}}, {"", "Anna", {"tel:2"}}},
         {"Anna: tel:1", "Anna: tel:2"}},
        {"the telephone at home",
         {{"1", "Anna", {"tel:1", "tel:9"}}, {"2", "Bo", {"tel:9", "tel:2"}}},
         {"Anna: tel:1 tel:9", "Bo: tel:2"}},
        {"a phone's names",
         {{"", "Mama", {"tel:1"}, true}, {"", "Mama", {"tel:3"}, true}, {"u", "Eva", {"tel:1"}}},
         {"Eva: tel:1 tel:3"}},
        {"nobody", {{"u", "Anna", {}}, {"", "", {"mailto:x@y"}}}, {"x@y: mailto:x@y"}},
    };
    for (const auto& [what, cards, people] : cases) {
        auto reversed = cards;
        std::ranges::reverse(reversed);
        EXPECT_EQ(peopleOf(cards), peopleOf(reversed)) << what;
        std::vector<std::string> told;
        for (auto person : peopleOf(cards)) {
            std::ranges::sort(person.handles);
            told.push_back(fmt::format("{}: {}", person.name, fmt::join(person.handles, " ")));
        }
        EXPECT_THAT(told, testing::UnorderedElementsAreArray(people)) << what;
    }
}

TEST(ContactRanking, IsHighForWhoIsOftenLatelyAndMutuallyInTouch) {
    const auto score = [](int sent, int received, double days, double others = 1) {
        ContactTally tally(kNow);
        for (int i = 0; i < sent; ++i) tally.addSent(kNow - days * 86400, others);
        for (int i = 0; i < received; ++i) tally.addReceived(kNow - days * 86400, others);
        return tally.score();
    };
    EXPECT_EQ(score(0, 100, 0), 0) << "who only writes";
    EXPECT_EQ(score(100, 0, 0), 0);
    EXPECT_NEAR(score(1, 1, 0), std::cbrt(1 - std::exp2(-0.5)), 1e-12);
    EXPECT_NEAR(score(2, 2, 30), std::cbrt((1 - std::exp2(-0.5)) * 0.5), 1e-12);
    EXPECT_NEAR(score(3, 1, 0), score(2, 2, 0), 1e-12) << "a third is enough of an answer";
    EXPECT_LT(score(7, 1, 0), score(4, 4, 0));
    EXPECT_LT(score(4, 4, 0, 3), score(4, 4, 0)) << "one of several";
    EXPECT_GT(score(100, 100, 0), 0.99);
    EXPECT_LE(score(100000, 100000, -5), 1) << "a clock that goes wrong";
}

}  // namespace
}  // namespace keepsakes
