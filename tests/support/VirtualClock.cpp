// SPDX-License-Identifier: Apache-2.0
#include "support/VirtualClock.h"

#include <algorithm>
#include <limits>

namespace keepsakes {

VirtualClock::VirtualClock(KSDate start) : state_(std::make_shared<State>()) {
    state_->now = start;
}

KSDate VirtualClock::now() const {
    const std::lock_guard lock(state_->mutex);
    return state_->now;
}

double VirtualClock::elapsed() const {
    const std::lock_guard lock(state_->mutex);
    return state_->uptime + state_->asleep;
}

/// The earliest of what is due by the uptime `until`, with time moved on to it; null when there is
/// none.
std::function<void()> VirtualClock::State::takeNext(double until) {
    const auto dueOf = [](const Pending& pending, double offset) {
        return pending.empty() ? std::numeric_limits<double>::infinity()
                               : pending.begin()->first.first - offset;
    };
    const double dueAwake = dueOf(awake, 0);
    const double dueElapsed = dueOf(elapsed, asleep);
    if (std::min(dueAwake, dueElapsed) > until) return nullptr;
    auto& pending = dueAwake <= dueElapsed ? awake : elapsed;
    const double due = std::max(std::min(dueAwake, dueElapsed), uptime);
    now = now + (due - uptime);
    uptime = due;
    auto fire = std::move(pending.begin()->second);
    pending.erase(pending.begin());
    return fire;
}

void VirtualClock::advance(double seconds) {
    WorkerThreads::shared().settle();
    std::unique_lock lock(state_->mutex);
    const double until = state_->uptime + seconds;
    while (const auto fire = state_->takeNext(until)) {
        lock.unlock();
        fire();
        WorkerThreads::shared().settle();
        lock.lock();
    }
    state_->now = state_->now + (until - state_->uptime);
    state_->uptime = until;
}

void VirtualClock::suspend(double seconds) {
    WorkerThreads::shared().settle();
    {
        const std::lock_guard lock(state_->mutex);
        state_->now = state_->now + seconds;
        state_->asleep += seconds;
    }
    advance(0);
}

void VirtualClock::step(double seconds) {
    const std::lock_guard lock(state_->mutex);
    state_->now = state_->now + seconds;
}

std::size_t VirtualClock::pendingCount() const {
    const std::lock_guard lock(state_->mutex);
    return state_->awake.size() + state_->elapsed.size();
}

std::function<void()> VirtualClock::schedule(Counting counting, double delaySeconds,
                                             std::function<void()> fire) {
    const std::lock_guard lock(state_->mutex);
    const double now = state_->uptime + (counting == Counting::elapsed ? state_->asleep : 0);
    const std::pair key{now + std::max(delaySeconds, 0.0), state_->nextNumber++};
    state_->pendingOf(counting).emplace(key, std::move(fire));
    return [weak = std::weak_ptr(state_), counting, key] {
        if (const auto state = weak.lock()) {
            const std::lock_guard held(state->mutex);
            state->pendingOf(counting).erase(key);
        }
    };
}

}  // namespace keepsakes
