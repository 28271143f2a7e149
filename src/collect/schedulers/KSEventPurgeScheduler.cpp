// SPDX-License-Identifier: Apache-2.0
#include "schedulers/KSEventPurgeScheduler.h"

#include <fmt/format.h>

#include <mutex>
#include <string>
#include <utility>

#include "bundle/KSEventBundleManager.h"
#include "collect/KSEventManager.h"
#include "core/KSAssertion.h"
#include "core/Log.h"
#include "core/ResultKeys.h"
#include "core/TaskGroup.h"
#include "notify/KSDaemonSPINotifier.h"
#include "platform/PlatformServices.h"
#include "schedulers/ScheduledRun.h"

namespace keepsakes {

namespace {

/// The one result of the two clean-ups, whichever thread they end on.
struct MergedResult {
    std::mutex mutex;
    KSDictionary entries;

    void merge(const OptionalError& error, const KSDictionary& result) {
        const std::lock_guard lock(mutex);
        for (const auto& [key, value] : result) entries.insert_or_assign(key, value);
        if (error) entries.insert_or_assign(std::string(kResultOverallSuccess), false);
    }
};

}  // namespace

KSEventPurgeScheduler::KSEventPurgeScheduler(
    const PlatformServices& platform, std::shared_ptr<KSEventManager> eventManager,
    std::shared_ptr<KSEventBundleManager> eventBundleManager, bool purgeEnabled)
    : platform_(platform),
      notifier_(std::make_shared<KSDaemonSPINotifier>("EventPurgeScheduler")),
      eventManager_(std::move(eventManager)),
      eventBundleManager_(std::move(eventBundleManager)),
      purgeEnabled_(purgeEnabled),
      registration_(platform.activities->schedulePreregistered(
          kActivity, [this](const std::shared_ptr<ActivityRun>& activity) { run(activity); })) {}

std::shared_ptr<KSEventPurgeScheduler> KSEventPurgeScheduler::initWithUniverse(
    const ServiceLookup& universe, bool purgeEnabled) {
    auto eventManager = universe.service<KSEventManager>("EventManager");
    auto bundleManager = universe.service<KSEventBundleManager>("EventBundleManager");
    const bool good = assertParameter(eventManager != nullptr, "eventManager", kUnit, 24) &&
                      assertParameter(bundleManager != nullptr, "eventBundleManager", kUnit, 25);
    if (!good) return nullptr;
    return std::shared_ptr<KSEventPurgeScheduler>(new KSEventPurgeScheduler(
        universe.platform(), std::move(eventManager), std::move(bundleManager), purgeEnabled));
}

std::vector<std::string> KSEventPurgeScheduler::diagnosticLines() const {
    return scheduleLines(platform_, kActivity, purgeEnabled_);
}

void KSEventPurgeScheduler::run(const std::shared_ptr<ActivityRun>& activity) {
    logInfo(fmt::format("{} completionHandler", kActivity));
    if (!purgeEnabled_) return;
    const auto run = std::make_shared<ScheduledRun>("ScheduledPurgeEvent", platform_, activity);
    const auto merged = std::make_shared<MergedResult>();
    const auto group = TaskGroup::create();
    group->enter();
    group->enter();
    const auto finish = [run, merged, group](const OptionalError& error,
                                             const KSDictionary& result) {
        run->watchDog.pet();
        merged->merge(error, result);
        group->leave();
    };
    eventManager_->cleanUpEventsWithHandler(finish);
    eventBundleManager_->cleanUpEventBundlesWithHandler(finish);
    group->notify(queue_, [run, merged, notifier = notifier_] {
        run->watchDog.pet();
        notifier->sendNotification(kPurgedEvents, triggerPayload(merged->entries, std::nullopt));
        run->activity->finish();
        run->watchDog.cancel();
    });
}

}  // namespace keepsakes
