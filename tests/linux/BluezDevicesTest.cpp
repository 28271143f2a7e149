// SPDX-License-Identifier: Apache-2.0
#include "linux/BluezDevices.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>

#include "core/Clock.h"
#include "core/WorkQueue.h"
#include "support/MockService.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::UnorderedElementsAre;

/// The Bluetooth service with one adapter, on a real bus.
class Bluez : public testing::Test {
  protected:
    Bluez() { MockService::useSessionBusAsSystemBus(); }

    void start() {
        bluez.start();
        bluez.call("/", "org.bluez.Mock.AddAdapter", "hci0 host");
    }
    /// Heard of lately: it has a signal strength.
    void addHeard(const std::string& adapter, const std::string& address, const std::string& name) {
        bluez.call("/", "org.bluez.Mock.AddDevice", adapter + " " + address + " \"" + name + "\"");
    }
    void add(const std::string& object, const std::string& properties) {
        bluez.mock("AddObject", "/org/bluez/hci0/" + object + " org.bluez.Device1 \"{" +
                                    properties + "}\" '@a(ssss) []'");
    }
    bool isScanning() {
        return std::system(
                   "gdbus call --session -d org.bluez -o /org/bluez/hci0 -m "
                   "org.freedesktop.DBus.Properties.Get org.bluez.Adapter1 Discovering"
                   " | grep -q true") == 0;
    }
    std::vector<std::string> near(bool scan = false) {
        const auto found = BluezDevices(clock, scan).devicesNear();
        return found ? *found : std::vector{"error: " + found.error().description()};
    }

    SystemClock clock;
    MockService bluez{"bluez5", "{}", "org.bluez", "/"};
};

TEST_F(Bluez, KnowsWhatItHearsOrIsConnectedToEachOnce) {
    start();
    EXPECT_THAT(near(), IsEmpty());
    addHeard("hci0", "11:22:33:44:55:66", "Anna's phone");
    add("dev_1", "'Address': <'AA:00:00:00:00:01'>, 'Name': <'only paired'>, 'Connected': <false>");
    add("dev_2", "'Address': <'AA:00:00:00:00:02'>, 'Name': <'headset'>, 'Connected': <true>");
    add("dev_3", "'Address': <'AA:00:00:00:00:03'>, 'RSSI': <int16 -90>");
    add("dev_4", "'Name': <'no address'>, 'Connected': <true>");
    bluez.call("/", "org.bluez.Mock.AddAdapter", "hci1 other");
    addHeard("hci1", "11:22:33:44:55:66", "Anna's phone");
    EXPECT_THAT(near(), UnorderedElementsAre("Anna's phone", "headset", ""));
    EXPECT_FALSE(isScanning()) << "nobody asked for that";

    add("dev_5", "'Address': <'AA:00:00:00:00:05'>, 'RSSI': <'near'>");
    EXPECT_THAT(near(), ElementsAre(testing::StartsWith("error: nearby devices: ")));
    bluez.end();
    EXPECT_THAT(near(), ElementsAre(testing::StartsWith("error: nearby devices: ")));
}

TEST_F(Bluez, LooksForDevicesOnlyWhereThatIsWantedAndStopsAtOnce) {
    start();
    BluezDevices devices(clock, true);
    Semaphore found;
    std::vector<std::string> names;
    WorkQueue queue("test");
    queue.async([&devices, &names, &found] {
        names = devices.devicesNear().value_or(std::vector<std::string>{"error"});
        found.signal();
    });
    while (!isScanning()) {
    }
    addHeard("hci0", "11:22:33:44:55:66", "tablet");
    devices.stop();
    ASSERT_TRUE(clock.wait(found, 30));
    EXPECT_THAT(names, ElementsAre("tablet"));
    EXPECT_THAT(devices.devicesNear().value(), ElementsAre("tablet")) << "without waiting";
}

}  // namespace
}  // namespace keepsakes
