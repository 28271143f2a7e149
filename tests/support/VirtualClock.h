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

    /// Moves time on by `seconds`, firing what is due on the way, then waits for the queues.
    void advance(double seconds);

    /// Steps the displayed time without any time passing, as an adjusted clock does.
    void step(double seconds);

    /// How many delayed calls and timed waits are pending.
    std::size_t pendingCount() const;

  protected:
    std::function<void()> schedule(double delaySeconds, std::function<void()> fire) override;

  private:
    struct State {
        std::mutex mutex;
        double uptime = 0;
        KSDate now;
        std::uint64_t nextNumber = 0;
        std::map<std::pair<double, std::uint64_t>, std::function<void()>> pending;
    };
    std::shared_ptr<State> state_;
};

}  // namespace keepsakes
