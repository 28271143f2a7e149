// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <functional>

namespace keepsakes {

class AnalyticsService;
class BackgroundActivities;
class BusListener;
class CalendarService;
class Clock;
class ContactStore;
class DeviceDataIndex;
class DevicePolicy;
class HealthStore;
class InteractionStore;
class LockState;
class NearbyDevices;
class NowPlayingStream;
class PhotoAnalysis;
class PowerSources;
class Problems;
class ProfileEventStore;
class RoutineService;
class SearchIndex;
class SystemNotifications;
class TopicStore;
class UserDefaults;

/// What the daemon may do by itself; fixed at start by the owner's diagnostics policy.
struct FeatureSwitches {
    bool collectEnabled = true;
    bool computeEnabled = true;
    bool purgeEnabled = true;
    bool anyEnabled = true;
};

/// Everything that the daemon needs from the device it runs on, put together by the composition
/// root. None is null but the
/// listener, which a daemon without clients has none of, and the nearby devices, where the owner
/// does not want them counted; all outlive the services.
struct PlatformServices {
    Clock* clock = nullptr;
    DevicePolicy* devicePolicy = nullptr;
    LockState* lockState = nullptr;
    PowerSources* powerSources = nullptr;
    SystemNotifications* systemNotifications = nullptr;
    UserDefaults* userDefaults = nullptr;
    AnalyticsService* analytics = nullptr;
    HealthStore* healthStore = nullptr;
    PhotoAnalysis* photoAnalysis = nullptr;
    RoutineService* routineService = nullptr;
    NowPlayingStream* nowPlayingStream = nullptr;
    InteractionStore* interactionStore = nullptr;
    ContactStore* contactStore = nullptr;
    TopicStore* topicStore = nullptr;
    NearbyDevices* nearbyDevices = nullptr;
    SearchIndex* searchIndex = nullptr;
    ProfileEventStore* profileEventStore = nullptr;
    CalendarService* calendars = nullptr;
    DeviceDataIndex* deviceData = nullptr;
    BackgroundActivities* activities = nullptr;
    BusListener* listener = nullptr;
    Problems* problems = nullptr;
    /// The daemon's folder for the database and its property lists; made when missing.
    std::filesystem::path cacheFolder;
    FeatureSwitches switches;
    /// Says that a request is done with and what it held is free. Any thread may call it.
    std::function<void()> requestEnded = [] {};
    /// Ends the process at once with this status (a fatal watchdog does).
    std::function<void(int status)> exitProcess;
};

}  // namespace keepsakes
