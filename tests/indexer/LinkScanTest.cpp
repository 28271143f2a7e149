// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>
#include <fmt/ranges.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "ScanOnce.h"
#include "devicedata/IndexedSearchIndex.h"
#include "indexer/ContentReader.h"
#include "support/TemporaryFolder.h"

namespace keepsakes {
namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

const std::string kLinks = "com_brindle_parley_indexType=\"lnk\" && URL=* && ";
const std::string kDates =
    "InRange(contentCreationDate, iso(2024-06-01T00:00:00Z), iso(2024-06-15T00:00:00Z))";

std::string linkMail(int day, const std::string& from, const std::string& to,
                     const std::string& text) {
    return fmt::format(
        "From: {}\nTo: {}\nDate: {} Jun 2024 08:00:00 +0000\nMessage-ID: <{}@x>\n\n{}\n", from, to,
        day, day, text);
}

class LinkScan : public testing::Test {
  protected:
    LinkScan() {
        fs::create_directories(folder_ / "Mail");
        fs::create_directories(folder_ / "Contacts");
    }

    void scan() {
        ContentReader reader;
        const auto done = scanOnce({.index = index_,
                                    .tracks = {},
                                    .photos = {},
                                    .places = {},
                                    .gazetteer = {},
                                    .messages = {folder_ / "Mail"},
                                    .contacts = {folder_ / "Contacts"},
                                    .ownerAddresses = {"me@x.org"},
                                    .now = kNow},
                                   reader);
        EXPECT_THAT(done.problems, IsEmpty());
    }

    std::vector<SearchableItem> items(const std::string& query,
                                      std::vector<std::string> attributes) {
        std::vector<SearchableItem> found;
        IndexedSearchIndex(index_, chats_)
            .start(
                {.queryString = query,
                 .fetchAttributes = std::move(attributes),
                 .bundleIDs = {std::string(kParleyBundleIdentifier)}},
                [&found](std::span<const SearchableItem> batch) {
                    found.insert(found.end(), batch.begin(), batch.end());
                },
                [](const OptionalError& error) { EXPECT_FALSE(error) << error->description(); });
        return found;
    }

    /// "<URL> <highlight>" of each link, in the order of time.
    std::vector<std::string> links(const std::string& highlight = "") {
        std::vector<std::string> told;
        const std::string key(searchkey::kIsHighlightedContent);
        for (const auto& item : items(kLinks + highlight + kDates, {"URL", key})) {
            EXPECT_EQ(item.size(), 2u) << "only what was asked for";
            told.push_back(fmt::format("{} {}", *valueForKey(item, "URL").asString(),
                                       *valueForKey(item, key).asArray()->front().asInteger()));
        }
        return told;
    }

    TemporaryFolder folder_;
    const fs::path index_ = folder_ / "deviceData.sqlite";
    std::vector<std::string> chats_;
};

TEST_F(LinkScan, HighlightsWhatIsStarredAndWhatCameFromSomebodyClose) {
    for (int day = 1; day < 10; ++day) {
        const bool isSent = day % 2 == 0;
        folder_.write(fmt::format("Mail/{}cur/{}:2,S", isSent ? ".Sent/" : "", day),
                      isSent ? linkMail(day, "me@x.org", "anna@x.org", "text")
                             : linkMail(day, "anna@x.org", "me@x.org", "text"));
    }
    folder_.write("Contacts/a.vcf",
                  "BEGIN:VCARD\nUID:anna\nFN:Anna\nEMAIL:anna@x.org\nEND:VCARD\n");
    folder_.write("Mail/cur/10:2,S", linkMail(10, "anna@x.org", "me@x.org", "http://anna.org"));
    folder_.write("Mail/cur/11:2,FS", linkMail(11, "bo@x.org", "me@x.org", "http://starred.org"));
    folder_.write("Mail/cur/12:2,S", linkMail(12, "bo@x.org", "me@x.org", "http://bo.org"));
    folder_.write("Mail/.Sent/cur/13:2,S",
                  linkMail(13, "me@x.org", "anna@x.org", "http://mine.org"));
    folder_.write("Mail/.Trash/cur/14:2,S",
                  linkMail(14, "anna@x.org", "me@x.org", "http://gone.org"));
    folder_.write("Mail/cur/14:2,ST", linkMail(14, "anna@x.org", "me@x.org", "http://gone.org"));
    folder_.write("Mail/copies.mbox", "From a Fri Jun 14 08:00:00 2024\n" +
                                          linkMail(12, "bo@x.org", "me@x.org", "http://bo.org"));
    folder_.write("Mail/sms.xml",
                  "<smses><sms address='0660111222' date='1718323200500' type='1' locked='1'"
                  " body='http://sms.org'/></smses>");
    scan();
    EXPECT_THAT(links(), ElementsAre("http://anna.org 1", "http://starred.org 2", "http://bo.org 0",
                                     "http://mine.org 0", "http://sms.org 2"));
    EXPECT_THAT(links("com_brindle_parley_isHighlightedContent=2 && "),
                ElementsAre("http://starred.org 2", "http://sms.org 2"));
    chats_ = {"BO@x.org"};
    EXPECT_THAT(links("InRange(com_brindle_parley_isHighlightedContent, 1, 2) && "),
                ElementsAre("http://anna.org 1", "http://starred.org 2", "http://bo.org 1",
                            "http://sms.org 2"));
    // A star is a new name of the same mail.
    fs::rename(folder_ / "Mail/cur/10:2,S", folder_ / "Mail/cur/10:2,FS");
    fs::remove(folder_ / "Mail/sms.xml");
    scan();
    EXPECT_THAT(links("com_brindle_parley_isHighlightedContent=2 && "),
                ElementsAre("http://anna.org 2", "http://starred.org 2"));
}

TEST_F(LinkScan, TellsWhoSharedALinkWithWhom) {
    folder_.write("Contacts/a.vcf",
                  "BEGIN:VCARD\nUID:anna\nFN:Anna\nEMAIL:anna@x.org\nEND:VCARD\n");
    folder_.write("Mail/new/1",
                  "From: Anna@x.org\nTo: me@x.org, bo@x.org\nDate: 10 Jun 2024 08:00:00 +0000\n"
                  "Content-Type: text/html\n\n<a href='http://x.org' title='About'>Title</a>\n");
    scan();
    std::vector<std::string> all;
    for (const auto name :
         {searchkey::kUniqueIdentifier, searchkey::kAuthorAddresses, searchkey::kDisplayName,
          searchkey::kAuthorContactIdentifiers, searchkey::kAccountHandles, searchkey::kIsShared,
          searchkey::kRecipientAddresses, searchkey::kLinkTitle, searchkey::kLinkDescription,
          searchkey::kFromMe, searchkey::kContentCreationDate}) {
        all.emplace_back(name);
    }
    const auto found = items(kLinks + kDates, all);
    ASSERT_EQ(found.size(), 1u);
    auto item = found[0];
    EXPECT_EQ(valueForKey(item, "uniqueIdentifier").asString()->size(), 32u);
    EXPECT_FALSE(valueForKey(item, "authorContactIdentifiers").isNull());
    item.erase("uniqueIdentifier");
    item.erase("authorContactIdentifiers");
    EXPECT_EQ(item,
              (SearchableItem{{"authorAddresses", KSArray{"anna@x.org"}},
                              {"accountHandles", KSArray{"me@x.org"}},
                              {"recipientAddresses", KSArray{"me@x.org", "bo@x.org"}},
                              {"displayName", "Anna, bo@x.org"},
                              {"isShared", false},
                              {"contentCreationDate", parseISO8601("2024-06-10T08:00:00Z")->date},
                              {"com_brindle_parley_lpTitle", KSArray{"Title"}},
                              {"com_brindle_parley_lpDescription", KSArray{"About"}},
                              {"com_brindle_parley_fromMe", KSArray{false}}}));
}

TEST_F(LinkScan, AnswersForTheChatsOfTheConfigurationAndRefusesWhatItDoesNotKnow) {
    const std::string donating = "com_brindle_parley_isChatAutoDonating=1";
    EXPECT_THAT(items(donating, {"accountIdentifier"}), IsEmpty());
    EXPECT_THAT(items(kLinks + kDates, {}), IsEmpty()) << "there is no index yet";
    chats_ = {"+43 660 111222", "Family"};
    EXPECT_THAT(items(donating, {"accountIdentifier"}),
                ElementsAre(SearchableItem{{"accountIdentifier", "+43 660 111222"}},
                            SearchableItem{{"accountIdentifier", "Family"}}));
    for (const std::string query :
         {"like(URL, 1)", "colour=*", "URL=1", "contentCreationDate=\"today\""}) {
        std::string error;
        IndexedSearchIndex(index_, chats_)
            .start(
                {.queryString = kLinks + query, .fetchAttributes = {}, .bundleIDs = {}},
                [](std::span<const SearchableItem>) { ADD_FAILURE(); },
                [&error](const OptionalError& failed) { error = failed->description(); });
        EXPECT_THAT(error, HasSubstr("the query's clause \"" + query + "\" is not understood"));
    }
}

}  // namespace
}  // namespace keepsakes
