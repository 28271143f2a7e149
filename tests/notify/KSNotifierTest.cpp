// SPDX-License-Identifier: Apache-2.0
#include "notify/KSNotifier.h"

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Listener.h"
#include "notify/KSDaemonSPINotifier.h"
#include "notify/KSExampleNotifier.h"
#include "support/VirtualClock.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;

/// Writes down its hooks.
class ObservedNotifier final : public KSNotifier {
  public:
    using KSNotifier::KSNotifier;
    std::vector<std::string> hooks;

  protected:
    void onObserverCountChange(std::size_t count) override {
        hooks.push_back(fmt::format("count {}", count));
    }
    void onEnable() override { hooks.push_back("enable"); }
    void onDisable() override { hooks.push_back("disable"); }
};

TEST(KSNotifier, DeliversToThoseWhoListenForTheIdentifier) {
    const auto notifier = std::make_shared<ObservedNotifier>("test");
    Listener a(notifier);
    Listener b(notifier);
    a.hear(1);
    a.hear(2);
    b.hear(2);
    a.hear(2, "second handler ");
    notifier->notify(1, "one");
    notifier->notify(2, "two");
    notifier->notify(3, "three");
    settle();
    EXPECT_THAT(a.heard, ElementsAre("1 \"one\"", "2 \"two\""));
    EXPECT_THAT(b.heard, ElementsAre("2 \"two\""));
    EXPECT_THAT(notifier->hooks, ElementsAre("count 1", "enable", "count 2"));
}

TEST(KSNotifier, HandsRememberedPayloadsToLateListenersWhileTheyRegister) {
    const auto notifier = std::make_shared<KSNotifier>("test");
    notifier->notifyAndPersist(4, "old");
    notifier->notifyAndPersist(4, "new");
    notifier->notify(5, "gone");
    settle();
    Listener late(notifier);
    late.hear(4);
    late.hear(5);
    EXPECT_THAT(late.heard, ElementsAre("4 \"new\""));
}

TEST(KSNotifier, UnregisteringOneIdentifierDetachesAsAWhole) {
    const auto notifier = std::make_shared<ObservedNotifier>("test");
    Listener listener(notifier);
    listener.hear(1);
    listener.hear(2);
    listener.dispatcher->unregisterForNotification(1);
    notifier->notify(1, {});
    notifier->notify(2, {});
    settle();
    EXPECT_THAT(listener.heard, ElementsAre());
    EXPECT_FALSE(notifier->isEnabled());
    EXPECT_THAT(notifier->hooks, ElementsAre("count 1", "enable", "count 0", "disable"));
    listener.hear(1);
    notifier->notify(2, "back");
    settle();
    EXPECT_THAT(listener.heard, ElementsAre("2 \"back\""));
    EXPECT_EQ(notifier->observerCount(), 1u);
}

TEST(KSNotifier, LabelsItsQueue) {
    EXPECT_EQ(KSNotifier("").queue().label(), "com.brindle.keepsakesd:anonymous");
    EXPECT_EQ(KSNotifier("X").queue().label(), "com.brindle.keepsakesd:X");
}

TEST(KSDaemonSPINotifier, DropsWhatNobodyHears) {
    const auto notifier = std::make_shared<KSDaemonSPINotifier>("test");
    notifier->sendNotification(1, "lost");
    Listener listener(notifier);
    listener.hear(1);
    notifier->sendNotification(1, "heard");
    settle();
    EXPECT_THAT(listener.heard, ElementsAre("1 \"heard\""));
}

TEST(KSExampleNotifier, TicksWhileSomebodyListens) {
    VirtualClock clock;
    const auto notifier = std::make_shared<KSExampleNotifier>("ticks", clock);
    {
        Listener listener(notifier);
        listener.hear(1);
        clock.advance(121);
        EXPECT_THAT(listener.heard, ElementsAre("1 0", "1 60", "1 120"));
    }
    clock.advance(5);
    EXPECT_EQ(clock.pendingCount(), 0u);
}

}  // namespace
}  // namespace keepsakes
