// SPDX-License-Identifier: Apache-2.0
#include "metrics/KSEventData.h"

#include <cmath>
#include <map>
#include <string>
#include <string_view>
#include <vector>

#include "core/KSDate.h"
#include "metrics/MetricValues.h"

namespace keepsakes {

namespace {

constexpr const char* kNumber = "numberOfEvents";
constexpr const char* kFrom = "eventsFrom";
constexpr const char* kLatency = "latency";
constexpr const char* kDuration = "duration";
constexpr const char* kWindowStart = "windowStart";
constexpr const char* kWindowEnd = "windowEnd";

/// Values in seconds, by key.
using Samples = std::map<std::string, std::vector<double>>;

std::int64_t hoursBetween(KSDate earlier, KSDate later) {
    return std::llround((later - earlier) / kHour);
}

KSDictionary mediansOf(const Samples& samples, std::string_view stem,
                       const std::vector<double>& bins) {
    KSDictionary medians;
    for (const auto& key : metric::categoryKeys(stem)) {
        const auto found = samples.find(key);
        medians.emplace(
            key, found == samples.end() ? metric::kNoBin : metric::medianBin(found->second, bins));
    }
    return medians;
}

}  // namespace

KSMetric::Keys KSEventData::supportedMetricKeys() const {
    Keys keys = {kNumber, kWindowStart, kWindowEnd};
    keys.merge(metric::providerKeys(kFrom));
    keys.merge(metric::categoryKeys(kNumber));
    keys.merge(metric::categoryKeys(kLatency));
    keys.merge(metric::categoryKeys(kDuration));
    return keys;
}

OptionalError KSEventData::setEvents(const KSEventArray& events, KSDateInterval window,
                                     KSDate submissionDate) {
    std::map<std::string, std::int64_t> counts;
    for (const auto& key : metric::providerKeys(kFrom)) counts[key] = 0;
    for (const auto& key : metric::categoryKeys(kNumber)) counts[key] = 0;
    Samples latencies;
    Samples durations;
    for (const auto& event : events) {
        ++counts[metric::key(kFrom, event->provider())];
        ++counts[metric::key(kNumber, event->category())];
        latencies[metric::key(kLatency, event->category())].push_back(event->creationDate() -
                                                                      event->sourceCreationDate());
        durations[metric::key(kDuration, event->category())].push_back(event->endDate() -
                                                                       event->startDate());
    }
    KSDictionary values = {{kNumber, events.size()},
                           {kWindowStart, hoursBetween(window.start, submissionDate)},
                           {kWindowEnd, hoursBetween(window.end, submissionDate)}};
    values.insert(counts.begin(), counts.end());
    values.merge(mediansOf(latencies, kLatency, binsFromStart(0, 96 * kHour, kHour)));
    values.merge(mediansOf(durations, kDuration, binsFromStart(0, 12 * kHour, kHour / 4)));
    return setAllMetrics(values);
}

}  // namespace keepsakes
