// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "core/Clock.h"
#include "core/WorkQueue.h"

namespace keepsakes {

/// Hands memory that work has freed back to the system, once the daemon has been at rest for some
/// seconds: the allocator would keep it for work that may come hours later. Any thread may call
/// `soon`. `clock` outlives it.
class MemoryRelease {
  public:
    explicit MemoryRelease(Clock& clock) : clock_(clock) {}
    ~MemoryRelease();
    MemoryRelease(const MemoryRelease&) = delete;
    MemoryRelease& operator=(const MemoryRelease&) = delete;

    /// Some seconds from now; a later call puts it off.
    void soon();

  private:
    Clock& clock_;
    Timer timer_;  // only on queue_
    WorkQueue queue_{"MemoryRelease"};
};

}  // namespace keepsakes
