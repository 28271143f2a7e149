// SPDX-License-Identifier: Apache-2.0
#include "daemon/DevicePorts.h"

#include <unistd.h>

#include <utility>

#include "core/Log.h"
#include "core/Problems.h"
#include "daemon/MemoryRelease.h"
#include "devicedata/IndexedCalendarService.h"
#include "devicedata/IndexedContactStore.h"
#include "devicedata/IndexedHealthStore.h"
#include "devicedata/IndexedInteractionStore.h"
#include "devicedata/IndexedPhotoAnalysis.h"
#include "devicedata/IndexedProfileEventStore.h"
#include "devicedata/IndexedRoutineService.h"
#include "devicedata/IndexedSearchIndex.h"
#include "devicedata/IndexedTopicStore.h"
#include "devicedata/MediaStreamFile.h"
#include "linux/ActivityTimers.h"
#include "linux/AnalyticsLog.h"
#include "linux/BluezDevices.h"
#include "linux/BusThread.h"
#include "linux/IndexerProcess.h"
#include "linux/LogindLockState.h"
#include "linux/MediaWatcher.h"
#include "linux/PropertyListDefaults.h"
#include "linux/UPowerSources.h"
#include "platform/DeviceState.h"
#include "platform/SystemNotifications.h"

namespace keepsakes {

namespace {

constexpr std::string_view kIndexFile = "deviceData.sqlite";
constexpr std::string_view kMediaStreamFile = "mediaStream.sqlite";
constexpr std::string_view kIndexerProgram = "keepsakes-indexer";

/// A device that does not lock its files away.
class NoContentProtection final : public LockState {
  public:
    bool formattedForContentProtection() const override { return false; }
    bool unlockedSinceBoot() const override { return true; }
    int currentState() const override { return 0; }
    Observation observe(const WorkQueue&, Task) override { return nullptr; }
};

/// logind is asked only where the owner wants the database to wait for it.
std::unique_ptr<LockState> lockStateFor(const Configuration& configuration,
                                        const StandardFolders& folders, BusThread& bus,
                                        Problems& problems) {
    if (!configuration.device.contentProtection) return std::make_unique<NoContentProtection>();
    LogindLockState::Owner owner{::getuid(), processEnvironment()("XDG_SESSION_ID")};
    return std::make_unique<LogindLockState>(bus, std::move(owner), folders.unlockFile(), problems);
}

OwnerFacts ownerFacts(const Configuration& configuration) {
    OwnerFacts facts;
    if (const auto& day = configuration.owner.dateOfBirth) {
        facts.dateOfBirth = DateComponents{day->year, day->month, day->day};
    }
    facts.biologicalSex = configuration.owner.biologicalSex;
    return facts;
}

/// The indexer lies beside the daemon's own program in a build folder, and in libexec when they are
/// installed.
std::filesystem::path indexerProgram() {
    std::error_code error;
    const auto folder = std::filesystem::read_symlink("/proc/self/exe", error).parent_path();
    auto beside = folder / kIndexerProgram;
    if (std::filesystem::exists(beside, error)) return beside;
    return (folder / KEEPSAKES_LIBEXEC_FROM_BIN / kIndexerProgram).lexically_normal();
}

IndexerOptions indexerOptions(const Configuration& configuration, std::filesystem::path index) {
    IndexerOptions options;
    options.program = indexerProgram();
    options.index = std::move(index);
    options.tracks = configuration.deviceData.tracks;
    options.photos = configuration.deviceData.photos;
    options.places = configuration.deviceData.places;
    options.gazetteer = configuration.deviceData.gazetteer;
    options.messages = configuration.deviceData.messages;
    options.contacts = configuration.deviceData.contacts;
    options.calendars = configuration.deviceData.calendars;
    options.ownerAddresses = configuration.owner.addresses;
    return options;
}

/// Writes what the players play; nothing when it is not wanted or there is no bus.
std::unique_ptr<MediaWatcher> mediaWatcher(bool wanted, MediaStreamFile& stream, Clock& clock) {
    if (!wanted) return nullptr;
    auto watcher = MediaWatcher::start(
        [&stream, failing = false](const NowPlayingRecord& record) mutable {
            const auto error = stream.append(record);
            // Once for a streak: a full disk fails with every record.
            if (error && !failing) logWarning(error->description());
            failing = error.has_value();
        },
        [&clock] {
            return Moment{clock.now(), awakeSeconds()};
        });
    if (watcher) return std::move(*watcher);
    logWarning(watcher.error().description());
    return nullptr;
}

std::vector<ActivityCriteria> activityCriteria(const Configuration& configuration) {
    const auto& set = configuration.activities;
    return {{"com.brindle.keepsakesd.eventCollection", set.collection, set.requireExternalPower},
            {"com.brindle.keepsakesd.eventCompute", set.compute, set.requireExternalPower},
            {"com.brindle.keepsakesd.eventPurge", set.purge, set.requireExternalPower}};
}

}  // namespace

struct DevicePorts::Adapters {
    Adapters(const Configuration& configuration, ConfiguredPolicy::Load reload,
             const StandardFolders& folders, std::unique_ptr<Clock> clockToUse)
        : clock(std::move(clockToUse)),
          policy(configuration, std::move(reload), *clock, notifications, problems),
          systemBus(BusThread::Bus::system, *clock),
          lock(lockStateFor(configuration, folders, systemBus, problems)),
          power(systemBus),
          defaults(folders.defaultsFolder()),
          analytics(folders.analyticsFile(), *clock),
          health(folders.cache / kIndexFile, ownerFacts(configuration)),
          photos(folders.cache / kIndexFile),
          routine(folders.cache / kIndexFile, *clock),
          interactions(folders.cache / kIndexFile),
          contacts(folders.cache / kIndexFile),
          search(folders.cache / kIndexFile, configuration.links.chats),
          profileEvents(folders.cache / kIndexFile),
          calendars(folders.cache / kIndexFile),
          deviceData(*clock, indexerOptions(configuration, folders.cache / kIndexFile)),
          activities(*clock, power, activityCriteria(configuration), folders.activitiesFile()),
          media(folders.cache / kMediaStreamFile, *clock, problems),
          topics(folders.cache / kIndexFile, configuration.deviceData.topicWords, media, problems),
          nearby(configuration.nearby.devices
                     ? std::make_unique<BluezDevices>(*clock, configuration.nearby.scan)
                     : nullptr),
          memory(*clock),
          watcher(mediaWatcher(configuration.deviceData.media, media, *clock)) {
        systemBus.start();
    }
    ~Adapters() { systemBus.stop(); }
    Adapters(const Adapters&) = delete;
    Adapters& operator=(const Adapters&) = delete;

    std::unique_ptr<Clock> clock;
    Problems problems;
    SystemNotifications notifications;
    ConfiguredPolicy policy;
    BusThread systemBus;
    std::unique_ptr<LockState> lock;
    UPowerSources power;
    PropertyListDefaults defaults;
    AnalyticsLog analytics;
    IndexedHealthStore health;
    IndexedPhotoAnalysis photos;
    IndexedRoutineService routine;
    IndexedInteractionStore interactions;
    IndexedContactStore contacts;
    IndexedSearchIndex search;
    IndexedProfileEventStore profileEvents;
    IndexedCalendarService calendars;
    IndexerProcess deviceData;
    ActivityTimers activities;
    MediaStreamFile media;
    IndexedTopicStore topics;
    std::unique_ptr<BluezDevices> nearby;
    MemoryRelease memory;
    std::unique_ptr<MediaWatcher> watcher;
};

DevicePorts::DevicePorts(const Configuration& configuration, ConfiguredPolicy::Load reload,
                         const StandardFolders& folders, std::unique_ptr<Clock> clock)
    : adapters_(
          std::make_unique<Adapters>(configuration, std::move(reload), folders, std::move(clock))) {
    services_.clock = adapters_->clock.get();
    services_.devicePolicy = &adapters_->policy;
    services_.lockState = adapters_->lock.get();
    services_.powerSources = &adapters_->power;
    services_.systemNotifications = &adapters_->notifications;
    services_.userDefaults = &adapters_->defaults;
    services_.analytics = &adapters_->analytics;
    services_.healthStore = &adapters_->health;
    services_.photoAnalysis = &adapters_->photos;
    services_.routineService = &adapters_->routine;
    services_.nowPlayingStream = &adapters_->media;
    services_.interactionStore = &adapters_->interactions;
    services_.contactStore = &adapters_->contacts;
    services_.topicStore = &adapters_->topics;
    services_.nearbyDevices = adapters_->nearby.get();
    services_.searchIndex = &adapters_->search;
    services_.profileEventStore = &adapters_->profileEvents;
    services_.calendars = &adapters_->calendars;
    services_.deviceData = &adapters_->deviceData;
    services_.activities = &adapters_->activities;
    services_.problems = &adapters_->problems;
    services_.requestEnded = [adapters = adapters_.get()] { adapters->memory.soon(); };
    services_.cacheFolder = folders.cache;
    services_.exitProcess = [](int status) { ::_exit(status); };
}

DevicePorts::~DevicePorts() = default;

ConfiguredPolicy& DevicePorts::policy() { return adapters_->policy; }

}  // namespace keepsakes
