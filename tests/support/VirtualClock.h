// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <utility>

#include "core/Clock.h"

namespace keepsakes {

/// A clock that stands still until a test moves it. `advance` fires what is due in order, letting
/// the queues come to rest after each, so that a run is the same every time.
class VirtualClock final : public Clock {
  public:
    explicit VirtualClock(KSDate start = {700000000});

    KSDate now() const override;
    double elapsed() const override;

    /// Moves time on by `seconds`, firing what is due on the way, then waits for the queues.
    void advance(double seconds);

    /// Steps the displayed time without any time passing, as an adjusted clock does.
    void step(double seconds);

    /// The device sleeps for `seconds` and wakes: what counts time asleep fires if it came due.
    void suspend(double seconds);

    /// How many delayed calls and timed waits are pending.
    std::size_t pendingCount() const;

  protected:
    std::function<void()> schedule(Counting counting, double delaySeconds,
                                   std::function<void()> fire) override;

  private:
    using Pending = std::map<std::pair<double, std::uint64_t>, std::function<void()>>;
    struct State {
        std::mutex mutex;
        double uptime = 0;  // time awake
        double asleep = 0;
        KSDate now;
        std::uint64_t nextNumber = 0;
        Pending awake;    // by uptime
        Pending elapsed;  // by uptime and time asleep together

        Pending& pendingOf(Counting counting) {
            return counting == Counting::awake ? awake : elapsed;
        }
        std::function<void()> takeNext(double until);
    };
    std::shared_ptr<State> state_;
};

}  // namespace keepsakes
