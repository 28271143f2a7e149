// SPDX-License-Identifier: Apache-2.0
#include "core/Clock.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <sys/timerfd.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <ctime>
#include <map>
#include <mutex>
#include <system_error>
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
    return scheduleOn(queue, Counting::awake, delaySeconds, std::move(task));
}

Timer Clock::afterElapsed(const WorkQueue& queue, double delaySeconds, Task task) {
    return scheduleOn(queue, Counting::elapsed, delaySeconds, std::move(task));
}

Timer Clock::scheduleOn(const WorkQueue& queue, Counting counting, double delaySeconds, Task task) {
    const auto cancelled = std::make_shared<std::atomic<bool>>(false);
    auto drop = schedule(counting, delaySeconds,
                         [append = queue.detachedAppender(), cancelled,
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
    const auto drop = schedule(Counting::awake, seconds,
                               [state = semaphore.state_, waiter] { state->expire(waiter); });
    const bool signalled = semaphore.await(waiter);
    drop();
    return signalled;
}

namespace {

constexpr std::int64_t kNanoseconds = 1'000'000'000;

std::int64_t nanosecondsOn(clockid_t clock) {
    timespec time{};
    ::clock_gettime(clock, &time);
    return time.tv_sec * kNanoseconds + time.tv_nsec;
}

timespec timespecOf(std::int64_t nanoseconds) {
    return {.tv_sec = nanoseconds / kNanoseconds, .tv_nsec = nanoseconds % kNanoseconds};
}

/// Throws std::system_error for a descriptor that could not be made.
int made(int descriptor, const char* what) {
    if (descriptor < 0) throw std::system_error(errno, std::generic_category(), what);
    return descriptor;
}

}  // namespace

struct SystemClock::State {
    using Key = std::pair<std::int64_t, std::uint64_t>;  // nanoseconds, running number
    using Pending = std::map<Key, std::function<void()>>;

    // A poll's own limit stands still while the device sleeps; this timer does not.
    const int elapsedTimer = made(::timerfd_create(CLOCK_BOOTTIME, TFD_CLOEXEC | TFD_NONBLOCK),
                                  "a timer that counts sleep");
    const int changed = made(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK), "the clock's event");

    std::mutex mutex;
    Pending awake;    // by CLOCK_MONOTONIC
    Pending elapsed;  // by CLOCK_BOOTTIME
    std::uint64_t nextNumber = 0;
    bool ended = false;
    bool started = false;
    std::thread thread;

    State() = default;
    State(const State&) = delete;
    State& operator=(const State&) = delete;
    ~State() {
        ::close(elapsedTimer);
        ::close(changed);
    }

    Pending& pendingOf(Counting counting) { return counting == Counting::awake ? awake : elapsed; }

    void wake() const {
        const std::uint64_t one = 1;
        if (::write(changed, &one, sizeof one) < 0) return;  // full means that it wakes already
    }

    void threadMain() {
        std::unique_lock lock(mutex);
        while (!ended) {
            if (auto fire = takeDue(awake, CLOCK_MONOTONIC)) {
                run(lock, std::move(fire));
            } else if (auto late = takeDue(elapsed, CLOCK_BOOTTIME)) {
                run(lock, std::move(late));
            } else {
                waitForMore(lock);
            }
        }
    }

    static std::function<void()> takeDue(Pending& pending, clockid_t clock) {
        if (pending.empty() || pending.begin()->first.first > nanosecondsOn(clock)) return nullptr;
        auto fire = std::move(pending.begin()->second);
        pending.erase(pending.begin());
        return fire;
    }

    static void run(std::unique_lock<std::mutex>& lock, std::function<void()> fire) {
        lock.unlock();
        fire();
        fire = nullptr;
        lock.lock();
    }

    void waitForMore(std::unique_lock<std::mutex>& lock) {
        itimerspec until{};  // all zero: off
        if (!elapsed.empty()) until.it_value = timespecOf(elapsed.begin()->first.first);
        ::timerfd_settime(elapsedTimer, TFD_TIMER_ABSTIME, &until, nullptr);
        timespec limit{};
        if (!awake.empty()) {
            limit = timespecOf(std::max<std::int64_t>(
                0, awake.begin()->first.first - nanosecondsOn(CLOCK_MONOTONIC)));
        }
        std::array<pollfd, 2> sources = {{{elapsedTimer, POLLIN, 0}, {changed, POLLIN, 0}}};
        const timespec* const limitIfAny = awake.empty() ? nullptr : &limit;
        lock.unlock();
        ::ppoll(sources.data(), sources.size(), limitIfAny, nullptr);
        std::uint64_t count = 0;
        for (const auto& source : sources) {
            if (::read(source.fd, &count, sizeof count) < 0) continue;  // not the one that woke it
        }
        lock.lock();
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
    }
    state_->wake();
    if (state_->thread.joinable()) state_->thread.join();
}

KSDate SystemClock::now() const { return systemNow() + shift_; }

double SystemClock::elapsed() const {
    return static_cast<double>(nanosecondsOn(CLOCK_BOOTTIME)) / static_cast<double>(kNanoseconds);
}

std::function<void()> SystemClock::schedule(Counting counting, double delaySeconds,
                                            std::function<void()> fire) {
    // A century is "never", and keeps the sum inside the clock's range.
    const double delay = std::clamp(delaySeconds, 0.0, 3.2e9);
    const auto clock = counting == Counting::awake ? CLOCK_MONOTONIC : CLOCK_BOOTTIME;
    const auto due = nanosecondsOn(clock) + static_cast<std::int64_t>(delay * kNanoseconds);
    const std::lock_guard lock(state_->mutex);
    if (!state_->started) {
        state_->started = true;
        state_->thread = std::thread([state = state_.get()] { state->threadMain(); });
    }
    auto& pending = state_->pendingOf(counting);
    const State::Key key{due, state_->nextNumber++};
    pending.emplace(key, std::move(fire));
    if (pending.begin()->first == key) state_->wake();
    return [weak = std::weak_ptr(state_), counting, key] {
        if (const auto state = weak.lock()) {
            const std::lock_guard held(state->mutex);
            state->pendingOf(counting).erase(key);
        }
    };
}

}  // namespace keepsakes
