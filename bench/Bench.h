// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <fmt/format.h>
#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <string_view>
#include <vector>

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

/// Milliseconds of reading a file and doing nothing with its bytes, once they are cached.
inline double readingMilliseconds(int runs, int fd) {
    constexpr std::size_t kBlockSize = std::size_t{64} * 1024;
    std::vector<char> block(kBlockSize);
    const auto readBytes = [fd, &block] {
        off_t offset = 0;
        ssize_t count = 0;
        while ((count = ::pread(fd, block.data(), block.size(), offset)) > 0) offset += count;
    };
    bestMilliseconds(1, readBytes);
    return bestMilliseconds(runs, readBytes);
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

/// The same of a figure that is held to nothing.
inline void note(std::string_view name, double figure, double limitFigure) {
    fmt::print("{}|{:.1f} ms|{:.1f} ms|{:.2f}|-\n", name, figure, limitFigure,
               figure / limitFigure);
}
inline void note(std::string_view name, double figure) {
    fmt::print("{}|{:.1f} ms|-|-|-\n", name, figure);
}

/// The same of memory: by how much its peak has grown since it was `before`.
inline void reportGrowth(std::string_view name, long before, long mostGrowthKiB) {
    const long growth = peakKiB() - before;
    fmt::print("{}|{} KiB|{} KiB|{:.2f}|1\n", name, growth, mostGrowthKiB,
               static_cast<double>(growth) / static_cast<double>(mostGrowthKiB));
}

}  // namespace keepsakes::bench
