// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>

#include "core/WorkQueue.h"
#include "wire/KSKeepsakesConduitProtocol.h"

namespace keepsakes {

class KSPersistenceManager;
struct PlatformServices;

/// Gathers the daemon's status: counts from the database, the last scan, the problems. Owned by
/// the server; any thread may ask and never waits.
class StatusReporter final : public StatusSource {
  public:
    StatusReporter(const PlatformServices& platform,
                   std::shared_ptr<KSPersistenceManager> persistenceManager);

    void status(std::function<void(DaemonStatus)> reply) override;

  private:
    DaemonStatus withoutCounts() const;

    const PlatformServices& platform_;
    const std::shared_ptr<KSPersistenceManager> persistenceManager_;
    WorkQueue queue_{"StatusReporter"};
};

}  // namespace keepsakes
