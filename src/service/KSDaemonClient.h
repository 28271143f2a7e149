// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <string_view>

#include "core/WorkQueue.h"
#include "wire/KSKeepsakesConduitProtocol.h"

namespace keepsakes {

class KSDaemonSPINotifier;
class KSEventBundleManager;
class KSEventManager;
struct PlatformServices;

/// The object behind every client connection: turns each request into a call on a manager, guards
/// it with a watchdog, announces it through the client notifier and answers. Owned by the server;
/// any thread may call it and never waits: calls go out from its queue. Replies come on the
/// managers' queues. A missing reply block is fine.
class KSDaemonClient final : public KSKeepsakesConduitProtocol {
  public:
    /// Identifiers on the client notifier.
    enum Notification : std::int32_t {
        kFetchedEvents = 0,
        kFetchedEventBundles = 1,
        kCollectedEvents = 2,
        kBundledEvents = 3,
        kPurgedEvents = 4,
        kRanAnalytics = 5,
    };

    KSDaemonClient(const PlatformServices& platform, std::shared_ptr<KSEventManager> eventManager,
                   std::shared_ptr<KSEventBundleManager> eventBundleManager);
    ~KSDaemonClient() override;

    const std::shared_ptr<KSDaemonSPINotifier>& notifier() const { return notifier_; }

    void storeEvents(KSEventArray events, KSConduitContext context, Reply reply) override;
    void fetchEventsWithOptions(KSEventFetchOptions options, KSConduitContext context,
                                EventsReply reply) override;
    void fetchEventBundlesWithOptions(KSEventBundleFetchOptions options, KSConduitContext context,
                                      BundlesReply reply) override;
    void clearEvents(KSConduitContext context, Reply reply) override;
    void collectEvents(KSConduitContext context, Reply reply) override;
    void bundleEvents(KSConduitContext context, Reply reply) override;
    void purgeEvents(KSConduitContext context, Reply reply) override;
    void runAnalytics(KSConduitContext context, Reply reply) override;
    /// Error 0, which names every plan's verdict, unless all of them are low, normal or high.
    void analyzeTrendsInEvents(KSEventArray events, KSConduitContext context,
                               EventsReply reply) override;
    void fetchPhotoAnalyticsMetrics(KSConduitContext context, DictionaryReply reply) override;

  private:
    class Request;

    std::shared_ptr<Request> begin(std::string_view watchdogName, const KSConduitContext& context);
    ResultHandler announcing(std::shared_ptr<Request> request, Notification identifier,
                             Reply reply);

    const PlatformServices& platform_;
    const std::shared_ptr<KSDaemonSPINotifier> notifier_;
    const std::shared_ptr<KSEventManager> eventManager_;
    const std::shared_ptr<KSEventBundleManager> eventBundleManager_;
    WorkQueue queue_;
    WorkQueue trendsQueue_;
};

}  // namespace keepsakes
