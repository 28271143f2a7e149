// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "core/ServiceLookup.h"
#include "platform/BackgroundActivities.h"

namespace keepsakes {

class KSDaemonSPINotifier;
class KSEventManager;
struct PlatformServices;

/// Collects events whenever the device says that the time has come, and announces the outcome as
/// notification 2 of its notifier. Owned by the registry as "EventCollectionScheduler". Disabled,
/// it still registers its activity, which then does nothing.
class KSEventCollectionScheduler final : public KSService {
  public:
    static constexpr std::string_view kActivity = "com.brindle.keepsakesd.eventCollection";
    static constexpr int kCollectedEvents = 2;

    /// Needs "EventManager".
    static std::shared_ptr<KSEventCollectionScheduler> initWithUniverse(
        const ServiceLookup& universe, bool collectEnabled);

    const std::shared_ptr<KSDaemonSPINotifier>& notifier() const { return notifier_; }

    std::vector<std::string> diagnosticLines() const override;

  private:
    KSEventCollectionScheduler(const PlatformServices& platform,
                               std::shared_ptr<KSEventManager> eventManager, bool collectEnabled);
    void run(const std::shared_ptr<ActivityRun>& activity);

    const PlatformServices& platform_;
    const std::shared_ptr<KSDaemonSPINotifier> notifier_;
    const std::shared_ptr<KSEventManager> eventManager_;
    const bool collectEnabled_;
    const ActivityRegistration registration_;  // last: its end waits for a block that runs
};

}  // namespace keepsakes
