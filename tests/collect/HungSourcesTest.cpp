// SPDX-License-Identifier: Apache-2.0
#include <gtest/gtest.h>

#include <set>
#include <string>
#include <vector>

#include "StoreFixture.h"
#include "collect/KSEventManager.h"
#include "sources/KSForesightTravelManager.h"
#include "sources/KSLinkshelfManager.h"
#include "sources/KSNowPlayingMediaManager.h"
#include "sources/KSPhotoManager.h"
#include "sources/KSRoutineServiceManager.h"
#include "sources/KSSignificantContactManager.h"
#include "sources/KSSuggestedEventManager.h"
#include "sources/KSTopicManager.h"
#include "sources/KSVitalsManager.h"
#include "store/KSDefaultsManager.h"

namespace keepsakes {
namespace {

using Category = KSEventCategory;
using Categories = std::multiset<Category>;

/// A service of the device that hangs, and the sources that it costs.
struct Adapter {
    std::string name;
    Hold& (*hold)(TestPlatform&);
    std::vector<std::string> keys;
    Categories categories;

    friend void PrintTo(const Adapter& adapter, std::ostream* out) { *out << adapter.name; }
};

/// But for the analysis of photos, which the collection waits for on its own queue.
const std::vector<Adapter> kAdapters{
    {"Health",
     [](TestPlatform& device) -> Hold& { return device.health.hold; },
     {"resultWorkoutsSuccess"},
     {Category::workout}},
    {"Routine",
     [](TestPlatform& device) -> Hold& { return device.routine.hold; },
     {"resultVisitsSuccess"},
     {Category::visit}},
    {"Topics",
     [](TestPlatform& device) -> Hold& { return device.topics.hold; },
     {"resultTopicsSuccess"},
     {Category::topic}},
    {"Search",
     [](TestPlatform& device) -> Hold& { return device.search.hold; },
     {"resultSharedSuccess"},
     {Category::linkshelf}},
    {"Profile",
     [](TestPlatform& device) -> Hold& { return device.profile.hold; },
     {"resultSuggestedSuccess", "resultTripsSuccess"},
     {Category::structuredEvent, Category::travel}},
    {"Media",
     [](TestPlatform& device) -> Hold& { return device.media.hold; },
     {"resultMusicSuccess"},
     {Category::mediaOnRepeat}},
    {"Interactions",
     [](TestPlatform& device) -> Hold& { return device.interactions.hold; },
     {"resultContactsSuccess"},
     {Category::significantContact}},
    {"Contacts",
     [](TestPlatform& device) -> Hold& { return device.contacts.hold; },
     {"resultContactsSuccess"},
     {Category::significantContact}},
};

/// All nine sources, each with one event to collect.
class EverySource : public StoreFixture {
  protected:
    EverySource() {
        fillDevice();
        universe->add("EventStore", store);
        universe->add("DefaultsManager", std::make_shared<KSDefaultsManager>(platform.defaults));
        add<KSVitalsManager>("VitalsManager");
        add<KSRoutineServiceManager>("RoutineServiceManager");
        add<KSPhotoManager>("PhotoManager");
        add<KSTopicManager>("TopicManager");
        add<KSLinkshelfManager>("LinkshelfManager");
        add<KSSuggestedEventManager>("SuggestedEventManager");
        add<KSForesightTravelManager>("ForesightTravelManager");
        add<KSNowPlayingMediaManager>("NowPlayingMediaManager");
        add<KSSignificantContactManager>("SignificantContactManager");
        events = KSEventManager::initWithUniverse(*universe);
    }
    ~EverySource() override {
        for (const auto& adapter : kAdapters) adapter.hold(platform).open();
    }

    void collect() {
        result = "(none yet)";
        events->collectEventsWithHandler(
            [this](const OptionalError& error, const KSDictionary& collected) {
                EXPECT_FALSE(error) << error->description();
                result = KSValue(collected).description();
            });
        WorkerThreads::shared().settle();
    }

    static std::string resultOf(std::size_t count, const std::vector<std::string>& failedKeys) {
        KSDictionary expected{{"resultNumberOfEvents", static_cast<std::int64_t>(count)},
                              {"stateDatabaseAvailable", true}};
        for (const auto& key : failedKeys) expected.emplace(key, false);
        return KSValue(expected).description();
    }

    Categories stored() {
        Categories categories;
        for (const auto& event : fetch({})) categories.insert(event->category());
        return categories;
    }

    static Categories allBut(const Categories& left) {
        Categories rest{Category::workout, Category::visit,         Category::photoKeepsake,
                        Category::topic,   Category::linkshelf,     Category::structuredEvent,
                        Category::travel,  Category::mediaOnRepeat, Category::significantContact};
        for (const auto category : left) rest.erase(category);
        return rest;
    }

    std::shared_ptr<KSEventManager> events;
    std::string result;

  private:
    template <class Source>
    void add(const std::string& name) {
        universe->add(name, Source::initWithUniverse(*universe));
    }

    void fillDevice() {
        const KSDate noon = platform.clock.now() - 43200;
        platform.health.samples = {{noon, noon + 600, 37}};
        platform.routine.stored = {{.entry = noon, .exit = noon + 3600, .date = noon + 3660}};
        platform.photos.keepsakes = {{"photos", {noon, noon + 60}, {}}};
        platform.topics.scores = {{"TN5KR8Z7ESDORJr1QSxzJFA", 0.75}};
        platform.defaults.values["com.brindle.Sharelane/LinkshelfEnabled"] = true;
        platform.search.items = {{{"uniqueIdentifier", "link"}, {"contentCreationDate", noon}}};
        platform.profile.suggestedEvents = {
            {.eventIdentifier = "concert", .startDate = noon, .endDate = noon + 7200}};
        platform.profile.trips = {{.startDate = noon, .endDate = noon + 7200, .tripParts = {}}};
        platform.interactions.interactions = {{.uuid = "message",
                                               .startDate = noon,
                                               .endDate = noon,
                                               .mechanism = InteractionMechanism::textMessage,
                                               .sender = {"anna", "123456789"},
                                               .recipients = {{std::nullopt, "OWNER"}}}};
        platform.contacts.contacts = {{"anna", "Anna", 0.9}};
        for (const double at : {0.0, 1000.0, 2000.0}) {
            NowPlayingRecord record{.duration = 200, .title = "Song", .bundleID = "player"};
            record.absoluteTimestamp = noon + at;
            platform.media.records.push_back(record);
            record.playbackState = PlaybackState::paused;
            record.absoluteTimestamp = noon + at + 100;
            platform.media.records.push_back(record);
        }
    }
};

class HungAdapter : public EverySource, public testing::WithParamInterface<Adapter> {};

TEST_P(HungAdapter, CostsItsSourcesTwoMinutesEachAndNobodyElse) {
    auto& hold = GetParam().hold(platform);
    auto failedKeys = GetParam().keys;
    auto missing = GetParam().categories;
    // Beside the one that hangs, another one fails.
    if (GetParam().name == "Health") {
        failedKeys.emplace_back("resultMusicSuccess");
        missing.insert(Category::mediaOnRepeat);
        platform.media.nextError = KSError::make("Media", 1, "broken");
    } else {
        failedKeys.emplace_back("resultWorkoutsSuccess");
        missing.insert(Category::workout);
        platform.health.nextError = KSError::make("Health", 1, "not authorised");
    }
    hold.close();
    collect();
    platform.clock.advance(120.0 * static_cast<double>(GetParam().keys.size()) - 0.1);
    EXPECT_EQ(result, "(none yet)");
    platform.clock.advance(0.2);
    EXPECT_EQ(result, resultOf(9 - missing.size(), failedKeys));
    EXPECT_EQ(stored(), allBut(missing));

    collect();
    platform.clock.advance(120.0 * static_cast<double>(GetParam().keys.size()) + 0.1);
    EXPECT_EQ(result, resultOf(1, GetParam().keys)) << "the other one answers again";

    hold.open();
    WorkerThreads::shared().settle();
    EXPECT_EQ(stored(), allBut({})) << "what comes late is kept, once for two that asked";
    collect();
    EXPECT_EQ(result, resultOf(0, {}));
    EXPECT_EQ(stored(), allBut({}));
}

INSTANTIATE_TEST_SUITE_P(Each, HungAdapter, testing::ValuesIn(kAdapters),
                         [](const auto& adapter) { return adapter.param.name; });

TEST_F(EverySource, StillCountsWhenItAnswersLateButBeforeTheLastOneDoes) {
    platform.health.hold.close();
    platform.interactions.hold.close();
    collect();
    platform.clock.advance(120.1);
    platform.health.hold.open();
    platform.clock.advance(119.8);
    EXPECT_EQ(result, "(none yet)");
    platform.clock.advance(0.2);
    EXPECT_EQ(result, resultOf(8, {"resultWorkoutsSuccess", "resultContactsSuccess"}));
}

}  // namespace
}  // namespace keepsakes
