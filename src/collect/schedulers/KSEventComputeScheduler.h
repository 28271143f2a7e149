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

/// Analyses trends and forms bundles, side by side, whenever the device says that the time has
/// come, and announces each outcome: notification 5 of its notifier for the analysis, 3 for the
/// bundles. Owned by the registry as "EventComputeScheduler"; the two are joined on its queue.
/// Disabled, it still registers its activity, which then does nothing.
class KSEventComputeScheduler final : public KSService {
  public:
    static constexpr std::string_view kActivity = "com.brindle.keepsakesd.eventCompute";
    static constexpr int kBundledEvents = 3;
    static constexpr int kRanAnalytics = 5;

    /// Needs "EventManager" and "EventBundleManager".
    static std::shared_ptr<KSEventComputeScheduler> initWithUniverse(const ServiceLookup& universe,
                                                                     bool computeEnabled);

    const std::shared_ptr<KSDaemonSPINotifier>& notifier() const { return notifier_; }

    std::vector<std::string> diagnosticLines() const override;

  private:
    static constexpr std::string_view kUnit = "KSEventComputeScheduler";

    KSEventComputeScheduler(const PlatformServices& platform,
                            std::shared_ptr<KSEventManager> eventManager,
                            std::shared_ptr<KSEventBundleManager> eventBundleManager,
                            bool computeEnabled);
    void run(const std::shared_ptr<ActivityRun>& activity);

    const PlatformServices& platform_;
    const std::shared_ptr<KSDaemonSPINotifier> notifier_;
    const std::shared_ptr<KSEventManager> eventManager_;
    const std::shared_ptr<KSEventBundleManager> eventBundleManager_;
    const bool computeEnabled_;
    WorkQueue queue_{"KSEventComputeScheduler"};
    const ActivityRegistration registration_;  // last: its end waits for a block that runs
};

}  // namespace keepsakes
