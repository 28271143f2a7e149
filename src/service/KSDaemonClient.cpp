// SPDX-License-Identifier: Apache-2.0
#include "service/KSDaemonClient.h"

#include <fmt/format.h>

#include <iterator>
#include <mutex>
#include <random>
#include <utility>

#include "bundle/KSEventBundleManager.h"
#include "collect/KSEventManager.h"
#include "core/Log.h"
#include "core/ResultKeys.h"
#include "core/TaskGroup.h"
#include "notify/KSDaemonSPINotifier.h"
#include "notify/KSWatchDog.h"
#include "platform/PlatformServices.h"
#include "trends/KSTrendsAnalyzer.h"

namespace keepsakes {

namespace {

constexpr std::string_view kMetricsVersion = "1.0.1";
constexpr int kLargestSeed = 73;

void logTrends(const KSEventArray& events) {
    if (!logsDebug()) return;
    for (const auto& event : events) {
        if (event->trends) logDebug(KSValue(*event->trends).description());
    }
}

/// The error of a trend analysis, which names every plan's status; none when all plans came to a
/// verdict.
OptionalError errorOfStatuses(const KSDictionary& statuses) {
    std::string text;
    bool good = true;
    for (const auto& [keyword, status] : statuses) {
        fmt::format_to(std::back_inserter(text), "({}:{})", keyword, status.description());
        good = good && KSTrendsAnalyzer::trendsfromAnalyticsResult(*status.asInteger()) != 0;
    }
    if (good) return std::nullopt;
    return KSError::make(KSErrorCode::trendAnalysisFailed, text);
}

}  // namespace

/// One request under way: its watchdog, and what its notification tells.
class KSDaemonClient::Request {
  public:
    Request(std::string_view name, const PlatformServices& platform,
            std::optional<std::string> processName)
        : watchDog(name, platform), platform_(platform) {
        if (processName) add({{std::string(kTriggerSource), *processName}});
    }

    ~Request() { platform_.requestEnded(); }
    Request(const Request&) = delete;
    Request& operator=(const Request&) = delete;

    void add(const KSDictionary& entries) {
        const std::lock_guard lock(mutex_);
        for (const auto& [key, value] : entries) payload_.insert_or_assign(key, value);
    }

    void fail(const OptionalError& error) {
        if (!error) return;
        add({{std::string(kResultOverallSuccess), false}});
        const std::lock_guard lock(mutex_);
        error_ = error;
    }

    KSDictionary payload() const {
        const std::lock_guard lock(mutex_);
        return payload_;
    }
    OptionalError error() const {
        const std::lock_guard lock(mutex_);
        return error_;
    }

    KSWatchDog watchDog;

  private:
    const PlatformServices& platform_;
    mutable std::mutex mutex_;
    KSDictionary payload_;
    OptionalError error_;
};

KSDaemonClient::KSDaemonClient(const PlatformServices& platform,
                               std::shared_ptr<KSEventManager> eventManager,
                               std::shared_ptr<KSEventBundleManager> eventBundleManager)
    : platform_(platform),
      notifier_(std::make_shared<KSDaemonSPINotifier>("DaemonClient")),
      eventManager_(std::move(eventManager)),
      eventBundleManager_(std::move(eventBundleManager)),
      queue_("KSDaemonClient"),
      trendsQueue_("KSDaemonClient.trends") {}

KSDaemonClient::~KSDaemonClient() = default;

std::shared_ptr<KSDaemonClient::Request> KSDaemonClient::begin(std::string_view watchdogName,
                                                               const KSConduitContext& context) {
    return std::make_shared<Request>(watchdogName, platform_, context.conduitProcessName());
}

/// What most operations end with: announce the result, reply, let the watchdog go.
ResultHandler KSDaemonClient::announcing(std::shared_ptr<Request> request, Notification identifier,
                                         Reply reply) {
    return [notifier = notifier_, request = std::move(request), identifier,
            reply = std::move(reply)](const OptionalError& error, const KSDictionary& result) {
        request->watchDog.pet();
        request->add(result);
        request->fail(error);
        notifier->sendNotification(identifier, request->payload());
        if (reply) reply(error);
        request->watchDog.cancel();
    };
}

void KSDaemonClient::storeEvents(KSEventArray events, KSConduitContext context, Reply reply) {
    queue_.async([this, events = std::move(events), request = begin("StoreEvents", context),
                  reply = std::move(reply)] {
        eventManager_->storeEvents(
            events, [request, reply](const OptionalError& error, const KSDictionary&) {
                request->watchDog.pet();
                if (reply) reply(error);
                request->watchDog.cancel();
            });
    });
}

void KSDaemonClient::fetchEventsWithOptions(KSEventFetchOptions options, KSConduitContext context,
                                            EventsReply reply) {
    queue_.async(
        [this, options, request = begin("FetchEvents", context), reply = std::move(reply)] {
            eventManager_->fetchEventsWithOptions(
                options, [notifier = notifier_, request, reply](KSEventArray events,
                                                                const OptionalError& error) {
                    request->watchDog.pet();
                    request->fail(error);
                    if (!error) request->add({{std::string(kResultNumberOfEvents), events.size()}});
                    notifier->sendNotification(kFetchedEvents, request->payload());
                    request->watchDog.pet();
                    logTrends(events);
                    if (reply) reply(std::move(events), error);
                    request->watchDog.cancel();
                });
        });
}

void KSDaemonClient::fetchEventBundlesWithOptions(KSEventBundleFetchOptions options,
                                                  KSConduitContext context, BundlesReply reply) {
    queue_.async(
        [this, options, request = begin("FetchEventBundles", context), reply = std::move(reply)] {
            eventBundleManager_->fetchEventBundlesWithOptions(
                options, [notifier = notifier_, request, reply](KSEventBundleArray bundles,
                                                                const OptionalError& error,
                                                                const KSDictionary& result) {
                    request->watchDog.pet();
                    request->add(result);
                    request->fail(error);
                    notifier->sendNotification(kFetchedEventBundles, request->payload());
                    if (reply) reply(std::move(bundles), error);
                    request->watchDog.cancel();
                });
        });
}

void KSDaemonClient::clearEvents(KSConduitContext context, Reply reply) {
    queue_.async([this, request = begin("ClearEvents", context), reply = std::move(reply)] {
        eventManager_->clearEventsWithHandler(
            [request, reply](const OptionalError& error, const KSDictionary&) {
                request->watchDog.pet();
                if (reply) reply(error);
                request->watchDog.cancel();
            });
    });
}

void KSDaemonClient::collectEvents(KSConduitContext context, Reply reply) {
    queue_.async([this, request = begin("CollectEvents", context), reply = std::move(reply)] {
        eventManager_->collectEventsWithHandler(announcing(request, kCollectedEvents, reply));
    });
}

void KSDaemonClient::bundleEvents(KSConduitContext context, Reply reply) {
    queue_.async([this, request = begin("BundleEvents", context), reply = std::move(reply)] {
        eventBundleManager_->bundleEventsWithHandler(announcing(request, kBundledEvents, reply));
    });
}

void KSDaemonClient::purgeEvents(KSConduitContext context, Reply reply) {
    queue_.async([this, request = begin("PurgeEvents", context), reply = std::move(reply)] {
        const auto group = TaskGroup::create();
        const auto finish = [request, group](const OptionalError& error,
                                             const KSDictionary& result) {
            request->watchDog.pet();
            request->fail(error);
            request->add(result);
            group->leave();
        };
        group->enter();
        group->enter();
        eventManager_->cleanUpEventsWithHandler(finish);
        eventBundleManager_->cleanUpEventBundlesWithHandler(finish);
        group->notify(queue_, [notifier = notifier_, request, reply] {
            request->watchDog.pet();
            notifier->sendNotification(kPurgedEvents, request->payload());
            if (reply) reply(request->error());
            request->watchDog.cancel();
        });
    });
}

void KSDaemonClient::runAnalytics(KSConduitContext context, Reply reply) {
    queue_.async([this, request = begin("RunAnalytics", context), reply = std::move(reply)] {
        eventManager_->runAnalyticsWithHandler(announcing(request, kRanAnalytics, reply));
    });
}

void KSDaemonClient::analyzeTrendsInEvents(KSEventArray events, KSConduitContext context,
                                           EventsReply reply) {
    // Not on the client's queue: other calls go out while many events are looked at.
    trendsQueue_.async([this, events = std::move(events), request = begin("AnalyzeTrends", context),
                        reply = std::move(reply)] {
        const KSTrendsAnalyzer analyzer(platform_, nullptr);
        analyzer.analyzeEvents(events, analyzer.buildAnalyticsPlans(),
                               [&](KSEventArray trends, const KSDictionary& statuses) {
                                   request->watchDog.pet();
                                   if (reply) reply(std::move(trends), errorOfStatuses(statuses));
                                   request->watchDog.cancel();
                               });
    });
}

void KSDaemonClient::fetchPhotoAnalyticsMetrics(KSConduitContext context, DictionaryReply reply) {
    const auto request = begin("FetchPhotoAnlytics", context);
    std::random_device source;
    const int seed = std::uniform_int_distribution(0, kLargestSeed)(source);
    if (reply) reply({{"version", kMetricsVersion}, {"seed", seed}}, std::nullopt);
    request->watchDog.cancel();
}

}  // namespace keepsakes
