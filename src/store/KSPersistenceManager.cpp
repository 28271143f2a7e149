// SPDX-License-Identifier: Apache-2.0
#include "store/KSPersistenceManager.h"

#include <utility>

#include "core/Clock.h"
#include "core/KSAssertion.h"
#include "core/Log.h"
#include "core/Problems.h"
#include "core/PropertyList.h"
#include "notify/KSDispatcher.h"
#include "notify/KSTocsinNotifier.h"
#include "platform/DeviceState.h"
#include "platform/PlatformServices.h"

namespace keepsakes {

namespace {

constexpr std::string_view kStoreFile = "keepsakesDataModel.sqlite";
constexpr std::string_view kLastCollectionFile = "lastCollection.plist";
constexpr std::string_view kLastCollectionKey = "lastCollectTriggerDate";

}  // namespace

KSError databaseUnavailableError() {
    return KSError::make(KSErrorCode::databaseUnavailable, "database is not avaialble");
}

KSPersistenceManager::KSPersistenceManager(const PlatformServices& platform)
    : platform_(platform),
      contextQueue_("KSManagedObjectContext"),
      queue_("KSPersistenceManager") {}

KSPersistenceManager::~KSPersistenceManager() {
    // On the queue, where the listening may be ending by itself.
    queue_.sync([this] { dispatcher_->invalidate(); });
    contextQueue_.sync([this] { managedObjectContext_.reset(); });
}

std::shared_ptr<KSPersistenceManager> KSPersistenceManager::initWithUniverse(
    const ServiceLookup& universe) {
    auto notifier = universe.service<KSTocsinNotifier>("TocsinNotifier");
    if (!assertParameter(notifier != nullptr, "notifier", "KSPersistenceManager", 25)) {
        return nullptr;
    }
    std::shared_ptr<KSPersistenceManager> manager(new KSPersistenceManager(universe.platform()));
    manager->dispatcher_ = KSDispatcher::initWithNotifier(std::move(notifier));
    manager->registerForNotifications();
    return manager;
}

void KSPersistenceManager::registerForNotifications() {
    dispatcher_->registerForNotification(KSTocsinNotifier::kIsUnlocked,
                                         [this](std::int32_t, const KSValue& payload) {
                                             if (const auto* state = payload.asDictionary())
                                                 onLockStateChangeNotification(*state);
                                         });
}

void KSPersistenceManager::onLockStateChangeNotification(const KSDictionary& payload) {
    if (!payload.contains("isUnlocked")) return;
    checkAvailabilityWithCompletionHandler([this](bool available, const OptionalError&) {
        if (!available) return;
        // On the manager's own queue: this is the notifier's, which detaching waits for.
        queue_.async(
            [this] { dispatcher_->unregisterForNotification(KSTocsinNotifier::kIsUnlocked); });
    });
}

void KSPersistenceManager::checkAvailabilityWithCompletionHandler(
    const AvailabilityHandler& handler) {
    if (isAvailable()) {
        handler(true, std::nullopt);
        return;
    }
    OptionalError error;
    contextQueue_.sync([this, &error] { error = load(); });
    handler(!error, error);
}

OptionalError KSPersistenceManager::load() {
    if (managedObjectContext_) return std::nullopt;
    // As a file that the device keeps locked away: it opens after the first unlock and stays open.
    const auto& lock = *platform_.lockState;
    if (lock.formattedForContentProtection() && !lock.unlockedSinceBoot()) {
        return databaseUnavailableError();
    }
    auto opened = ManagedObjectContext::open(platform_.cacheFolder / kStoreFile,
                                             *platform_.problems, changeObserver_);
    if (!opened) {
        logError(opened.error().description());
        platform_.problems->add(opened.error().description());
        return std::move(opened.error());
    }
    managedObjectContext_ = std::move(*opened);
    availability_ = Availability::available;
    return std::nullopt;
}

void KSPersistenceManager::performBlock(Block block) {
    contextQueue_.async([this, block = std::move(block)] {
        if (managedObjectContext_) block(*managedObjectContext_);
    });
}

OptionalError KSPersistenceManager::performBlockAndWait(const Block& block) {
    OptionalError error;
    contextQueue_.sync([this, &block, &error] {
        if (managedObjectContext_) {
            block(*managedObjectContext_);
        } else {
            error = databaseUnavailableError();
        }
    });
    return error;
}

void KSPersistenceManager::setChangeObserver(ManagedObjectContext::ChangeObserver observer) {
    contextQueue_.sync([this, &observer] { changeObserver_ = std::move(observer); });
}

KSDate KSPersistenceManager::now() const { return platform_.clock->now(); }

std::filesystem::path KSPersistenceManager::getPlistFile() const {
    return platform_.cacheFolder / kLastCollectionFile;
}

void KSPersistenceManager::persistCollectionDate() const {
    const auto error = writePropertyListFile(
        getPlistFile(), {{std::string(kLastCollectionKey), platform_.clock->now()}});
    if (error) logWarning(error->description());
}

std::optional<KSDate> KSPersistenceManager::getCollectionDate() const {
    const auto list = readPropertyListFile(getPlistFile());
    return list ? valueForKey(*list, kLastCollectionKey).asDate() : std::nullopt;
}

}  // namespace keepsakes
