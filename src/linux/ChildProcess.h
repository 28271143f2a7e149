// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <sys/types.h>

#include <chrono>
#include <expected>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

#include "core/KSError.h"

namespace keepsakes {

/// How a child process ended.
struct ChildEnd {
    bool exited = false;  ///< By itself, with `status`; otherwise by `signal`.
    int status = 0;
    int signal = 0;
    /// It did not even end when killed (it hangs in the kernel) and was left to itself.
    bool abandoned = false;
};

/// A child process whose standard output is read line by line. It has no standard input, this
/// process' standard error, no other descriptor, and a process group of its own. One thread starts
/// it and supervises it with `run`; any thread may call `end`.
class ChildProcess {
  public:
    /// Longer lines of output are dropped.
    static constexpr std::size_t kLongestLine = std::size_t{64} * 1024;
    /// After `end(SIGTERM)` the child has so many milliseconds before it is killed.
    static constexpr int kGraceMilliseconds = 5000;

    static std::expected<std::shared_ptr<ChildProcess>, KSError> start(
        const std::vector<std::string>& arguments);
    /// Takes leave of a child that was abandoned and ended since.
    ~ChildProcess();
    ChildProcess(const ChildProcess&) = delete;
    ChildProcess& operator=(const ChildProcess&) = delete;

    /// Hands every line of output to `line`, on the calling thread, until the child has ended.
    ChildEnd run(const std::function<void(std::string_view)>& line);

    /// Sends the signal to the child and what it started; SIGTERM is followed by SIGKILL.
    void end(int signal);

  private:
    ChildProcess(pid_t pid, int output, int wake);

    bool readOutput(const std::function<void(std::string_view)>& line);
    bool reap(ChildEnd& end);
    /// Sends what was asked for; how long to wait for the child's end then, -1 for ever.
    int deliverSignal();

    const pid_t pid_;
    const int output_;
    const int wake_;
    const int pidDescriptor_;

    // Only on the supervising thread.
    std::string partial_;
    bool isDropping_ = false;
    int sent_ = 0;
    std::chrono::steady_clock::time_point sentAt_;

    std::mutex mutex_;
    int wanted_ = 0;       ///< The signal to be sent.
    bool reaped_ = false;  ///< The pid may be another process' from now on.
};

}  // namespace keepsakes
