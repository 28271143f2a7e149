// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <fmt/format.h>
#include <sys/resource.h>

#include <algorithm>
#include <chrono>
#include <string_view>

namespace keepsakes::bench {

/// Milliseconds that the work takes: the best of `runs`, since others share the machine.
template <class Work>
double bestMilliseconds(int runs, const Work& work) {
    double best = 1e300;
    for (int run = 0; run < runs; ++run) {
        const auto begin = std::chrono::steady_clock::now();
        work();
        const std::chrono::duration<double, std::milli> took =
            std::chrono::steady_clock::now() - begin;
        best = std::min(best, took.count());
    }
    return best;
}

/// The most memory that was resident so far.
inline long peakKiB() {
    rusage usage{};
    ::getrusage(RUSAGE_SELF, &usage);
    return usage.ru_maxrss;
}

/// The one line of a benchmark, as scripts/bench.sh reads it.
inline void report(std::string_view name, double figure, double limitFigure, double allowed) {
    fmt::print("{}|{:.1f} ms|{:.1f} ms|{:.2f}|{}\n", name, figure, limitFigure,
               figure / limitFigure, allowed);
}

}  // namespace keepsakes::bench
