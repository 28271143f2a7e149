// SPDX-License-Identifier: Apache-2.0
#include "store/KSPersistenceManager.h"

#include <gmock/gmock.h>

#include "StoreFixture.h"
#include "store/KSDefaultsManager.h"
#include "store/Transformers.h"
#include "support/RecordedAssertions.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using Persistence = StoreFixture;

TEST_F(Persistence, OpensWithTheFirstUnlockOrACheckAfterIt) {
    EXPECT_TRUE(manager->isAvailable()) << "a device without content protection opens at once";

    close();
    platform.lock.protects = true;
    platform.lock.current = 1;
    open();
    const auto check = [this] {
        bool opened = false;
        manager->checkAvailabilityWithCompletionHandler(
            [&opened](bool available, const OptionalError& error) {
                EXPECT_EQ(available, !error);
                opened = available;
            });
        return opened;
    };
    EXPECT_FALSE(check()) << "protected";
    Answer answer;
    store->storeEvents({makeWorkout(1, 1, 2, "a")}, into(answer));
    EXPECT_EQ(answer.error, "database is not avaialble");
    EXPECT_THAT(platform.problems.list(), ElementsAre()) << "which is no fault";

    platform.lock.unlocked = true;
    EXPECT_TRUE(check()) << "though it is locked again";
    EXPECT_EQ(storeAll({makeWorkout(1, 1, 2, "a")}), (Answer{"", 1}));

    close();
    platform.lock.unlocked = false;
    open();
    EXPECT_FALSE(manager->isAvailable());
    platform.lock.unlocked = true;
    platform.lock.current = 0;
    platform.lock.observers.notify();
    WorkerThreads::shared().settle();
    EXPECT_TRUE(manager->isAvailable());
}

TEST_F(Persistence, AnUnlockNoticeOfEitherValueOpens) {
    platform.lock.protects = true;
    platform.lock.unlocked = true;
    platform.lock.current = 1;
    close();
    universe = std::make_unique<TestUniverse>(platform.services);
    const auto tocsin = std::make_shared<KSTocsinNotifier>("TocsinNotifier", platform.services);
    universe->add("TocsinNotifier", tocsin);
    manager = KSPersistenceManager::initWithUniverse(*universe);
    tocsin->notify(KSTocsinNotifier::kIsUnlocked, KSDictionary{{"other", true}});
    WorkerThreads::shared().settle();
    EXPECT_FALSE(manager->isAvailable());
    tocsin->notify(KSTocsinNotifier::kIsUnlocked, KSDictionary{{"isUnlocked", false}});
    WorkerThreads::shared().settle();
    EXPECT_TRUE(manager->isAvailable());
    EXPECT_EQ(tocsin->observerCount(), 0u) << "it listens no more";
}

TEST_F(Persistence, RemembersTheLastCollectionAcrossRestarts) {
    EXPECT_EQ(manager->getCollectionDate(), std::nullopt);
    manager->persistCollectionDate();
    const auto now = platform.clock.now();
    open();
    EXPECT_EQ(manager->getCollectionDate(), now);
    const auto plist = platform.services.cacheFolder / "lastCollection.plist";
    platform.folder.write("cache/lastCollection.plist", "<plist><dict><key>x</plist>");
    EXPECT_EQ(manager->getCollectionDate(), std::nullopt);
    std::filesystem::remove(plist);
    EXPECT_EQ(manager->getCollectionDate(), std::nullopt);
}

TEST_F(Persistence, FilesAreTheOwnersAlone) {
    namespace fs = std::filesystem;
    storeAll({makeWorkout(1, 1, 2, "a")});
    constexpr auto kOthers = fs::perms::group_all | fs::perms::others_all;
    for (const auto& entry : fs::directory_iterator(platform.services.cacheFolder)) {
        EXPECT_EQ(entry.status().permissions() & kOthers, fs::perms::none) << entry.path();
    }
    EXPECT_EQ(fs::status(platform.services.cacheFolder).permissions() & kOthers, fs::perms::none);
}

TEST(Services, MissingPeersFailTheAssertionThatNamesThem) {
    TestPlatform platform;
    TestUniverse universe(platform.services);
    RecordedAssertions assertions;
    EXPECT_EQ(KSPersistenceManager::initWithUniverse(universe), nullptr);
    EXPECT_EQ(KSEventStore::initWithUniverse(universe), nullptr);
    KSDefaultsManager defaults(platform.defaults);
    EXPECT_TRUE(defaults.objectForKey(std::nullopt).isNull());
    EXPECT_THAT(assertions.takeDescriptions(),
                ElementsAre("Invalid parameter not satisfying: notifier",
                            "Invalid parameter not satisfying: persistenceManager",
                            "Invalid parameter not satisfying: key (in -[KSDefaultsManager "
                            "objectForKey:]:25)"));
}

TEST(Transformers, RefuseOtherKinds) {
    RecordedAssertions assertions;
    EXPECT_EQ(KSStringArrayTransformer::transformedValue(KSValue()), std::nullopt);
    EXPECT_EQ(KSStringArrayTransformer::transformedValue("text"), std::nullopt);
    EXPECT_EQ(KSStringArrayTransformer::reverseTransformedValue("text"), std::nullopt);
    EXPECT_EQ(KSDictionaryTransformer::transformedValue(KSArray{}), std::nullopt);
    EXPECT_EQ(KSDictionaryTransformer::reverseTransformedValue(5), std::nullopt);
    EXPECT_THAT(assertions.take(),
                ElementsAre("Object is not of array type (KSStringArrayTransformer:31)",
                            "Object is not of data type (KSStringArrayTransformer:48)",
                            "Object is not of dictionary type (KSDictionaryTransformer:31)",
                            "Object is not of data type (KSDictionaryTransformer:54)"));
    EXPECT_EQ(KSDictionaryTransformer::reverseTransformedValue(KSValue::Bytes{'{'}), std::nullopt);
    EXPECT_EQ(KSDictionaryTransformer::transformedValue(
                  KSDictionary{{"x", std::numeric_limits<double>::infinity()}}),
              std::nullopt);
}

}  // namespace
}  // namespace keepsakes
