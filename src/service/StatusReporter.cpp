// SPDX-License-Identifier: Apache-2.0
#include "service/StatusReporter.h"

#include <utility>

#include "core/Problems.h"
#include "platform/DeviceDataIndex.h"
#include "platform/PlatformServices.h"
#include "store/KSPersistenceManager.h"

namespace keepsakes {

StatusReporter::StatusReporter(const PlatformServices& platform,
                               std::shared_ptr<KSPersistenceManager> persistenceManager)
    : platform_(platform), persistenceManager_(std::move(persistenceManager)) {}

DaemonStatus StatusReporter::withoutCounts() const {
    DaemonStatus status;
    status.version = KEEPSAKES_VERSION;
    status.databaseAvailable = persistenceManager_->isAvailable();
    status.lastCollection = persistenceManager_->getCollectionDate().value_or(KSDate{}).seconds;
    status.collectEnabled = platform_.switches.collectEnabled;
    status.computeEnabled = platform_.switches.computeEnabled;
    status.purgeEnabled = platform_.switches.purgeEnabled;
    const auto scan = platform_.deviceData->lastReport();
    status.filesIndexed = scan.filesIndexed;
    status.filesRefused = scan.filesRefused;
    status.problems = platform_.problems->list();
    status.problems.insert(status.problems.end(), scan.problems.begin(), scan.problems.end());
    if (status.problems.size() > Problems::kMost) status.problems.resize(Problems::kMost);
    return status;
}

void StatusReporter::status(std::function<void(DaemonStatus)> reply) {
    queue_.async([this, reply = std::move(reply)] {
        // Whoever asks first is told what a request would find, which opens the database.
        persistenceManager_->checkAvailabilityWithCompletionHandler(
            [](bool, const OptionalError&) {});
        auto status = withoutCounts();
        if (!status.databaseAvailable) {
            reply(std::move(status));
            return;
        }
        persistenceManager_->performBlock([status, reply](ManagedObjectContext& context) mutable {
            status.eventCount = context.countOf("KSEventMO");
            status.bundleCount = context.countOf("KSEventBundleMO");
            reply(std::move(status));
        });
    });
}

}  // namespace keepsakes
