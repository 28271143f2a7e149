// SPDX-License-Identifier: Apache-2.0
#include "readers/MailReader.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "PeopleText.h"
#include "SampleFiles.h"
#include "readers/Handles.h"
#include "readers/MailHeaders.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;

const std::string kHead = "From: Anna <anna@x.org>\nDate: Fri, 14 Jun 2024 08:00:00 +0200\n";

std::string mail(const std::string& bytes) {
    PeopleText told;
    const auto done = readMail(inPieces(bytes, 7), kReadOn, told);
    return done ? told.text : "error: " + done.error();
}

std::string mailbox(const std::string& bytes) {
    PeopleText told;
    const auto done = readMailbox(inPieces(bytes, 7), kReadOn, told);
    return done ? told.text : told.text + "error: " + done.error();
}

struct MailCase {
    std::string what;
    std::string fields;
    std::string told;
};

TEST(MailReader, TellsWhoWroteToWhom) {
    const std::string at = " -- 2024-06-14T06:00:00Z mailto:anna@x.org: ";
    const std::vector<MailCase> cases{
        {"names, comments, quotes, groups and routes",
         "To: \"Doe, \\\"B.\\\" <a@b>\" <Bo@X.org>, c@x.org (C, or so),\n\t<@one,@two:d@x.org>\n"
         "cc: friends: e@x.org, c@x.org;, not an address, <>\n",
         "0" + at + "mailto:bo@x.org mailto:c@x.org mailto:d@x.org mailto:e@x.org"},
        {"to nobody", "To: undisclosed-recipients:;\n", "0" + at},
        {"to oneself", "To: anna@X.ORG\n", "0" + at},
        {"a list", "List-Id: <l.x.org>\nTo: l@x.org\n", "1" + at + "mailto:l@x.org"},
        {"a newsletter", "Precedence: Bulk\n", "1" + at},
        {"an answer of a machine", "Auto-Submitted: auto-replied\n", "15" + at},
        {"no machine", "Auto-Submitted: no\n", "0" + at},
        {"a bounce", "Return-Path: <>\n", "15" + at},
        {"a draft", "X-Mozilla-Draft-Info: internal/draft\n", "6" + at},
    };
    for (const auto& [what, fields, told] : cases) {
        EXPECT_EQ(mail(kHead + fields + "\nFrom: body\n"), told + "\n") << what;
    }
    std::string crowd = "To: ";
    for (int i = 0; i < 51; ++i) crowd += fmt::format("p{}@x.org, ", i);
    EXPECT_EQ(mail(kHead + crowd + "\n\n"), "1" + at + "\n") << "to a crowd";
    EXPECT_EQ(mail(kHead + "X-Mozilla-Status: 0009\n\n"), "") << "deleted";
}

TEST(MailReader, RefusesAMailThatCannotBePlaced) {
    const std::vector<std::pair<std::string, std::string>> cases{
        {"Date: Fri, 14 Jun 2024 08:00:00 +0200\n\n", "the mail has no sender"},
        {"From: a@x.org\n\n", "the mail has no date"},
        {"From: a@x.org\nDate: soon\n\n", "the mail's date cannot be read"},
        {"From: a@x.org\nDate: 1 Jan 1980 00:00:00 +0000\n\n",
         "1980-01-01T00:00:00Z as the mail's date is not believed"},
        {kHead + "To: b@x.o", "the mail's header is cut"},
        {"", "the mail's header is cut"},
    };
    for (const auto& [bytes, reason] : cases) EXPECT_EQ(mail(bytes), "error: " + reason);
}

TEST(MailReader, FindsTheMailsOfAMailbox) {
    const std::string separator = "From anna Fri Jun 14 08:00:00 2024\n";
    const auto numbered = [&](int hour, const std::string& fields = "") {
        return separator +
               fmt::format("From: a@x.org\nDate: Fri, 14 Jun 2024 {:02}:00:00 +0000\n{}", hour,
                           fields) +
               "\nText\n>From the start\nFrom here on 2024\n\n";
    };
    const auto told = [](int hour) {
        return fmt::format("0 -- 2024-06-14T{:02}:00:00Z mailto:a@x.org: \n", hour);
    };
    EXPECT_EQ(mailbox(numbered(8) + numbered(9)), told(8) + told(9));
    EXPECT_EQ(mailbox(numbered(8) + "From Bob 10:30, 2024\nno header\n\n" + numbered(9)),
              told(8) + told(9))
        << "a separator in a text";
    EXPECT_EQ(mailbox(numbered(8) + numbered(9, "X-Status: D\n") + separator + "Date: x\n\n" +
                      numbered(10)),
              told(8) + told(10))
        << "a deleted one and a broken one";
    EXPECT_EQ(mailbox(separator + "From: a@x.org\nDate: 14 Jun 2024 08:00 Z\n" + numbered(9)),
              told(9))
        << "a header that the next mail cuts has said nothing whole";
    EXPECT_EQ(mailbox(separator + "From: a@x.org\n\n"),
              "error: no mail of it can be read: the mail has no date");
    EXPECT_EQ(mailbox(separator), "");
    const auto bytes = numbered(8) + numbered(9) + numbered(10);
    const auto whole = mailbox(bytes);
    for (std::size_t length = 0; length < bytes.size(); ++length) {
        const auto cut = mailbox(bytes.substr(0, length));
        EXPECT_TRUE(cut.starts_with("error: ") || whole.starts_with(cut)) << length << ": " << cut;
    }
    const std::string endless(300000, 'x');
    EXPECT_EQ(mailbox(separator + "X-Long: " + endless +
                      "\nFrom: a@x.org\nDate: 14 Jun 2024 "
                      "08:00:00 Z\n\n" +
                      endless + "\n\n" + numbered(9)),
              told(8) + told(9));
}

TEST(MailReader, KnowsACopyByItsMessageId) {
    PeopleText told;
    const auto read = [&told](const std::string& fields) {
        ASSERT_TRUE(readMail(inPieces(kHead + fields + "\n", 99), kReadOn, told));
    };
    read("Message-ID: <1@x>\nReceived: here\n");
    read("message-id: <1@x>\nReceived: there\n");
    read("Message-ID: <2@x>\n");
    read("Subject: a\n");
    read("Subject: b\n");
    const auto& ids = told.identities;
    EXPECT_EQ(ids[0], ids[1]);
    EXPECT_EQ((std::set<MessageIdentity>{ids.begin(), ids.end()}.size()), 4u);
}

TEST(MailDate, ReadsOldAndOddForms) {
    const std::vector<std::pair<std::string, std::string>> dates{
        {"Fri, 14 Jun 2024 08:00:00 +0200 (CEST)", "2024-06-14T06:00:00Z"},
        {"14 June 2024 08:00 EST", "2024-06-14T13:00:00Z"},
        {"Fri, 14 Jun 24 08:00:00 PDT", "2024-06-14T15:00:00Z"},
        {"14 Jun 99 08:00:00 Z", "1999-06-14T08:00:00Z"},
        {"Fri (a (nested) day), 14 Jun 2024 08:00:00 -0330", "2024-06-14T11:30:00Z"},
        {"Fri, 14 Jun 2024 08:00:60 XYZ", "2024-06-14T08:01:00Z"},
    };
    for (const auto& [text, date] : dates) {
        const auto read = parseMailDate(text);
        ASSERT_TRUE(read) << text;
        EXPECT_EQ(formatISO8601(*read), date) << text;
    }
    for (const auto* text : {"", "Fri", "31 Feb 2024 08:00", "14 Jun 2024", "14 Jun 2024 24:00",
                             "14 Jun 2024 8", "-1 Jun 2024 08:00", "14 Jun 20240 08:00"}) {
        EXPECT_FALSE(parseMailDate(text)) << text;
    }
}

TEST(Handles, AreEqualForOnePersonsSpellings) {
    const std::vector<std::pair<std::string, std::string>> handles{
        {"+43 (0)660 555-12-34", "tel:605551234"},
        {"0043.660.5551234", "tel:605551234"},
        {"tel:+43-660-555-12-34;ext=5", "tel:605551234"},
        {"0316/55512", "tel:031655512"},
        {"110 112\u00a03", "tel:1101123"},
        {"12345", "code:12345"},
        {"12", ""},
        {"Vodafone", ""},
        {" Anna@Example.ORG ", "mailto:anna@example.org"},
        {"mailto:a@b", "mailto:a@b"},
        {"a b@c", ""},
        {"@b", ""},
        {"@Anna:Example.org", "im:@anna:example.org"},
        {"matrix:u/anna:example.org", "im:@anna:example.org"},
        {"xmpp:anna@example.org/phone", "im:anna@example.org"},
        {std::string(300, 'a') + "@b", ""},
    };
    for (const auto& [text, handle] : handles) EXPECT_EQ(handleOf(text), handle) << text;
    for (const auto* machine : {"noreply@x", "no-reply+1@x", "shop-noreply@x", "mailer-daemon@x"}) {
        EXPECT_TRUE(isMachineAddress(mailHandle(machine))) << machine;
    }
    for (const auto* person : {"nora@x", "noreplyless@x", "bounceanna@x"}) {
        EXPECT_FALSE(isMachineAddress(mailHandle(person))) << person;
    }
}

TEST(FileKind, TellsMailsFromOtherText) {
    const std::vector<std::pair<std::string, FileKind>> heads{
        {kHead, FileKind::mail},
        {"Received: by x;\r\n\tnow\r\nDKIM-Signature: v=1;\r\n a=b", FileKind::mail},
        {"From a Fri Jun 14 08:00:00 2024\n" + kHead, FileKind::mailbox},
        {"From a Fri Jun 14 08:00:00 2024\nDear all\n", FileKind::unknown},
        {"Title: x\nAuthor: y\n", FileKind::unknown},
        {"Subject: a letter\nDear Anna,\n", FileKind::unknown},
        {"\xEF\xBB\xBF"
         "begin:vcard\r\nX-A:1\r\nX-B:2\r\n",
         FileKind::contacts},
        {"<?xml version='1.0'?><smses count='1'>", FileKind::messageBackup},
        {"<calls>", FileKind::messageBackup},
        {std::string("SQLite format 3\0", 16), FileKind::chatHistory},
    };
    for (const auto& [head, kind] : heads) {
        EXPECT_EQ(kindOf(std::as_bytes(std::span(head))), kind) << head;
    }
}

}  // namespace
}  // namespace keepsakes
