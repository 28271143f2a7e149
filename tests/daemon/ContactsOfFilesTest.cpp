// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "bundle/KSEventBundleManager.h"
#include "collect/KSEventManager.h"
#include "daemon/KSDaemonUniverse.h"
#include "devicedata/IndexedContactStore.h"
#include "devicedata/IndexedInteractionStore.h"
#include "support/ScannedFolders.h"
#include "support/TestPlatform.h"

namespace keepsakes {
namespace {

namespace fs = std::filesystem;
using testing::ElementsAre;
using testing::IsEmpty;

/// The whole daemon over mails and address books on disk.
class ContactsOfFiles : public testing::Test {
  protected:
    ContactsOfFiles() {
        platform_.services.interactionStore = &interactions_;
        platform_.services.contactStore = &contacts_;
        platform_.services.deviceData = &folders_;
        for (int hour = 1; hour <= 4; ++hour) {
            write(hour, "anna@example.org", "me@example.org");
            write(hour, "me@example.org", "Anna@Example.org");
            write(hour + 4, "bo@example.org", "me@example.org");
            write(hour + 4, "me@example.org", "bo@example.org");
        }
        root_.write("Contacts/anna.vcf",
                    "BEGIN:VCARD\nFN:Anna\nEMAIL:anna@example.org\nEND:VCARD\n");
        root_.write("Contacts/bo.vcf", "BEGIN:VCARD\nFN:Bo\nEMAIL:bo@example.org\nEND:VCARD\n");
        universe_ = std::make_unique<KSDaemonUniverse>(platform_.services);
        events_ = universe_->service<KSEventManager>("EventManager");
    }

    /// A mail that was sent so many hours ago.
    void write(int hoursAgo, const std::string& from, const std::string& to) {
        const auto date =
            formatISO8601({std::floor((platform_.clock.now() - hoursAgo * 3600.0).seconds)});
        static constexpr std::array<const char*, 12> kMonths{
            "Jan", "Feb", "Mar", "Apr", "May", "Jun", "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};
        const auto month = static_cast<std::size_t>(std::stoi(date.substr(5, 2)) - 1);
        root_.write(fmt::format("Mail/{}/cur/{}-{}", from.starts_with("bo") ? "Bo" : "Inbox", from,
                                hoursAgo),
                    fmt::format("From: {}\nTo: {}\nDate: {} {} {} {} +0000\n\n", from, to,
                                date.substr(8, 2), kMonths.at(month), date.substr(0, 4),
                                date.substr(11, 8)));
    }

    std::vector<std::string> names() {
        std::vector<std::string> names;
        events_->fetchEventsWithOptions({.ascending = true}, [&](const KSEventArray& events,
                                                                 const OptionalError&) {
            for (const auto& event : events) {
                names.push_back(*valueForKey(*event->interactionScoredContact, "name").asString());
            }
        });
        WorkerThreads::shared().settle();
        return names;
    }

    void purge() {
        events_->cleanUpEventsWithHandler(
            [](const OptionalError& error, const KSDictionary&) { EXPECT_FALSE(error); });
        WorkerThreads::shared().settle();
    }

    TemporaryFolder root_;
    TestPlatform platform_;
    IndexedInteractionStore interactions_{root_ / "index.sqlite"};
    IndexedContactStore contacts_{root_ / "index.sqlite"};
    ScannedFolders folders_{[this] {
        return ScanOptions{.index = root_ / "index.sqlite",
                           .tracks = {},
                           .photos = {},
                           .messages = {root_ / "Mail"},
                           .contacts = {root_ / "Contacts"},
                           .ownerAddresses = {"me@example.org"},
                           .now = platform_.clock.now()};
    }};
    std::unique_ptr<KSDaemonUniverse> universe_;
    std::shared_ptr<KSEventManager> events_;
};

TEST_F(ContactsOfFiles, BecomeEventsAndBundlesAndGoWithTheirSources) {
    events_->collectEventsWithHandler([](const OptionalError&, const KSDictionary& result) {
        EXPECT_EQ(valueForKey(result, "resultContactsSuccess"), KSValue());
    });
    WorkerThreads::shared().settle();
    EXPECT_THAT(names(), ElementsAre("Bo", "Anna"));

    const auto bundles = universe_->service<KSEventBundleManager>("EventBundleManager");
    bundles->bundleEventsWithHandler(
        [](const OptionalError& error, const KSDictionary&) { EXPECT_FALSE(error); });
    WorkerThreads::shared().settle();
    std::vector<std::string> prompts;
    bundles->fetchEventBundlesWithOptions(
        {.filterBundle = true},
        [&prompts](const KSEventBundleArray& found, const OptionalError&, const KSDictionary&) {
            for (const auto& bundle : found) prompts.push_back(bundle->promptLanguage.value_or(""));
        });
    WorkerThreads::shared().settle();
    EXPECT_THAT(prompts,
                testing::UnorderedElementsAre(
                    testing::MatchesRegex("In touch with somebody close: Bo, .*, 8 messages"),
                    testing::MatchesRegex("In touch with somebody close: Anna, .*, 8 messages")));

    fs::remove_all(root_ / "Mail/Bo");
    purge();
    EXPECT_THAT(names(), ElementsAre("Anna"));
    fs::remove(root_ / "Contacts/anna.vcf");
    purge();
    EXPECT_THAT(names(), IsEmpty());
}

}  // namespace
}  // namespace keepsakes
