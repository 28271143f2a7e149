// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <condition_variable>
#include <deque>
#include <memory>
#include <mutex>

#include "core/Semaphore.h"

namespace keepsakes {

/// The insides of a semaphore, shared with the clock, which ends a timed wait. Private to core.
struct Semaphore::Waiter {
    bool isWorker = false;
    bool woken = false;
    bool signalled = false;
};

struct Semaphore::State {
    std::mutex mutex;
    std::condition_variable changed;
    int count = 0;
    std::deque<std::shared_ptr<Waiter>> waiters;

    void wake(Waiter& waiter, bool signalled);
    void expire(const std::shared_ptr<Waiter>& waiter);
};

}  // namespace keepsakes
