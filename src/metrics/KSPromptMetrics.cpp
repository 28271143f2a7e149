// SPDX-License-Identifier: Apache-2.0
#include "metrics/KSPromptMetrics.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <string_view>
#include <unordered_set>
#include <utility>

#include "core/KSDate.h"
#include "metrics/MetricValues.h"

namespace keepsakes {

namespace {

constexpr const char* kWindowLength = "windowLength";
constexpr const char* kEvents = "numberOfEvents";
constexpr const char* kClusters = "numberOfClusters";
constexpr const char* kLargestCluster = "largestCluster";
constexpr const char* kClustersWithBundles = "clustersWithBundles";
constexpr const char* kBundles = "numberOfBundles";
constexpr const char* kBundlesOf = "bundles";
constexpr const char* kEventsInBundles = "eventsInBundles";

/// Clusters up to this many events, and more than the row before.
struct SizeBucket {
    std::size_t largest;
    const char* key;
};
constexpr std::array<SizeBucket, 5> kSizeBuckets = {
    {{1, "clustersOf1"},
     {2, "clustersOf2"},
     {5, "clustersOf3To5"},
     {10, "clustersOf6To10"},
     {std::numeric_limits<std::size_t>::max(), "clustersOf11OrMore"}}};

const char* bucketOf(std::size_t size) {
    return std::ranges::find_if(kSizeBuckets,
                                [size](const SizeBucket& bucket) { return size <= bucket.largest; })
        ->key;
}

}  // namespace

KSPromptMetrics::KSPromptMetrics(AnalyticsService& analytics, std::vector<std::string> ruleNames)
    : KSMetric(analytics), ruleNames_(std::move(ruleNames)) {}

KSMetric::Keys KSPromptMetrics::supportedMetricKeys() const {
    Keys keys = {kWindowLength,        kEvents,  kClusters,       kLargestCluster,
                 kClustersWithBundles, kBundles, kEventsInBundles};
    for (const auto& bucket : kSizeBuckets) keys.insert(bucket.key);
    for (const auto& name : ruleNames_) keys.insert(metric::key(kBundlesOf, name));
    keys.merge(metric::providerKeys(kBundlesOf));
    keys.merge(metric::categoryKeys(kEvents));
    return keys;
}

OptionalError KSPromptMetrics::setStep(double windowSeconds, const KSEventArray& events,
                                       const Clusters& clusters, const Bundles& ruleBundles) {
    std::map<std::string, std::int64_t> counts;
    for (const auto& key : supportedMetricKeys()) counts[key] = 0;
    counts[kWindowLength] = std::llround(windowSeconds / kHour);
    counts[kEvents] = static_cast<std::int64_t>(events.size());
    counts[kClusters] = static_cast<std::int64_t>(clusters.size());
    counts[kBundles] = static_cast<std::int64_t>(ruleBundles.size());
    for (const auto& event : events) ++counts[metric::key(kEvents, event->category())];

    std::unordered_set<KSUUID> taken;
    for (const auto& [number, bundle] : ruleBundles) {
        const bool known = std::ranges::find(ruleNames_, bundle->bundleType) != ruleNames_.end();
        if (known) ++counts[metric::key(kBundlesOf, bundle->bundleType)];
        std::set<std::string> providers;
        for (const auto& event : bundle->events) {
            taken.insert(event->eventIdentifier());
            providers.insert(metric::key(kBundlesOf, event->provider()));
        }
        for (const auto& key : providers) ++counts[key];
    }
    counts[kEventsInBundles] = static_cast<std::int64_t>(taken.size());

    for (const auto& [label, members] : clusters) {
        ++counts[bucketOf(members.size())];
        counts[kLargestCluster] =
            std::max(counts[kLargestCluster], static_cast<std::int64_t>(members.size()));
        counts[kClustersWithBundles] += std::ranges::any_of(members, [&taken](const auto& event) {
            return taken.contains(event->eventIdentifier());
        });
    }
    return setAllMetrics(KSDictionary(counts.begin(), counts.end()));
}

}  // namespace keepsakes
