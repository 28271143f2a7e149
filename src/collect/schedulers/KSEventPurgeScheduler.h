// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "core/ServiceLookup.h"
#include "core/WorkQueue.h"
#include "platform/BackgroundActivities.h"

namespace keepsakes {

class KSDaemonSPINotifier;
class KSEventBundleManager;
class KSEventManager;
struct PlatformServices;

/// Cleans up events and bundles, side by side, whenever the device says that the time has come, and
/// announces what both did as notification 4 of its notifier. Owned by the registry as
/// "EventPurgeScheduler"; the two are joined on its queue. Disabled, it still registers its
/// activity, which then does nothing.
class KSEventPurgeScheduler final : public KSService {
  public:
    static constexpr std::string_view kActivity = "com.brindle.keepsakesd.eventPurge";
    static constexpr int kPurgedEvents = 4;

    /// Needs "EventManager" and "EventBundleManager".
    static std::shared_ptr<KSEventPurgeScheduler> initWithUniverse(const ServiceLookup& universe,
                                                                   bool purgeEnabled);

    const std::shared_ptr<KSDaemonSPINotifier>& notifier() const { return notifier_; }

    std::vector<std::string> diagnosticLines() const override;

  private:
    static constexpr std::string_view kUnit = "KSEventPurgeScheduler";

    KSEventPurgeScheduler(const PlatformServices& platform,
                          std::shared_ptr<KSEventManager> eventManager,
                          std::shared_ptr<KSEventBundleManager> eventBundleManager,
                          bool purgeEnabled);
    void run(const std::shared_ptr<ActivityRun>& activity);

    const PlatformServices& platform_;
    const std::shared_ptr<KSDaemonSPINotifier> notifier_;
    const std::shared_ptr<KSEventManager> eventManager_;
    const std::shared_ptr<KSEventBundleManager> eventBundleManager_;
    const bool purgeEnabled_;
    WorkQueue queue_{"KSEventPurgeScheduler"};
    const ActivityRegistration registration_;  // last: its end waits for a block that runs
};

}  // namespace keepsakes
