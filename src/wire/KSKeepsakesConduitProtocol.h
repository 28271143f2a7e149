// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "core/KSError.h"
#include "model/KSConduitContext.h"
#include "model/KSEvent.h"
#include "model/KSEventBundle.h"
#include "model/KSEventBundleFetchOptions.h"
#include "model/KSEventFetchOptions.h"

namespace keepsakes {

/// The ten operations that other processes may ask for. Implemented by the daemon's client object
/// and, for the calling side, by whatever carries the calls. Each operation returns at once and
/// calls its reply once, on any thread; a missing reply is allowed.
class KSKeepsakesConduitProtocol {
  public:
    using Reply = std::function<void(OptionalError)>;
    using EventsReply = std::function<void(KSEventArray, OptionalError)>;
    using BundlesReply = std::function<void(KSEventBundleArray, OptionalError)>;
    using DictionaryReply = std::function<void(KSDictionary, OptionalError)>;

    virtual ~KSKeepsakesConduitProtocol() = default;

    virtual void storeEvents(KSEventArray events, KSConduitContext context, Reply reply) = 0;
    virtual void fetchEventsWithOptions(KSEventFetchOptions options, KSConduitContext context,
                                        EventsReply reply) = 0;
    virtual void fetchEventBundlesWithOptions(KSEventBundleFetchOptions options,
                                              KSConduitContext context, BundlesReply reply) = 0;
    virtual void clearEvents(KSConduitContext context, Reply reply) = 0;
    virtual void collectEvents(KSConduitContext context, Reply reply) = 0;
    virtual void bundleEvents(KSConduitContext context, Reply reply) = 0;
    virtual void purgeEvents(KSConduitContext context, Reply reply) = 0;
    virtual void runAnalytics(KSConduitContext context, Reply reply) = 0;
    virtual void analyzeTrendsInEvents(KSEventArray events, KSConduitContext context,
                                       EventsReply reply) = 0;
    virtual void fetchPhotoAnalyticsMetrics(KSConduitContext context, DictionaryReply reply) = 0;
};

/// What the daemon tells of itself. A plain value.
struct DaemonStatus {
    std::string version;
    bool databaseAvailable = false;
    double lastCollection = 0;  ///< Seconds since 2001-01-01 UTC; 0 when never.
    bool collectEnabled = false;
    bool computeEnabled = false;
    bool purgeEnabled = false;
    std::uint64_t eventCount = 0;
    std::uint64_t bundleCount = 0;
    std::uint64_t filesIndexed = 0;
    std::uint64_t filesRefused = 0;
    std::vector<std::string> problems;  ///< Newest first, at most 50.
};

/// Answers for the daemon's state. Returns at once and calls `reply` once, on any thread.
class StatusSource {
  public:
    virtual ~StatusSource() = default;
    virtual void status(std::function<void(DaemonStatus)> reply) = 0;
};

}  // namespace keepsakes
