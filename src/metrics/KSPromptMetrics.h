// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "analytics/KSMetric.h"
#include "model/KSEvent.h"
#include "model/KSEventBundle.h"

namespace keepsakes {

/// What one bundling step made of its events, in numbers.
///
/// | key | value |
/// |---|---|
/// | "windowLength" | the step's window in whole hours |
/// | "numberOfEvents", "numberOfEvents<Category>" | the step's events |
/// | "numberOfClusters", "clustersOf1", "clustersOf2", "clustersOf3To5", "clustersOf6To10",
/// "clustersOf11OrMore" | clusters, also by their number of events | | "largestCluster" | its
/// number of events | | "clustersWithBundles" | clusters that a rule took something of | |
/// "numberOfBundles", "bundles<Rule>", "bundles<Provider>" | the rules' bundles; one of several
/// providers counts for each | | "eventsInBundles" | distinct events that a rule took |
class KSPromptMetrics final : public KSMetric {
  public:
    using Clusters = std::map<int, KSEventArray>;
    using Bundles = std::map<int, std::shared_ptr<KSEventBundle>>;

    /// `ruleNames` are those of the table of rules.
    KSPromptMetrics(AnalyticsService& analytics, std::vector<std::string> ruleNames);

    const char* event() const override { return "PromptMetrics"; }
    Keys supportedMetricKeys() const override;

    /// Fills in all keys.
    OptionalError setStep(double windowSeconds, const KSEventArray& events,
                          const Clusters& clusters, const Bundles& ruleBundles);

  private:
    const std::vector<std::string> ruleNames_;
};

}  // namespace keepsakes
