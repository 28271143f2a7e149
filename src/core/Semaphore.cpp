// SPDX-License-Identifier: Apache-2.0
#include "core/Semaphore.h"

#include "core/SemaphoreState.h"
#include "core/WorkQueue.h"

namespace keepsakes {

Semaphore::Semaphore() : state_(std::make_shared<State>()) {}

void Semaphore::State::wake(Waiter& waiter, bool signalled) {
    waiter.woken = true;
    waiter.signalled = signalled;
    // On the waiter's behalf and at once, so that nobody takes the process to be at rest before
    // the waiter has had its turn.
    if (waiter.isWorker) WorkerThreads::endWaiting();
    changed.notify_all();
}

void Semaphore::State::expire(const std::shared_ptr<Waiter>& waiter) {
    const std::lock_guard lock(mutex);
    if (std::erase(waiters, waiter) != 0) wake(*waiter, false);
}

void Semaphore::signal() {
    const std::lock_guard lock(state_->mutex);
    if (state_->waiters.empty()) {
        ++state_->count;
        return;
    }
    const auto first = state_->waiters.front();
    state_->waiters.pop_front();
    state_->wake(*first, true);
}

void Semaphore::wait() {
    if (const auto waiter = enlist()) await(waiter);
}

std::shared_ptr<Semaphore::Waiter> Semaphore::enlist() {
    const std::lock_guard lock(state_->mutex);
    if (state_->count > 0) {
        --state_->count;
        return nullptr;
    }
    auto waiter = std::make_shared<Waiter>();
    state_->waiters.push_back(waiter);
    return waiter;
}

bool Semaphore::await(const std::shared_ptr<Waiter>& waiter) {
    std::unique_lock lock(state_->mutex);
    if (!waiter->woken) {
        waiter->isWorker = WorkerThreads::beginWaiting();
        state_->changed.wait(lock, [&waiter] { return waiter->woken; });
    }
    return waiter->signalled;
}

}  // namespace keepsakes
