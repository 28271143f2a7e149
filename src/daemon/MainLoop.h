// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>
#include <functional>
#include <utility>
#include <vector>

namespace keepsakes {

/// Where the main thread waits while the queues work: until SIGTERM or SIGINT comes, or `stop` is
/// called. SIGUSR1 asks for a report. Made before any other thread, whose signals it keeps for
/// itself.
class MainLoop {
  public:
    /// Throws std::system_error.
    MainLoop();
    ~MainLoop();
    MainLoop(const MainLoop&) = delete;
    MainLoop& operator=(const MainLoop&) = delete;

    /// Before `run`, which calls the handlers: one for each SIGUSR1, and one whenever a descriptor
    /// is readable, which the handler changes. A negative descriptor is never readable.
    void setReportHandler(std::function<void()> handler) { report_ = std::move(handler); }
    void watch(int descriptor, std::function<void()> handler);

    /// Returns the status to exit with: 0 for a signal, or what `stop` was given.
    int run();

    /// Ends `run`. Any thread; the first status stands.
    void stop(int status);

  private:
    void takeSignal();

    std::function<void()> report_ = [] {};
    std::vector<std::pair<int, std::function<void()>>> watches_;
    int signals_ = -1;
    int wake_ = -1;
    std::atomic<int> status_ = -1;
};

}  // namespace keepsakes
