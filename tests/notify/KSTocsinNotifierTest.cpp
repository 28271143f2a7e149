// SPDX-License-Identifier: Apache-2.0
#include "notify/KSTocsinNotifier.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Listener.h"
#include "support/TestPlatform.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using Properties = PowerSourceProperties;

class Tocsin : public testing::Test {
  protected:
    /// Attaches to all identifiers; what was heard meanwhile is forgotten.
    void listen() {
        for (const auto identifier : {0, 1, 2, 3, 4}) listener.hear(identifier);
        settle();
    }
    std::vector<std::string> take() {
        settle();
        return std::exchange(listener.heard, {});
    }

    TestPlatform platform;
    std::shared_ptr<KSTocsinNotifier> notifier =
        std::make_shared<KSTocsinNotifier>("TocsinNotifier", platform.services);
    Listener listener{notifier};
    std::shared_ptr<FakePowerSource> battery = std::make_shared<FakePowerSource>();
};

TEST_F(Tocsin, TellsTheLockStateWhenItDiffersFromLocked) {
    struct Row {
        bool protects;
        bool unlocked;
        int current;
        std::vector<std::string> heard;
    };
    const std::vector<std::string> both = {"3 {\"wasUnlocked\": true}", "2 {\"isUnlocked\": true}"};
    const Row rows[] = {
        {false, false, 1, both},
        {true, true, 0, both},
        {true, true, 1, {"3 {\"wasUnlocked\": true}"}},
        {true, false, 2, {}},
        {true, false, -1, {}},
        {true, true, 7, {"3 {\"wasUnlocked\": true}"}},
    };
    for (const auto& row : rows) {
        platform.lock.protects = row.protects;
        platform.lock.unlocked = row.unlocked;
        platform.lock.current = row.current;
        const auto fresh = std::make_shared<KSTocsinNotifier>("fresh", platform.services);
        Listener listening(fresh);
        listening.hear(3);
        settle();
        listening.hear(2);
        EXPECT_EQ(listening.heard, row.heard) << row.protects << row.current;
    }
}

TEST_F(Tocsin, FollowsTheLockWhileSomebodyListens) {
    platform.lock.protects = true;
    platform.lock.current = 1;
    listen();
    take();
    platform.lock.unlocked = true;
    platform.lock.current = 0;
    platform.lock.observers.notify();
    platform.lock.observers.notify();
    EXPECT_THAT(take(), ElementsAre("3 {\"wasUnlocked\": true}", "2 {\"isUnlocked\": true}"));
    platform.lock.current = 7;
    platform.lock.observers.notify();
    EXPECT_THAT(take(), ElementsAre()) << "a state that is none changes nothing";
    platform.lock.current = 2;
    platform.lock.observers.notify();
    EXPECT_THAT(take(), ElementsAre("2 {\"isUnlocked\": false}"));

    listener.dispatcher->unregisterForNotification(0);
    platform.lock.current = 0;
    platform.lock.observers.notify();
    EXPECT_THAT(take(), ElementsAre());
    listener.hear(0);
    EXPECT_THAT(take(), testing::Contains("2 {\"isUnlocked\": true}"))
        << "looks anew when somebody listens again";
}

TEST_F(Tocsin, SendsThePolicyAtOnceAndWithEachChangeOfTheSettings) {
    listener.hear(0);
    settle();
    listener.hear(1);
    EXPECT_THAT(take(), ElementsAre("1 {\"optInDNU\": true, \"optInIHA\": true}"));
    platform.policy.healthData = false;
    platform.notifications.post(SystemNotifications::kEffectiveSettingsChanged);
    EXPECT_THAT(take(), ElementsAre("1 {\"optInDNU\": true, \"optInIHA\": false}"));
}

TEST_F(Tocsin, TheDiagnosticReportIsNotRemembered) {
    listen();
    take();
    platform.notifications.post(SystemNotifications::kDiagnosticReportStarted);
    EXPECT_THAT(take(), ElementsAre("0 null"));
    Listener late(notifier);
    late.hear(0);
    settle();
    EXPECT_THAT(late.heard, ElementsAre());
}

TEST_F(Tocsin, SendsABatteryThatDiffersOnce) {
    battery->set({.currentCapacity = 30, .maxCapacity = 60, .externalConnected = false});
    platform.power.add(battery);
    listen();
    EXPECT_THAT(take(),
                testing::Contains("4 {\"adapterDescription\": \"None\", \"batteryCharged\": false, "
                                  "\"batteryLevel\": 50, \"batteryWasConnected\": false, "
                                  "\"chargerType\": \"Unknown\", \"stateOnCharger\": false}"));
    battery->set({.currentCapacity = 30,
                  .maxCapacity = 60,
                  .externalConnected = true,
                  .adapterDetails = Properties::Adapter{"usb port-1"}});
    battery->send(PowerSource::kBatteryStatusHasChanged + 1);
    EXPECT_THAT(take(), ElementsAre()) << "a message of another type";
    battery->send(PowerSource::kBatteryStatusHasChanged);
    battery->send(PowerSource::kBatteryStatusHasChanged);
    EXPECT_THAT(take(), ElementsAre("4 {\"adapterDescription\": \"usb port-1\", "
                                    "\"batteryCharged\": false, \"batteryLevel\": 50, "
                                    "\"batteryWasConnected\": false, \"chargerType\": \"USB\", "
                                    "\"stateOnCharger\": true}"));
    battery->set({.fullyCharged = true, .adapterDetails = Properties::Adapter{}});
    battery->send(PowerSource::kBatteryStatusHasChanged);
    EXPECT_THAT(take(), ElementsAre("4 {\"adapterDescription\": \"None\", "
                                    "\"batteryCharged\": true, \"batteryLevel\": -1, "
                                    "\"batteryWasConnected\": true, \"chargerType\": \"Unknown\", "
                                    "\"stateOnCharger\": false}"));
}

TEST_F(Tocsin, ReadsTheKindOfChargerFromTheDescription) {
    struct Row {
        std::string description;
        std::string type;
    };
    const Row rows[] = {
        {"battery pack", "None"}, {"usb merrow", "USB"}, {"external brick", "External"},
        {"a merrow", "Merrow"},   {"USB", "Unknown"},    {"an external one", "Unknown"},
        {"", "Unknown"},
    };
    platform.power.add(battery);
    listen();
    take();
    for (const auto& row : rows) {
        battery->set({.currentCapacity = 1,
                      .maxCapacity = 0,
                      .adapterDetails = Properties::Adapter{row.description}});
        battery->send(PowerSource::kBatteryStatusHasChanged);
        const auto heard = take();
        ASSERT_EQ(heard.size(), 1u) << row.description;
        EXPECT_THAT(heard[0], testing::HasSubstr("\"chargerType\": \"" + row.type + '"'));
        EXPECT_THAT(heard[0], testing::HasSubstr("\"batteryLevel\": 1,")) << "0 is taken as 100";
    }
}

}  // namespace
}  // namespace keepsakes
