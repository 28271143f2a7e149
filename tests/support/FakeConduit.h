// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <algorithm>
#include <condition_variable>
#include <functional>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

#include "core/Semaphore.h"
#include "core/WorkQueue.h"
#include "wire/KSKeepsakesConduitProtocol.h"

namespace keepsakes {

/// What stands behind the listener in tests: keeps what it is given, hands it out again, and
/// replies on a work queue as the daemon does. Any thread may ask it.
class FakeConduit final : public KSKeepsakesConduitProtocol, public StatusSource {
  public:
    /// Every operation fails so while set.
    void failWith(OptionalError error) {
        const std::lock_guard lock(mutex_);
        error_ = std::move(error);
    }
    void setBundles(KSEventBundleArray bundles) {
        const std::lock_guard lock(mutex_);
        bundles_ = std::move(bundles);
    }
    void setEvents(KSEventArray events) {
        const std::lock_guard lock(mutex_);
        events_ = std::move(events);
    }
    void setProblems(std::vector<std::string> problems) {
        const std::lock_guard lock(mutex_);
        problems_ = std::move(problems);
    }
    KSEventArray events() const {
        const std::lock_guard lock(mutex_);
        return events_;
    }
    /// The names of the operations so far, in order.
    std::vector<std::string> calls() const {
        const std::lock_guard lock(mutex_);
        return calls_;
    }
    /// Waits until `count` operations have begun.
    void waitForCalls(std::size_t count) {
        std::unique_lock lock(mutex_);
        called_.wait(lock, [&] { return calls_.size() >= count; });
    }
    KSEventFetchOptions lastEventOptions() const {
        const std::lock_guard lock(mutex_);
        return eventOptions_;
    }
    KSEventBundleFetchOptions lastBundleOptions() const {
        const std::lock_guard lock(mutex_);
        return bundleOptions_;
    }
    /// What `analyzeTrendsInEvents` replies; without it, the events it was given.
    using Analysis = std::function<std::pair<KSEventArray, OptionalError>(const KSEventArray&)>;
    void analyzeWith(Analysis analysis) {
        const std::lock_guard lock(mutex_);
        analysis_ = std::move(analysis);
    }
    /// From now on replies wait on the queue until `release`.
    void hold() {
        queue_.async([this] { gate_.wait(); });
    }
    void release() { gate_.signal(); }

    /// Runs in the middle of clear, collect, bundle, purge and analytics.
    void whileWorking(Task task) {
        const std::lock_guard lock(mutex_);
        working_ = std::move(task);
    }
    /// Returns when everything begun so far is replied to.
    void settle() {
        queue_.sync([] {});
    }

    void storeEvents(KSEventArray events, KSConduitContext, Reply reply) override {
        enqueue("storeEvents", [this, events = std::move(events), reply = std::move(reply)] {
            std::unique_lock lock(mutex_);
            if (!error_) events_.insert(events_.end(), events.begin(), events.end());
            const auto error = error_;
            lock.unlock();
            reply(error);
        });
    }
    void fetchEventsWithOptions(KSEventFetchOptions options, KSConduitContext,
                                EventsReply reply) override {
        enqueue("fetchEvents", [this, options, reply = std::move(reply)] {
            std::unique_lock lock(mutex_);
            eventOptions_ = options;
            auto found = events_;
            const auto error = error_;
            lock.unlock();
            std::erase_if(found, [&options](const KSEventPointer& event) {
                const auto& window = options.dateInterval;
                return (window &&
                        (event->startDate() > window->end || event->endDate() < window->start)) ||
                       (options.category != KSEventCategory::unknown &&
                        event->category() != options.category);
            });
            std::ranges::stable_sort(found, {}, [&options](const KSEventPointer& event) {
                return options.ascending ? event->startDate().seconds : -event->startDate().seconds;
            });
            if (options.limit && *options.limit < static_cast<double>(found.size())) {
                found.resize(static_cast<std::size_t>(*options.limit));
            }
            reply(std::move(found), error);
        });
    }
    void fetchEventBundlesWithOptions(KSEventBundleFetchOptions options, KSConduitContext,
                                      BundlesReply reply) override {
        enqueue("fetchEventBundles", [this, options, reply = std::move(reply)] {
            std::unique_lock lock(mutex_);
            bundleOptions_ = options;
            const auto bundles = bundles_;
            const auto error = error_;
            lock.unlock();
            reply(bundles, error);
        });
    }
    void clearEvents(KSConduitContext, Reply reply) override {
        work("clearEvents", std::move(reply));
    }
    void collectEvents(KSConduitContext, Reply reply) override {
        work("collectEvents", std::move(reply));
    }
    void bundleEvents(KSConduitContext, Reply reply) override {
        work("bundleEvents", std::move(reply));
    }
    void purgeEvents(KSConduitContext, Reply reply) override {
        work("purgeEvents", std::move(reply));
    }
    void runAnalytics(KSConduitContext, Reply reply) override {
        work("runAnalytics", std::move(reply));
    }
    void analyzeTrendsInEvents(KSEventArray events, KSConduitContext, EventsReply reply) override {
        enqueue("analyzeTrends", [this, events = std::move(events), reply = std::move(reply)] {
            std::unique_lock lock(mutex_);
            const auto error = error_;
            const auto analysis = analysis_;
            lock.unlock();
            if (analysis) {
                auto [trends, failed] = analysis(events);
                reply(std::move(trends), std::move(failed));
                return;
            }
            reply(events, error);
        });
    }
    void fetchPhotoAnalyticsMetrics(KSConduitContext, DictionaryReply reply) override {
        enqueue("fetchMetrics", [this, reply = std::move(reply)] {
            std::unique_lock lock(mutex_);
            const auto error = error_;
            lock.unlock();
            reply({{"photos", 12}, {"share", 0.25}}, error);
        });
    }
    void status(std::function<void(DaemonStatus)> reply) override {
        queue_.async([this, reply = std::move(reply)] {
            std::unique_lock lock(mutex_);
            DaemonStatus status;
            status.version = "1.2.3";
            status.databaseAvailable = true;
            status.lastCollection = 700000000.5;
            status.purgeEnabled = true;
            status.eventCount = events_.size();
            status.problems = problems_;
            lock.unlock();
            reply(std::move(status));
        });
    }

  private:
    void enqueue(std::string name, Task task) {
        {
            const std::lock_guard lock(mutex_);
            calls_.push_back(std::move(name));
        }
        called_.notify_all();
        queue_.async(std::move(task));
    }
    void work(std::string name, Reply reply) {
        enqueue(std::move(name), [this, reply = std::move(reply)] {
            std::unique_lock lock(mutex_);
            const auto error = error_;
            const auto working = working_;
            lock.unlock();
            if (working) working();
            reply(error);
        });
    }

    mutable std::mutex mutex_;
    std::condition_variable called_;
    OptionalError error_;
    KSEventArray events_;
    KSEventBundleArray bundles_;
    std::vector<std::string> problems_;
    std::vector<std::string> calls_;
    KSEventFetchOptions eventOptions_;
    KSEventBundleFetchOptions bundleOptions_;
    Task working_;
    Analysis analysis_;
    Semaphore gate_;
    WorkQueue queue_{"fake conduit"};
};

}  // namespace keepsakes
