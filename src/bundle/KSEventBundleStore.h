// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <memory>

#include "core/KSError.h"
#include "core/ServiceLookup.h"
#include "model/KSEventBundle.h"
#include "model/KSEventBundleFetchOptions.h"

namespace keepsakes {

class KSPersistenceManager;

/// The only code that reads and writes bundle rows. Every operation does its work on the
/// persistence manager's context and calls its handler there, before it returns. Owned by the
/// registry as "EventBundleStore"; any thread may call it.
class KSEventBundleStore final : public KSService {
  public:
    using BundlesHandler = std::function<void(KSEventBundleArray, OptionalError)>;

    static std::shared_ptr<KSEventBundleStore> initWithUniverse(const ServiceLookup& universe);

    const std::shared_ptr<KSPersistenceManager>& persistenceManager() const {
        return persistenceManager_;
    }

    /// Adds the bundles that have events; those without are left out, yet counted in the result.
    void storeEventBundles(const KSEventBundleArray& bundles, const ResultHandler& handler);
    void removeEventBundles(const KSEventBundleArray& bundles, const ResultHandler& handler);
    void purgeExpiredEventBundles(const ResultHandler& handler);
    void fetchEventBundleWithOptions(const KSEventBundleFetchOptions& options,
                                     const BundlesHandler& handler);

  private:
    explicit KSEventBundleStore(std::shared_ptr<KSPersistenceManager> persistenceManager);

    const std::shared_ptr<KSPersistenceManager> persistenceManager_;
};

}  // namespace keepsakes
