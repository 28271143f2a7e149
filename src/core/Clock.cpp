// SPDX-License-Identifier: Apache-2.0
#include "core/Clock.h"

#include <algorithm>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <map>
#include <mutex>
#include <thread>
#include <utility>

#include "core/SemaphoreState.h"

namespace keepsakes {

Timer::Timer(std::function<void()> cancel) : cancel_(std::move(cancel)) {}
Timer::Timer(Timer&& other) noexcept : cancel_(std::exchange(other.cancel_, nullptr)) {}
Timer& Timer::operator=(Timer&& other) noexcept {
    if (this != &other) {
        cancel();
        cancel_ = std::exchange(other.cancel_, nullptr);
    }
    return *this;
}
Timer::~Timer() { cancel(); }

void Timer::cancel() {
    if (const auto call = std::exchange(cancel_, nullptr)) call();
}

Timer Clock::after(const WorkQueue& queue, double delaySeconds, Task task) {
    const auto cancelled = std::make_shared<std::atomic<bool>>(false);
    auto drop = schedule(delaySeconds, [append = queue.detachedAppender(), cancelled,
                                        work = std::make_shared<Task>(std::move(task))] {
        append([cancelled, work] {
            if (!*cancelled) (*work)();
        });
    });
    return Timer([cancelled, drop = std::move(drop)] {
        *cancelled = true;
        drop();
    });
}

bool Clock::wait(Semaphore& semaphore, double seconds) {
    const auto waiter = semaphore.enlist();
    if (!waiter) return true;
    const auto drop =
        schedule(seconds, [state = semaphore.state_, waiter] { state->expire(waiter); });
    const bool signalled = semaphore.await(waiter);
    drop();
    return signalled;
}

struct SystemClock::State {
    using Steady = std::chrono::steady_clock;
    using Key = std::pair<Steady::time_point, std::uint64_t>;

    std::mutex mutex;
    std::condition_variable changed;
    std::map<Key, std::function<void()>> pending;
    std::uint64_t nextNumber = 0;
    bool ended = false;
    bool started = false;
    std::thread thread;

    void threadMain() {
        std::unique_lock lock(mutex);
        while (!ended) {
            if (pending.empty()) {
                changed.wait(lock);
                continue;
            }
            const auto first = pending.begin();
            const auto due = first->first.first;
            if (Steady::now() < due) {
                changed.wait_until(lock, due);
                continue;
            }
            auto fire = std::move(first->second);
            pending.erase(first);
            lock.unlock();
            fire();
            fire = nullptr;
            lock.lock();
        }
    }
};

namespace {

KSDate systemNow() {
    const auto sinceEpoch = std::chrono::system_clock::now().time_since_epoch();
    return KSDate::fromUnix(std::chrono::duration<double>(sinceEpoch).count());
}

}  // namespace

SystemClock::SystemClock() : state_(std::make_shared<State>()) {}

SystemClock::SystemClock(KSDate startingAt) : SystemClock() { shift_ = startingAt - systemNow(); }

SystemClock::~SystemClock() {
    {
        const std::lock_guard lock(state_->mutex);
        state_->ended = true;
        state_->changed.notify_all();
    }
    if (state_->thread.joinable()) state_->thread.join();
}

KSDate SystemClock::now() const { return systemNow() + shift_; }

std::function<void()> SystemClock::schedule(double delaySeconds, std::function<void()> fire) {
    // A century is "never", and keeps the sum inside the clock's range.
    const double delay = std::clamp(delaySeconds, 0.0, 3.2e9);
    const auto due = State::Steady::now() + std::chrono::duration_cast<State::Steady::duration>(
                                                std::chrono::duration<double>(delay));
    const std::lock_guard lock(state_->mutex);
    if (!state_->started) {
        state_->started = true;
        state_->thread = std::thread([state = state_.get()] { state->threadMain(); });
    }
    const State::Key key{due, state_->nextNumber++};
    state_->pending.emplace(key, std::move(fire));
    if (state_->pending.begin()->first == key) state_->changed.notify_all();
    return [weak = std::weak_ptr(state_), key] {
        if (const auto state = weak.lock()) {
            const std::lock_guard held(state->mutex);
            state->pending.erase(key);
        }
    };
}

}  // namespace keepsakes
