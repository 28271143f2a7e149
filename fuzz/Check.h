// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdio>
#include <cstdlib>

#include "readers/FileReaders.h"
#include "readers/ReaderLimits.h"

namespace keepsakes {

inline constexpr ReaderContext kFuzzNow{KSDate{745000000}};

/// Ends the run, keeping the input, when a property does not hold.
inline void check(bool holds, const char* property) {
    if (holds) return;
    std::fprintf(stderr, "property broken: %s\n", property);
    std::abort();
}

}  // namespace keepsakes
