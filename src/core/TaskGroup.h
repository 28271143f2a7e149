// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <mutex>
#include <utility>

#include "core/WorkQueue.h"

namespace keepsakes {

/// Joins work that ends on several threads: the one who starts it calls `enter` before each piece
/// and `notify` behind the last, each piece calls `leave` once. Shared by all of them.
class TaskGroup final : public std::enable_shared_from_this<TaskGroup> {
  public:
    static std::shared_ptr<TaskGroup> create() {
        return std::shared_ptr<TaskGroup>(new TaskGroup());
    }

    void enter() {
        const std::lock_guard lock(mutex_);
        ++open_;
    }

    void leave() { finish(); }

    /// Runs `task` on `queue` once every piece has left. Called once.
    void notify(const WorkQueue& queue, Task task) {
        {
            const std::lock_guard lock(mutex_);
            atEnd_ = [append = queue.detachedAppender(), work = std::move(task)] { append(work); };
        }
        finish();
    }

  private:
    TaskGroup() = default;

    void finish() {
        Task task;
        {
            const std::lock_guard lock(mutex_);
            if (--open_ == 0) task = std::exchange(atEnd_, nullptr);
        }
        if (task) task();
    }

    std::mutex mutex_;
    int open_ = 1;  // `notify` itself is the first piece
    Task atEnd_;
};

}  // namespace keepsakes
