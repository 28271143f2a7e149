// SPDX-License-Identifier: Apache-2.0
#include "schedulers/KSEventCollectionScheduler.h"

#include <utility>

#include "collect/KSEventManager.h"
#include "core/KSAssertion.h"
#include "notify/KSDaemonSPINotifier.h"
#include "platform/PlatformServices.h"
#include "schedulers/ScheduledRun.h"

namespace keepsakes {

KSEventCollectionScheduler::KSEventCollectionScheduler(const PlatformServices& platform,
                                                       std::shared_ptr<KSEventManager> eventManager,
                                                       bool collectEnabled)
    : platform_(platform),
      notifier_(std::make_shared<KSDaemonSPINotifier>("EventCollectionScheduler")),
      eventManager_(std::move(eventManager)),
      collectEnabled_(collectEnabled),
      registration_(platform.activities->schedulePreregistered(
          kActivity, [this](const std::shared_ptr<ActivityRun>& activity) { run(activity); })) {}

std::shared_ptr<KSEventCollectionScheduler> KSEventCollectionScheduler::initWithUniverse(
    const ServiceLookup& universe, bool collectEnabled) {
    auto eventManager = universe.service<KSEventManager>("EventManager");
    if (!assertParameter(eventManager != nullptr, "eventManager", "KSEventCollectionScheduler",
                         __LINE__)) {
        return nullptr;
    }
    return std::shared_ptr<KSEventCollectionScheduler>(new KSEventCollectionScheduler(
        universe.platform(), std::move(eventManager), collectEnabled));
}

std::vector<std::string> KSEventCollectionScheduler::diagnosticLines() const {
    return scheduleLines(platform_, kActivity, collectEnabled_);
}

void KSEventCollectionScheduler::run(const std::shared_ptr<ActivityRun>& activity) {
    if (!collectEnabled_) return;
    const auto run = std::make_shared<ScheduledRun>("ScheduledCollectEvent", platform_, activity);
    eventManager_->collectEventsWithHandler(
        [run, notifier = notifier_](const OptionalError& error, const KSDictionary& result) {
            run->watchDog.pet();
            notifier->sendNotification(kCollectedEvents, triggerPayload(result, error));
            run->activity->finish();
            run->watchDog.cancel();
        });
}

}  // namespace keepsakes
