// SPDX-License-Identifier: Apache-2.0
#include "schedulers/KSEventComputeScheduler.h"

#include <utility>

#include "bundle/KSEventBundleManager.h"
#include "collect/KSEventManager.h"
#include "core/KSAssertion.h"
#include "core/TaskGroup.h"
#include "notify/KSDaemonSPINotifier.h"
#include "platform/PlatformServices.h"
#include "schedulers/ScheduledRun.h"

namespace keepsakes {

KSEventComputeScheduler::KSEventComputeScheduler(
    const PlatformServices& platform, std::shared_ptr<KSEventManager> eventManager,
    std::shared_ptr<KSEventBundleManager> eventBundleManager, bool computeEnabled)
    : platform_(platform),
      notifier_(std::make_shared<KSDaemonSPINotifier>("EventComputeScheduler")),
      eventManager_(std::move(eventManager)),
      eventBundleManager_(std::move(eventBundleManager)),
      computeEnabled_(computeEnabled),
      registration_(platform.activities->schedulePreregistered(
          kActivity, [this](const std::shared_ptr<ActivityRun>& activity) { run(activity); })) {}

std::shared_ptr<KSEventComputeScheduler> KSEventComputeScheduler::initWithUniverse(
    const ServiceLookup& universe, bool computeEnabled) {
    auto eventManager = universe.service<KSEventManager>("EventManager");
    auto bundleManager = universe.service<KSEventBundleManager>("EventBundleManager");
    const bool good = assertParameter(eventManager != nullptr, "eventManager", kUnit, 24) &&
                      assertParameter(bundleManager != nullptr, "eventBundleManager", kUnit, 25);
    if (!good) return nullptr;
    return std::shared_ptr<KSEventComputeScheduler>(new KSEventComputeScheduler(
        universe.platform(), std::move(eventManager), std::move(bundleManager), computeEnabled));
}

std::vector<std::string> KSEventComputeScheduler::diagnosticLines() const {
    return scheduleLines(platform_, kActivity, computeEnabled_);
}

void KSEventComputeScheduler::run(const std::shared_ptr<ActivityRun>& activity) {
    if (!computeEnabled_) return;
    const auto run = std::make_shared<ScheduledRun>("ScheduledComputeEvent", platform_, activity);
    const auto group = TaskGroup::create();
    const auto announcing = [this, &run, &group](int notification) -> ResultHandler {
        group->enter();
        return [run, group, notification, notifier = notifier_](const OptionalError& error,
                                                                const KSDictionary& result) {
            run->watchDog.pet();
            notifier->sendNotification(notification, triggerPayload(result, error));
            group->leave();
        };
    };
    eventManager_->runAnalyticsWithHandler(announcing(kRanAnalytics));
    eventBundleManager_->bundleEventsWithHandler(announcing(kBundledEvents));
    group->notify(queue_, [run] {
        run->watchDog.pet();
        run->activity->finish();
    });
}

}  // namespace keepsakes
