// SPDX-License-Identifier: Apache-2.0
#include "daemon/DevicePorts.h"

#include <unistd.h>

#include <utility>

#include "core/Problems.h"
#include "daemon/MemoryRelease.h"
#include "devicedata/IndexedHealthStore.h"
#include "devicedata/IndexedPhotoAnalysis.h"
#include "linux/ActivityTimers.h"
#include "linux/AnalyticsLog.h"
#include "linux/IndexerProcess.h"
#include "linux/PropertyListDefaults.h"
#include "platform/DeviceState.h"
#include "platform/PowerSources.h"
#include "platform/SystemNotifications.h"

namespace keepsakes {

namespace {

constexpr std::string_view kIndexFile = "deviceData.sqlite";
constexpr std::string_view kIndexerProgram = "keepsakes-indexer";

class ConfiguredPolicy final : public DevicePolicy {
  public:
    ConfiguredPolicy(bool diagnostics, bool healthData)
        : diagnostics_(diagnostics), healthData_(healthData) {}
    bool diagnosticSubmissionAllowed() const override { return diagnostics_; }
    bool healthDataSubmissionAllowed() const override { return healthData_; }

  private:
    const bool diagnostics_;
    const bool healthData_;
};

/// A device that does not lock its files away.
class NoContentProtection final : public LockState {
  public:
    bool formattedForContentProtection() const override { return false; }
    bool unlockedSinceBoot() const override { return true; }
    int currentState() const override { return 0; }
    Observation observe(const WorkQueue&, Task) override { return nullptr; }
};

/// A device that tells nothing of its power.
class NoPowerSources final : public PowerSources {
  public:
    Observation observeSources(const WorkQueue&,
                               std::function<void(const std::shared_ptr<PowerSource>&)>) override {
        return nullptr;
    }
    bool hasExternalPower() const override { return true; }
    Observation observeExternalPower(const WorkQueue&, Task) override { return nullptr; }
};

OwnerFacts ownerFacts(const Configuration& configuration) {
    OwnerFacts facts;
    if (const auto& day = configuration.owner.dateOfBirth) {
        facts.dateOfBirth = DateComponents{day->year, day->month, day->day};
    }
    facts.biologicalSex = configuration.owner.biologicalSex;
    return facts;
}

/// The indexer lies beside the daemon's own program.
std::filesystem::path indexerProgram() {
    std::error_code error;
    const auto self = std::filesystem::read_symlink("/proc/self/exe", error);
    return self.parent_path() / kIndexerProgram;
}

IndexerOptions indexerOptions(const Configuration& configuration, std::filesystem::path index) {
    IndexerOptions options;
    options.program = indexerProgram();
    options.index = std::move(index);
    options.tracks = configuration.deviceData.tracks;
    options.photos = configuration.deviceData.photos;
    return options;
}

std::vector<ActivityCriteria> activityCriteria(const Configuration& configuration) {
    const auto& set = configuration.activities;
    return {{"com.brindle.keepsakesd.eventCollection", set.collection, set.requireExternalPower},
            {"com.brindle.keepsakesd.eventCompute", set.compute, set.requireExternalPower},
            {"com.brindle.keepsakesd.eventPurge", set.purge, set.requireExternalPower}};
}

}  // namespace

struct DevicePorts::Adapters {
    Adapters(const Configuration& configuration, const StandardFolders& folders,
             std::unique_ptr<Clock> clockToUse)
        : clock(std::move(clockToUse)),
          policy(configuration.policy.diagnostics, configuration.policy.healthData),
          defaults(folders.defaultsFolder()),
          analytics(folders.analyticsFile(), *clock),
          health(folders.cache / kIndexFile, ownerFacts(configuration)),
          photos(folders.cache / kIndexFile),
          deviceData(*clock, indexerOptions(configuration, folders.cache / kIndexFile)),
          activities(*clock, power, activityCriteria(configuration), folders.activitiesFile()),
          memory(*clock) {}

    std::unique_ptr<Clock> clock;
    Problems problems;
    ConfiguredPolicy policy;
    NoContentProtection lock;
    NoPowerSources power;
    SystemNotifications notifications;
    PropertyListDefaults defaults;
    AnalyticsLog analytics;
    IndexedHealthStore health;
    IndexedPhotoAnalysis photos;
    IndexerProcess deviceData;
    ActivityTimers activities;
    MemoryRelease memory;
};

DevicePorts::DevicePorts(const Configuration& configuration, const StandardFolders& folders,
                         std::unique_ptr<Clock> clock)
    : adapters_(std::make_unique<Adapters>(configuration, folders, std::move(clock))) {
    services_.clock = adapters_->clock.get();
    services_.devicePolicy = &adapters_->policy;
    services_.lockState = &adapters_->lock;
    services_.powerSources = &adapters_->power;
    services_.systemNotifications = &adapters_->notifications;
    services_.userDefaults = &adapters_->defaults;
    services_.analytics = &adapters_->analytics;
    services_.healthStore = &adapters_->health;
    services_.photoAnalysis = &adapters_->photos;
    services_.deviceData = &adapters_->deviceData;
    services_.activities = &adapters_->activities;
    services_.problems = &adapters_->problems;
    services_.requestEnded = [adapters = adapters_.get()] { adapters->memory.soon(); };
    services_.cacheFolder = folders.cache;
    services_.exitProcess = [](int status) { ::_exit(status); };
}

DevicePorts::~DevicePorts() = default;

}  // namespace keepsakes
