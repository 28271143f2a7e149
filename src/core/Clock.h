// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <memory>

#include "core/KSDate.h"
#include "core/Semaphore.h"
#include "core/WorkQueue.h"

namespace keepsakes {

/// Keeps delayed work pending while it lives; destroying or cancelling it drops what has not begun.
/// On the queue that the work belongs to, cancelling is final: it never runs afterwards.
class Timer {
  public:
    Timer() = default;
    explicit Timer(std::function<void()> cancel);
    Timer(Timer&&) noexcept;
    Timer& operator=(Timer&&) noexcept;
    ~Timer();
    void cancel();

  private:
    std::function<void()> cancel_;
};

/// The one source of time: "now", delayed work and timed waits. Outlives every service.
/// Any thread may call it. Tests put a virtual clock in its place.
class Clock {
  public:
    virtual ~Clock() = default;

    virtual KSDate now() const = 0;

    /// Seconds since an instant that stays the same while the process lives. Goes on while the
    /// device sleeps, and is not moved when the displayed time is set.
    virtual double elapsed() const = 0;

    /// Runs `task` on `queue` once, `delaySeconds` from now. Time asleep does not count: a deadline
    /// does not pass because the lid was closed.
    [[nodiscard]] Timer after(const WorkQueue& queue, double delaySeconds, Task task);

    /// As `after`, with time asleep counted as `elapsed` does: what came due meanwhile runs when
    /// the device wakes. It does not wake the device.
    [[nodiscard]] Timer afterElapsed(const WorkQueue& queue, double delaySeconds, Task task);

    /// Waits for a signal, at most `seconds`; whether it came.
    bool wait(Semaphore& semaphore, double seconds);

  protected:
    enum class Counting { awake, elapsed };

    /// Calls `fire` once, on the clock's own thread, `delaySeconds` from now; `fire` is brief. The
    /// answer drops it when called before that.
    virtual std::function<void()> schedule(Counting counting, double delaySeconds,
                                           std::function<void()> fire) = 0;

  private:
    Timer scheduleOn(const WorkQueue& queue, Counting counting, double delaySeconds, Task task);
};

/// The system's clock, optionally shifted so that it starts at a given instant and runs on from
/// there. Delays are counted on CLOCK_MONOTONIC, or with the time asleep on CLOCK_BOOTTIME; its
/// thread wakes only when one is due. The constructors throw std::system_error.
class SystemClock final : public Clock {
  public:
    SystemClock();
    explicit SystemClock(KSDate startingAt);
    ~SystemClock() override;

    KSDate now() const override;
    double elapsed() const override;

  protected:
    std::function<void()> schedule(Counting counting, double delaySeconds,
                                   std::function<void()> fire) override;

  private:
    struct State;
    double shift_ = 0;
    std::shared_ptr<State> state_;
};

}  // namespace keepsakes
