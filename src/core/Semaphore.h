// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>

namespace keepsakes {

/// What another thread signals when its part is done. Timed waits go through `Clock::wait`.
/// A copy is the same semaphore. Any thread may call it.
class Semaphore {
  public:
    Semaphore();

    void signal();

    /// Waits, without a limit, for a signal.
    void wait();

  private:
    friend class Clock;
    struct Waiter;
    struct State;

    std::shared_ptr<Waiter> enlist();
    bool await(const std::shared_ptr<Waiter>& waiter);

    std::shared_ptr<State> state_;
};

}  // namespace keepsakes
