// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <string>
#include <string_view>

#include "core/Clock.h"
#include "core/WorkQueue.h"

namespace keepsakes {

struct PlatformServices;

/// Guards one request or activity: a timer that, each time it fires, reports a warning to the
/// analytics service, and after 18 warnings in a row a fatal event, with which the daemon ends
/// (status 255). Owned by the request. All its work runs on its own queue "KSWatchDog:<name>";
/// `pet` and `cancel` may be called from any thread and return at once; its end waits for the
/// queue.
///
/// A pet clears the timer rather than arming it anew: `_pet` queues a cancel before it arms. That
/// order is deliberate; the timer runs only where it is armed without a cancel behind it.
class KSWatchDog final {
  public:
    using WarningHandler = std::function<void(std::int32_t warningCount)>;

    static constexpr float kDefaultCadenceSeconds = 10;
    static constexpr std::int32_t kMostWarnings = 18;

    KSWatchDog(std::string_view name, const PlatformServices& platform,
               WarningHandler handler = nullptr);
    ~KSWatchDog();
    KSWatchDog(const KSWatchDog&) = delete;
    KSWatchDog& operator=(const KSWatchDog&) = delete;

    /// Stores the period and pets; a period that is not above 0 changes nothing.
    void setCadenceSeconds(float seconds);
    float getCadenceSeconds() const { return cadenceSeconds_; }

    void pet();
    void cancel();

    /// On the queue: starts the timer, first and then every cadence.
    void _arm();

    const WorkQueue& queue() const { return queue_; }

  private:
    void _pet();
    void _cancel();
    void fire();
    void report(bool fatal);

    const std::string name_;
    const PlatformServices& platform_;
    const WarningHandler handler_;
    std::atomic<float> cadenceSeconds_ = kDefaultCadenceSeconds;
    // Only on the queue.
    std::int32_t failureCount_ = 0;
    Timer timer_;
    WorkQueue queue_;
};

}  // namespace keepsakes
