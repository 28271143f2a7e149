// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>

namespace keepsakes {

/// Where the main thread waits while the queues work: until SIGTERM or SIGINT comes, or `stop` is
/// called. Made before any other thread, whose signals it keeps for itself.
class MainLoop {
  public:
    /// Throws std::system_error.
    MainLoop();
    ~MainLoop();
    MainLoop(const MainLoop&) = delete;
    MainLoop& operator=(const MainLoop&) = delete;

    /// Returns the status to exit with: 0 for a signal, or what `stop` was given.
    int run();

    /// Ends `run`. Any thread; the first status stands.
    void stop(int status);

  private:
    int signals_ = -1;
    int wake_ = -1;
    std::atomic<int> status_ = -1;
};

}  // namespace keepsakes
