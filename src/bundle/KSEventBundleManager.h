// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string_view>

#include "bundle/KSEventBundler.h"
#include "core/KSError.h"
#include "core/ServiceLookup.h"
#include "core/WorkQueue.h"
#include "model/KSEventBundle.h"
#include "model/KSEventBundleFetchOptions.h"

namespace keepsakes {

class Clock;
class KSEventBundleStore;
class KSEventManager;

/// Runs the bundling pass, serves bundles with their events filled in again, and purges expired
/// ones. Owned by the registry as "EventBundleManager"; any thread may call it, the work runs on
/// its queue and handlers are called once. Each operation first checks the database; without one
/// it answers error 16 and {"stateDatabaseAvailable": false}.
class KSEventBundleManager final : public KSService {
  public:
    using BundlesHandler = std::function<void(KSEventBundleArray, OptionalError, KSDictionary)>;

    /// Takes what a pass computed, for usage metrics; called on the manager's queue.
    struct MetricsObserver {
        std::function<void(double windowSeconds, const KSEventArray& events,
                           const KSEventBundler::Clusters&, const KSEventBundler::Bundles&)>
            submitMetricForEventBundle;
        std::function<void(const KSEventArray& events, KSDate start, KSDate end, KSDate subDate)>
            submitKSEventData;
    };

    /// Needs "EventBundleStore" and "EventManager".
    static std::shared_ptr<KSEventBundleManager> initWithUniverse(const ServiceLookup& universe);

    /// Bundles the last seven days, replacing the stored bundles that share events with new ones.
    void bundleEventsWithHandler(ResultHandler handler);
    void fetchEventBundlesWithOptions(KSEventBundleFetchOptions options, BundlesHandler handler);
    void cleanUpEventBundlesWithHandler(ResultHandler handler);

    /// With it off, clusters are made and no rules applied. On at start; set before the first pass.
    void setEnableSemanticPruning(bool enable) { enableSemanticPruning_ = enable; }
    /// Set before the first pass. Without one, the windows that only metrics are made of are
    /// passed over.
    void setMetricsObserver(MetricsObserver observer) { metrics_ = std::move(observer); }

    const std::shared_ptr<KSEventBundleStore>& eventBundleStore() const {
        return eventBundleStore_;
    }

  private:
    static constexpr std::string_view kUnit = "KSEventBundleManager";

    KSEventBundleManager(Clock& clock, std::shared_ptr<KSEventBundleStore> eventBundleStore,
                         std::shared_ptr<KSEventManager> eventManager);

    void _bundleEvents(const ResultHandler& handler);
    void bundleFetchedEvents(const KSEventArray& events, KSDate now, bool collectedRecently,
                             const ResultHandler& handler);
    void _bundleEventsWithStartDate(KSDate start, KSDate end, KSEventArray events, bool storeBundle,
                                    bool submitMetricsFlg, const ResultHandler& handler);
    static KSEventBundler::Bundles getUnfilteredEventBundleFrom(
        const KSEventBundler::Clusters& clusters, const KSEventBundler::Bundles& ruleBundles,
        KSDate now);
    void saveEventBundles(const KSEventBundleArray& bundles, KSDate start, KSDate end,
                          const ResultHandler& handler);
    void _fetchEventBundlesWithOptions(const KSEventBundleFetchOptions& options,
                                       const BundlesHandler& handler);
    void _rehydrateEventBundles(const KSEventBundleArray& bundles, const BundlesHandler& handler);
    static KSEventArray findRehydrateEvents(const std::map<KSUUID, KSEventPointer>& rehydrated,
                                            const KSEventBundle& bundle);

    Clock& clock_;
    bool enableSemanticPruning_ = true;
    MetricsObserver metrics_;
    const std::shared_ptr<KSEventBundleStore> eventBundleStore_;
    const std::shared_ptr<KSEventManager> eventManager_;
    WorkQueue queue_;
};

}  // namespace keepsakes
