// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>

#include "StoreFixture.h"
#include "bundle/KSEventBundleManager.h"
#include "bundle/KSEventBundleStore.h"
#include "collect/KSEventManager.h"
#include "sources/KSPhotoManager.h"
#include "sources/KSVitalsManager.h"
#include "store/KSDefaultsManager.h"

namespace keepsakes {

/// The services from the store up to the bundle manager, registered as the daemon does.
class ManagersFixture : public StoreFixture {
  protected:
    ManagersFixture() {
        universe->add("EventStore", store);
        universe->add("EventBundleStore", KSEventBundleStore::initWithUniverse(*universe));
        universe->add("DefaultsManager", std::make_shared<KSDefaultsManager>(platform.defaults));
        universe->add("PhotoManager", KSPhotoManager::initWithUniverse(*universe));
        universe->add("VitalsManager", KSVitalsManager::initWithUniverse(*universe));
        universe->add("EventManager", KSEventManager::initWithUniverse(*universe));
        bundles = KSEventBundleManager::initWithUniverse(*universe);
        universe->add("EventBundleManager", bundles);
        bundleStore = universe->service<KSEventBundleStore>("EventBundleStore");
    }

    std::shared_ptr<KSEventBundleManager> bundles;
    std::shared_ptr<KSEventBundleStore> bundleStore;
};

}  // namespace keepsakes
