// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "core/ServiceLookup.h"
#include "metrics/KSPromptMetrics.h"
#include "model/KSEvent.h"

namespace keepsakes {

class KSVitalsManager;

/// Submits the usage metrics of what it is handed: counts and coarse values, nothing by which an
/// event, a place, a person or a moment could be told. Nothing is submitted unless the owner allows
/// diagnostics, and nothing of the owner unless health data is allowed as well; both are asked each
/// time. Any thread may call it; counting happens on the caller's.
class UsageMetrics final : public std::enable_shared_from_this<UsageMetrics> {
  public:
    /// Needs "VitalsManager"; without it nothing is told of the owner.
    static std::shared_ptr<UsageMetrics> initWithUniverse(const ServiceLookup& universe,
                                                          std::vector<std::string> ruleNames);

    /// The events of a window, and with them the owner.
    void submitKSEventData(const KSEventArray& events, KSDate start, KSDate end,
                           KSDate submissionDate) const;

    /// One bundling step.
    void submitMetricForEventBundle(double windowSeconds, const KSEventArray& events,
                                    const KSPromptMetrics::Clusters& clusters,
                                    const KSPromptMetrics::Bundles& ruleBundles) const;

  private:
    UsageMetrics(const PlatformServices& platform, std::shared_ptr<KSVitalsManager> vitals,
                 std::vector<std::string> ruleNames);
    void submitKSUserData() const;

    const PlatformServices& platform_;
    const std::shared_ptr<KSVitalsManager> vitals_;
    const std::vector<std::string> ruleNames_;
};

}  // namespace keepsakes
