// SPDX-License-Identifier: Apache-2.0
#include "support/VirtualClock.h"

#include <algorithm>

namespace keepsakes {

VirtualClock::VirtualClock(KSDate start) : state_(std::make_shared<State>()) {
    state_->now = start;
}

KSDate VirtualClock::now() const {
    const std::lock_guard lock(state_->mutex);
    return state_->now;
}

void VirtualClock::advance(double seconds) {
    WorkerThreads::shared().settle();
    std::unique_lock lock(state_->mutex);
    const double until = state_->uptime + seconds;
    while (!state_->pending.empty() && state_->pending.begin()->first.first <= until) {
        const auto first = state_->pending.begin();
        const double due = std::max(first->first.first, state_->uptime);
        state_->now = state_->now + (due - state_->uptime);
        state_->uptime = due;
        const auto fire = std::move(first->second);
        state_->pending.erase(first);
        lock.unlock();
        fire();
        WorkerThreads::shared().settle();
        lock.lock();
    }
    state_->now = state_->now + (until - state_->uptime);
    state_->uptime = until;
}

void VirtualClock::step(double seconds) {
    const std::lock_guard lock(state_->mutex);
    state_->now = state_->now + seconds;
}

std::size_t VirtualClock::pendingCount() const {
    const std::lock_guard lock(state_->mutex);
    return state_->pending.size();
}

std::function<void()> VirtualClock::schedule(double delaySeconds, std::function<void()> fire) {
    const std::lock_guard lock(state_->mutex);
    const std::pair key{state_->uptime + std::max(delaySeconds, 0.0), state_->nextNumber++};
    state_->pending.emplace(key, std::move(fire));
    return [weak = std::weak_ptr(state_), key] {
        if (const auto state = weak.lock()) {
            const std::lock_guard held(state->mutex);
            state->pending.erase(key);
        }
    };
}

}  // namespace keepsakes
