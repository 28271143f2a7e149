// SPDX-License-Identifier: Apache-2.0
// Clustering events whose times overlap, beside sorting their start dates.
#include <cmath>
#include <random>

#include "Bench.h"
#include "bundle/KSEventBundler.h"
#include "core/Log.h"
#include "support/TestEvents.h"

namespace {

using namespace keepsakes;

KSEventArray makeEvents(std::uint32_t count) {
    // In no order; one event in three overlaps a neighbour.
    std::mt19937 random(11);
    std::uniform_real_distribution<double> start(0, 3000.0 * count);
    KSEventArray events;
    for (std::uint32_t number = 0; number < count; ++number) {
        const double from = start(random);
        events.push_back(makeWorkout(number, from, from + 600, "Running"));
    }
    return events;
}

double clusterMilliseconds(const KSEventArray& events) {
    const auto bundler = KSEventBundler::initWithStartDate(KSDate{0}, KSDate{1}, KSDate{2});
    return bench::bestMilliseconds(3, [&] {
        auto copy = events;
        bundler->calculateEventBundlesFromEvents(copy);
    });
}

}  // namespace

int main() {
    setLogLevel(LogLevel::off);
    constexpr std::uint32_t kEvents = 100000;
    const auto events = makeEvents(kEvents);
    const double sort = bench::bestMilliseconds(3, [&] {
        std::vector<double> starts;
        for (const auto& event : events) starts.push_back(event->startDate().seconds);
        std::ranges::sort(starts);
    });
    const double cluster = clusterMilliseconds(events);
    bench::report("cluster 100,000 events / sorting their start dates", cluster, sort, 10);

    // Ten times the events cost ten times n log n, not a hundred times.
    const double ten = clusterMilliseconds(makeEvents(kEvents * 10));
    const double growth = 10 * std::log(10.0 * kEvents) / std::log(1.0 * kEvents);
    bench::report("cluster 1,000,000 events / 100,000, grown as n log n", ten, cluster * growth, 3);
}
