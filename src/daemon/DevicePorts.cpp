// SPDX-License-Identifier: Apache-2.0
#include "daemon/DevicePorts.h"

#include <unistd.h>

#include <utility>

#include "core/Problems.h"
#include "daemon/MemoryRelease.h"
#include "devicedata/IndexedHealthStore.h"
#include "devicedata/IndexedPhotoAnalysis.h"
#include "devicedata/IndexedRoutineService.h"
#include "linux/AnalyticsLog.h"
#include "linux/IndexerProcess.h"
#include "linux/PropertyListDefaults.h"
#include "platform/DeviceState.h"

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
    options.places = configuration.deviceData.places;
    options.gazetteer = configuration.deviceData.gazetteer;
    return options;
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
          routine(folders.cache / kIndexFile, *clock),
          deviceData(*clock, indexerOptions(configuration, folders.cache / kIndexFile)),
          memory(*clock) {}

    std::unique_ptr<Clock> clock;
    Problems problems;
    ConfiguredPolicy policy;
    NoContentProtection lock;
    PropertyListDefaults defaults;
    AnalyticsLog analytics;
    IndexedHealthStore health;
    IndexedPhotoAnalysis photos;
    IndexedRoutineService routine;
    IndexerProcess deviceData;
    MemoryRelease memory;
};

DevicePorts::DevicePorts(const Configuration& configuration, const StandardFolders& folders,
                         std::unique_ptr<Clock> clock)
    : adapters_(std::make_unique<Adapters>(configuration, folders, std::move(clock))) {
    services_.clock = adapters_->clock.get();
    services_.devicePolicy = &adapters_->policy;
    services_.lockState = &adapters_->lock;
    services_.userDefaults = &adapters_->defaults;
    services_.analytics = &adapters_->analytics;
    services_.healthStore = &adapters_->health;
    services_.photoAnalysis = &adapters_->photos;
    services_.routineService = &adapters_->routine;
    services_.deviceData = &adapters_->deviceData;
    services_.problems = &adapters_->problems;
    services_.requestEnded = [adapters = adapters_.get()] { adapters->memory.soon(); };
    services_.cacheFolder = folders.cache;
    services_.exitProcess = [](int status) { ::_exit(status); };
}

DevicePorts::~DevicePorts() = default;

}  // namespace keepsakes
