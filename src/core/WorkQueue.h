// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace keepsakes {

using Task = std::function<void()>;

/// The threads that queues borrow while they have work. One is started whenever none is free, so a
/// queue that blocks never starves another; a thread with nothing to do ends after half a minute.
/// One for the process; any thread may call it.
class WorkerThreads {
  public:
    static WorkerThreads& shared();

    /// Runs `task` on a thread of its own for as long as it takes.
    void run(Task task);

    /// Returns when every borrowed thread is done or waits (see `beginWaiting`). For tests that
    /// drive a virtual clock: nothing more happens then until time passes or somebody asks.
    void settle();

    /// Says that the calling thread waits for another one from now on; whether it is one of these
    /// threads. If so, whoever wakes it calls `endWaiting` at that moment.
    static bool beginWaiting();
    static void endWaiting();

    WorkerThreads(const WorkerThreads&) = delete;
    WorkerThreads& operator=(const WorkerThreads&) = delete;

  private:
    struct State;
    WorkerThreads();
    ~WorkerThreads();

    std::unique_ptr<State> state_;
};

/// A serial queue: tasks run one at a time, first in, first out, and what one wrote the next one
/// sees. Any thread may call it. Its owner's destruction waits for the tasks in it, unless it
/// happens on the queue itself. An exception that leaves a task is logged as an error and goes no
/// further.
class WorkQueue {
  public:
    explicit WorkQueue(std::string label);
    ~WorkQueue();
    WorkQueue(const WorkQueue&) = delete;
    WorkQueue& operator=(const WorkQueue&) = delete;

    const std::string& label() const;

    /// Appends; never runs the task inside the call.
    void async(Task task);

    /// Appends, and returns when the task has run. Must not be called on the queue itself.
    void sync(const Task& task);

    /// Whether the calling thread is running one of this queue's tasks.
    bool isCurrent() const;

    /// An appender that outlives the queue: a task given to it after the queue's end is dropped.
    std::function<void(Task)> detachedAppender() const;

    /// What a queue is doing at the moment.
    struct Report {
        std::string label;
        bool isRunning = false;
        std::size_t waiting = 0;  ///< Tasks behind the one that runs.
    };
    /// Of every queue in the process, oldest first.
    static std::vector<Report> reports();

  private:
    struct State;
    std::shared_ptr<State> state_;
};

}  // namespace keepsakes
