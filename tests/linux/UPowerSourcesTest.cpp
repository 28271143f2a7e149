// SPDX-License-Identifier: Apache-2.0
#include "linux/UPowerSources.h"

#include <fmt/format.h>
#include <gtest/gtest.h>

#include <deque>
#include <mutex>

#include "notify/KSDispatcher.h"
#include "notify/KSTocsinNotifier.h"
#include "support/MockService.h"
#include "support/TestPlatform.h"

namespace keepsakes {
namespace {

constexpr double kPowerDeadlineSeconds = 30;

/// UPower, the adapter and the notifier that tells of it, on a real bus and a real clock.
class UPower : public testing::Test {
  protected:
    UPower() {
        MockService::useSessionBusAsSystemBus();
        platform.services.powerSources = &power;
        dispatcher = KSDispatcher::initWithNotifier(
            std::make_shared<KSTocsinNotifier>("TocsinNotifier", platform.services));
        dispatcher->registerForNotification(KSTocsinNotifier::kBattery,
                                            [this](std::int32_t, const KSValue& payload) {
                                                const std::lock_guard lock(mutex);
                                                heard.push_back(brief(*payload.asDictionary()));
                                                hears.signal();
                                            });
        external = power.observeExternalPower(queue, [this] { externalChanges.signal(); });
    }
    ~UPower() override {
        bus.stop();
        dispatcher->invalidate();
    }

    static std::string brief(const KSDictionary& battery) {
        return fmt::format("{}% {} ({}) {}, was {}{}",
                           *valueForKey(battery, "batteryLevel").asNumber(),
                           *valueForKey(battery, "chargerType").asString(),
                           *valueForKey(battery, "adapterDescription").asString(),
                           *valueForKey(battery, "stateOnCharger").asBool() ? "on" : "off",
                           *valueForKey(battery, "batteryWasConnected").asBool() ? "on" : "off",
                           *valueForKey(battery, "batteryCharged").asBool() ? ", full" : "");
    }

    /// What the notifier says next about the battery.
    std::string next() {
        if (!clock.wait(hears, kPowerDeadlineSeconds)) return "nothing";
        const std::lock_guard lock(mutex);
        auto line = std::move(heard.front());
        heard.pop_front();
        return line;
    }
    bool hearsNothing() {
        const std::lock_guard lock(mutex);
        return heard.empty();
    }
    bool externalPowerChanges() { return clock.wait(externalChanges, kPowerDeadlineSeconds); }

    void startUPower() {
        upower.start();
        upower.addBattery("battery", 50);
        upower.addLinePower("axp20x-usb", false);
    }

    TestPlatform platform;
    SystemClock clock;
    MockUPower upower;
    BusThread bus{BusThread::Bus::system, clock};
    UPowerSources power{bus};
    std::shared_ptr<KSDispatcher> dispatcher;
    Observation external;
    Semaphore externalChanges;
    std::mutex mutex;
    std::deque<std::string> heard;
    Semaphore hears;
    WorkQueue queue{"test"};
};

TEST_F(UPower, PluggingInAndOutIsToldOnceEach) {
    startUPower();
    bus.start();
    EXPECT_EQ(next(), "50% Unknown (None) off, was off");
    EXPECT_FALSE(power.hasExternalPower());

    upower.updateDevice("line", "'Online': <true>");
    upower.update("/org/freedesktop/UPower", "org.freedesktop.UPower", "{'OnBattery': <false>}");
    upower.updateDevice("battery", "'State': <uint32 1>");
    EXPECT_EQ(next(), "50% USB (usb axp20x-usb) on, was off");
    EXPECT_TRUE(power.hasExternalPower());

    // The same again, and what nobody asks for.
    upower.updateDevice("line", "'Online': <true>");
    upower.updateDevice("battery", "'EnergyRate': <3.5>");
    upower.tellOfDevices();
    upower.updateDevice("line", "'Online': <false>");
    EXPECT_EQ(next(), "50% Unknown (None) off, was on");
    EXPECT_FALSE(power.hasExternalPower());
    upower.updateDevice("battery", "'Energy': <100.0>, 'State': <uint32 4>");
    EXPECT_EQ(next(), "100% Unknown (None) off, was off, full");
}

TEST_F(UPower, AddsBatteriesUpAndLeavesOutThoseOfOtherDevices) {
    upower.start();
    upower.addBattery("internal", 20);
    upower.addDevice("slice",
                     "'Type': <uint32 2>, 'PowerSupply': <true>, 'IsPresent': <true>, 'State': "
                     "<uint32 4>, 'Energy': <300.0>, 'EnergyFull': <300.0>");
    upower.addDevice("mouse", "'Type': <uint32 5>, 'PowerSupply': <false>, 'Percentage': <3.0>");
    upower.addLinePower("ADP1", true);
    bus.start();
    EXPECT_EQ(next(), "80% External (external ADP1) on, was off");
    upower.updateDevice("internal", "'IsPresent': <false>");
    EXPECT_EQ(next(), "100% External (external ADP1) on, was on, full");
}

TEST_F(UPower, ADeviceThatTellsNothingOfItsPowerCountsAsPluggedIn) {
    EXPECT_FALSE(power.hasExternalPower()) << "until that is known";
    bus.start();
    ASSERT_TRUE(externalPowerChanges());
    EXPECT_TRUE(power.hasExternalPower());

    startUPower();
    EXPECT_EQ(next(), "50% Unknown (None) off, was off") << "it is found when it comes";
    ASSERT_TRUE(externalPowerChanges());
    EXPECT_FALSE(power.hasExternalPower());
}

/// Signals once the bus thread is done with the end of UPower.
class EndOfUPower final : public BusFollower {
  public:
    explicit EndOfUPower(BusThread& bus) : bus_(bus) { bus.follow(*this); }
    ~EndOfUPower() override { bus_.stop(); }
    EndOfUPower(const EndOfUPower&) = delete;
    EndOfUPower& operator=(const EndOfUPower&) = delete;
    Semaphore seen;

  private:
    const char* service() const override { return "org.freedesktop.UPower"; }
    void becameAvailable() override {}
    void becameUnavailable() override {
        // The answer comes behind whatever else the end gives rise to.
        bus_.call("org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "GetId",
                  nullptr, [this](const BusReply&) { seen.signal(); });
    }
    void received(sd_bus_message*) override {}

    BusThread& bus_;
};

TEST_F(UPower, TheLastStateOutlivesTheService) {
    EndOfUPower end(bus);
    startUPower();
    bus.start();
    EXPECT_EQ(next(), "50% Unknown (None) off, was off");
    upower.end();
    ASSERT_TRUE(clock.wait(end.seen, kPowerDeadlineSeconds));
    WorkerThreads::shared().settle();
    EXPECT_TRUE(hearsNothing());
    EXPECT_FALSE(power.hasExternalPower());

    upower.start();
    upower.addBattery("battery", 40);
    upower.addLinePower("AC", true);
    auto last = next();
    while (!last.starts_with("40% External")) {
        ASSERT_NE(last, "nothing");
        last = next();
    }
    EXPECT_TRUE(power.hasExternalPower());
}

TEST_F(UPower, NonsenseChangesNothing) {
    startUPower();
    bus.start();
    EXPECT_EQ(next(), "50% Unknown (None) off, was off");
    const std::string device = "org.freedesktop.UPower.Device";
    const struct {
        const char* nonsense;
        const char* sense;
    } rows[] = {
        {"{'Energy': <'much'>}", "{'Energy': <51.0>}"},
        {"{'Energy': <-1.0>}", "{'Energy': <52.0>}"},
        {"{'IsPresent': <uint32 1>, 'Energy': <1.0>}", "{'IsPresent': <true>, 'Energy': <53.0>}"},
    };
    int expected = 51;
    for (const auto& row : rows) {
        upower.update(upower.devicePath("battery"), device, row.nonsense);
        upower.tellOfDevices();
        upower.update(upower.devicePath("battery"), device, row.sense);
        EXPECT_EQ(next(), fmt::format("{}% Unknown (None) off, was off", expected++))
            << row.nonsense;
    }
    upower.mock("AddMethod", "org.freedesktop.UPower EnumerateDevices '' s 'ret = \"all\"'");
    upower.updateDevice("battery", "'Energy': <10.0>");
    upower.mock("AddMethod",
                "org.freedesktop.UPower EnumerateDevices '' ao "
                "'ret = [k for k in objects.keys() if \"/devices/b\" in k]'");
    upower.tellOfDevices();
    EXPECT_EQ(next(), "10% Unknown (None) off, was off");
}

TEST_F(UPower, TheSystemBusIsFoundWhenItComes) {
    const TemporaryFolder folder;
    const auto socket = folder / "run/bus";
    setenv("DBUS_SYSTEM_BUS_ADDRESS", ("unix:path=" + socket.string()).c_str(), 1);
    startUPower();
    bus.start();
    ASSERT_TRUE(externalPowerChanges()) << "no bus, nothing that tells of power";
    // The private bus, under the name that was waited for.
    std::string address = getenv("DBUS_SESSION_BUS_ADDRESS");
    address = address.substr(std::string("unix:path=").size());
    std::filesystem::create_directory(socket.parent_path());
    std::filesystem::create_symlink(address.substr(0, address.find(',')), socket);
    EXPECT_EQ(next(), "50% Unknown (None) off, was off");
    EXPECT_FALSE(power.hasExternalPower());
}

TEST_F(UPower, AServiceThatHangsIsWaitedForByNobody) {
    startUPower();
    upower.pause();
    bus.start();
    EXPECT_FALSE(power.hasExternalPower());
    upower.resume();
    EXPECT_EQ(next(), "50% Unknown (None) off, was off");
    upower.pause();
    bus.stop();
}

}  // namespace
}  // namespace keepsakes
