// SPDX-License-Identifier: Apache-2.0
#include "readers/ContactReader.h"

#include <gtest/gtest.h>

#include "PeopleText.h"

namespace keepsakes {
namespace {

std::string toldCards(const std::string& bytes) {
    PeopleText told;
    const auto done = readContacts(inPieces(bytes, 5), told);
    return done ? told.text : told.text + "error: " + done.error();
}

std::string card(const std::string& lines) { return "BEGIN:VCARD\n" + lines + "END:VCARD\n"; }

TEST(ContactReader, ReadsCardsOfEveryVersion) {
    const std::vector<std::tuple<std::string, std::string, std::string>> cases{
        {"3.0, folded, with groups and escapes",
         "VERSION:3.0\r\nFN:Anna \\, the \r\n one\r\nitem1.TEL;TYPE=\"a:b,c\":+43 660\r\n"
         " 5551234\r\nitem1.X-ABLabel:x\r\nEMAIL:Anna@X.org\r\nUID:u1\r\nGEO:47.5;15.25\r\n",
         "card u1, Anna , the one: tel:605551234 mailto:anna@x.org @ 47.5 15.25\n"},
        {"4.0",
         "VERSION:4.0\nFN;ALTID=1;LANGUAGE=en:Yamada Taro\nFN;ALTID=1;LANGUAGE=ja:山田太郎\n"
         "TEL;VALUE=uri:tel:+43-660-5551234\nIMPP:matrix:u/taro:x.org\nGEO:geo:-1.5,2;u=9\n",
         "card , Yamada Taro: tel:605551234 im:@taro:x.org @ -1.5 2\n"},
        {"2.1, quoted-printable over two lines, in a charset, with a nested card",
         "VERSION:2.1\nN;CHARSET=ISO-8859-1;ENCODING=QUOTED-PRINTABLE:Gr=FCn;Gro=\n=DFmutter\n"
         "TEL;HOME;VOICE:0316/55512\nAGENT:\nBEGIN:VCARD\nFN:Agent\nTEL:110110110\nEND:VCARD\n",
         "card , Großmutter Grün: tel:031655512\n"},
        {"bytes that are no UTF-8", "N:B\xF6hm;J\xFCrg\nTEL:+43660111222\n",
         "card , Jürg Böhm: tel:660111222\n"},
        {"the nickname at last", "NICKNAME:Jo\nTEL:12345\nEMAIL:nowhere\nGEO:91;0\n",
         "card , Jo: \n"},
        {"an escape of nothing", "N:Doe;Jo\\\n", "card , Jo\\ Doe: \n"},
        {"a group is nobody", "FN:Choir\nKIND:group\nMEMBER:urn:uuid:1\n", ""},
        {"related people",
         "FN:A\nRELATED;TYPE=\"friend,colleague\";VALUE=text:Bo Muster\nCATEGORIES:Familie,Chor\n"
         "RELATED;TYPE=Spouse:urn:uuid:u-1\nRELATED;TYPE=Zorro:Bo\nX-SPOUSE:Cy\\, the one\n"
         "RELATED;TYPE=friend;VALUE=text:Bo Muster\nX-OTHER:friend\n",
         "card , A: , friend Bo Muster, colleague Bo Muster, family A, family u-1, family Cy, the "
         "one\n"},
        {"a picture", "FN:A\nPHOTO;ENCODING=b:" + std::string(200000, 'A') + "\nEMAIL:a@b\n",
         "card , A: mailto:a@b\n"},
    };
    for (const auto& [what, lines, expected] : cases)
        EXPECT_EQ(toldCards(card(lines)), expected) << what;
    EXPECT_EQ(toldCards("\xEF\xBB\xBF" + card("FN:A\n") + "\n" + card("FN:B\n")),
              "card , A: \ncard , B: \n");
}

TEST(ContactReader, RefusesAFileThatIsCut) {
    const auto bytes = card("FN:A\nEMAIL:a@b\n") + card("FN:B\n");
    EXPECT_EQ(toldCards(""), "error: it holds no card");
    for (std::size_t length = 0; length < bytes.size() - 1; ++length) {
        const auto cut = toldCards(bytes.substr(0, length));
        // Cut behind the first card, it is a file of one card.
        const bool isWhole = cut == "card , A: mailto:a@b\n";
        EXPECT_TRUE(isWhole || cut.find("error: ") != std::string::npos) << length << ": " << cut;
    }
    EXPECT_EQ(toldCards(bytes.substr(0, bytes.size() - 1)), toldCards(bytes))
        << "the last line end";
}

}  // namespace
}  // namespace keepsakes
