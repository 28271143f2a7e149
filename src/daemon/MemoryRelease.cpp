// SPDX-License-Identifier: Apache-2.0
#include "daemon/MemoryRelease.h"

#include <malloc.h>

namespace keepsakes {

namespace {

/// Long enough for a reply to leave for its reader.
constexpr double kRestSeconds = 5;

}  // namespace

MemoryRelease::~MemoryRelease() {
    queue_.sync([this] { timer_.cancel(); });
}

void MemoryRelease::soon() {
    queue_.async([this] { timer_ = clock_.after(queue_, kRestSeconds, [] { ::malloc_trim(0); }); });
}

}  // namespace keepsakes
