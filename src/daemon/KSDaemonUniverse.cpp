// SPDX-License-Identifier: Apache-2.0
#include "daemon/KSDaemonUniverse.h"

#include <fmt/format.h>

#include <functional>
#include <ranges>
#include <utility>

#include "analytics/KSDaemonAnalyticsManager.h"
#include "bundle/BundleRules.h"
#include "bundle/KSEventBundleManager.h"
#include "bundle/KSEventBundleStore.h"
#include "collect/KSEventManager.h"
#include "core/KSAssertion.h"
#include "metrics/UsageMetrics.h"
#include "notify/KSDaemonSPINotifier.h"
#include "notify/KSTocsinNotifier.h"
#include "platform/PlatformServices.h"
#include "schedulers/KSEventCollectionScheduler.h"
#include "schedulers/KSEventComputeScheduler.h"
#include "schedulers/KSEventPurgeScheduler.h"
#include "service/KSManageServer.h"
#include "sources/KSForesightTravelManager.h"
#include "sources/KSLinkshelfManager.h"
#include "sources/KSNowPlayingMediaManager.h"
#include "sources/KSPhotoManager.h"
#include "sources/KSRoutineServiceManager.h"
#include "sources/KSSignificantContactManager.h"
#include "sources/KSSuggestedEventManager.h"
#include "sources/KSTopicManager.h"
#include "sources/KSVitalsManager.h"
#include "store/KSDefaultsManager.h"
#include "store/KSEventStore.h"
#include "store/KSPersistenceManager.h"

namespace keepsakes {

namespace {

constexpr double kDisabledLifeSeconds = 10;

KSEventBundleManager::MetricsObserver usageMetricsOf(const ServiceLookup& universe) {
    std::vector<std::string> ruleNames;
    for (const auto& rule : predicatesOfDesiredExperiences()) ruleNames.emplace_back(rule.name);
    const auto metrics = UsageMetrics::initWithUniverse(universe, std::move(ruleNames));
    return {std::bind_front(&UsageMetrics::submitMetricForEventBundle, metrics),
            std::bind_front(&UsageMetrics::submitKSEventData, metrics)};
}

}  // namespace

KSDaemonUniverse::KSDaemonUniverse(const PlatformServices& platform)
    : platform_(platform), exitQueue_("KSFeatureDisabledExit") {
    // Each may look up, while it is made, only what stands above it.
    add("TocsinNotifier", std::make_shared<KSTocsinNotifier>("TocsinNotifier", platform));
    add("PersistenceManager", KSPersistenceManager::initWithUniverse(*this));
    add("EventBundleStore", KSEventBundleStore::initWithUniverse(*this));
    add("EventStore", KSEventStore::initWithUniverse(*this));
    add("PhotoManager", KSPhotoManager::initWithUniverse(*this));
    add("RoutineServiceManager", KSRoutineServiceManager::initWithUniverse(*this));
    add("VitalsManager", KSVitalsManager::initWithUniverse(*this));
    add("LinkshelfManager", KSLinkshelfManager::initWithUniverse(*this));
    add("SuggestedEventManager", KSSuggestedEventManager::initWithUniverse(*this));
    add("ForesightTravelManager", KSForesightTravelManager::initWithUniverse(*this));
    add("NowPlayingMediaManager", KSNowPlayingMediaManager::initWithUniverse(*this));
    add("SignificantContactManager", KSSignificantContactManager::initWithUniverse(*this));
    add("TopicManager", KSTopicManager::initWithUniverse(*this));
    add("DefaultsManager", std::make_shared<KSDefaultsManager>(*platform.userDefaults));
    add("EventManager", KSEventManager::initWithUniverse(*this));
    const auto bundleManager = KSEventBundleManager::initWithUniverse(*this);
    add("EventBundleManager", bundleManager);
    bundleManager->setMetricsObserver(usageMetricsOf(*this));
    const auto server = KSManageServer::initWithUniverse(*this);
    add("Server", server);
    add("DaemonClientNotifier", server->getNotifier());
    const auto& switches = platform.switches;
    const auto collect =
        KSEventCollectionScheduler::initWithUniverse(*this, switches.collectEnabled);
    add("EventCollectionScheduler", collect);
    add("EventCollectionSchedulerNotifier", collect->notifier());
    const auto compute = KSEventComputeScheduler::initWithUniverse(*this, switches.computeEnabled);
    add("EventComputeScheduler", compute);
    add("EventComputeSchedulerNotifier", compute->notifier());
    const auto purge = KSEventPurgeScheduler::initWithUniverse(*this, switches.purgeEnabled);
    add("EventPurgeScheduler", purge);
    add("EventPurgeSchedulerNotifier", purge->notifier());
    add("DaemonAnalytics", KSDaemonAnalyticsManager::initWithUniverse(*this));
}

KSDaemonUniverse::~KSDaemonUniverse() {
    for (const auto& name : std::views::reverse(order_)) universe_.erase(name);
}

void KSDaemonUniverse::add(std::string_view name, std::shared_ptr<KSService> service) {
    universe_.emplace(name, std::move(service));
    order_.emplace_back(name);
}

std::shared_ptr<KSService> KSDaemonUniverse::getService(std::string_view name) const {
    const auto found = universe_.find(name);
    if (found != universe_.end()) return found->second;
    assertionFailed(fmt::format("No service named [{}]", name), "KSDaemonUniverse", 133);
    return nullptr;
}

void KSDaemonUniverse::run(bool anyEnabled, std::function<void()> exitInOrder) {
    if (anyEnabled) return;
    exitTimer_ = platform_.clock->after(exitQueue_, kDisabledLifeSeconds, std::move(exitInOrder));
}

}  // namespace keepsakes
