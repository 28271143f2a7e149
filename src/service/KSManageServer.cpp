// SPDX-License-Identifier: Apache-2.0
#include "service/KSManageServer.h"

#include <utility>

#include "bundle/KSEventBundleManager.h"
#include "collect/KSEventManager.h"
#include "core/KSAssertion.h"
#include "core/Log.h"
#include "notify/KSDaemonSPINotifier.h"
#include "platform/PlatformServices.h"
#include "service/KSDaemonClient.h"
#include "service/StatusReporter.h"
#include "store/KSPersistenceManager.h"
#include "wire/BusListener.h"

namespace keepsakes {

KSManageServer::KSManageServer(const PlatformServices& platform,
                               std::unique_ptr<KSDaemonClient> client,
                               std::unique_ptr<StatusReporter> status)
    : platform_(platform), client_(std::move(client)), status_(std::move(status)) {}

KSManageServer::~KSManageServer() {
    if (platform_.listener) platform_.listener->invalidate();
}

std::shared_ptr<KSManageServer> KSManageServer::initWithUniverse(const ServiceLookup& universe) {
    auto eventManager = universe.service<KSEventManager>("EventManager");
    auto eventBundleManager = universe.service<KSEventBundleManager>("EventBundleManager");
    const bool good =
        assertParameter(eventManager != nullptr, "eventManager", kUnit, __LINE__) &&
        assertParameter(eventBundleManager != nullptr, "eventBundleManager", kUnit, __LINE__);
    if (!good) return nullptr;
    const auto& platform = universe.platform();
    auto persistenceManager = eventManager->persistenceManager();
    std::shared_ptr<KSManageServer> server(new KSManageServer(
        platform,
        std::make_unique<KSDaemonClient>(platform, std::move(eventManager),
                                         std::move(eventBundleManager)),
        std::make_unique<StatusReporter>(platform, std::move(persistenceManager))));
    if (platform.listener) platform.listener->resume(*server->client_, *server->status_);
    logInfo("initiate managerSever");
    return server;
}

std::shared_ptr<KSDaemonSPINotifier> KSManageServer::getNotifier() const {
    if (!assertParameter(client_ != nullptr, "server", kUnit, __LINE__)) return nullptr;
    if (!client_->notifier()) {
        assertionFailed("No daemon notifier", kUnit, __LINE__);
        return nullptr;
    }
    return client_->notifier();
}

}  // namespace keepsakes
