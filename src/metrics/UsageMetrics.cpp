// SPDX-License-Identifier: Apache-2.0
#include "metrics/UsageMetrics.h"

#include <utility>

#include "core/Log.h"
#include "metrics/KSEventData.h"
#include "metrics/KSUserData.h"
#include "platform/DeviceState.h"
#include "platform/PlatformServices.h"
#include "sources/KSVitalsManager.h"

namespace keepsakes {

namespace {

void submit(KSMetric& metric, const OptionalError& filled) {
    const auto error = filled ? filled : metric.submitMetrics();
    if (error) logError(error->description());
}

}  // namespace

UsageMetrics::UsageMetrics(const PlatformServices& platform,
                           std::shared_ptr<KSVitalsManager> vitals,
                           std::vector<std::string> ruleNames)
    : platform_(platform), vitals_(std::move(vitals)), ruleNames_(std::move(ruleNames)) {}

std::shared_ptr<UsageMetrics> UsageMetrics::initWithUniverse(const ServiceLookup& universe,
                                                             std::vector<std::string> ruleNames) {
    return std::shared_ptr<UsageMetrics>(
        new UsageMetrics(universe.platform(), universe.service<KSVitalsManager>("VitalsManager"),
                         std::move(ruleNames)));
}

void UsageMetrics::submitKSEventData(const KSEventArray& events, KSDate start, KSDate end,
                                     KSDate submissionDate) const {
    if (!platform_.devicePolicy->diagnosticSubmissionAllowed()) return;
    KSEventData data(*platform_.analytics);
    submit(data, data.setEvents(events, {start, end}, submissionDate));
    submitKSUserData();
}

void UsageMetrics::submitKSUserData() const {
    if (!vitals_ || !platform_.devicePolicy->healthDataSubmissionAllowed()) return;
    // What cannot be read is told as not known.
    vitals_->fetchUserAgeWithHandler(
        [self = shared_from_this()](std::optional<int> years, const OptionalError&) {
            self->vitals_->fetchUserBiologicalSexWithHandler(
                [self, years](std::optional<int> code, const OptionalError&) {
                    KSUserData user(*self->platform_.analytics);
                    submit(user, user.setOwner(years, code));
                });
        });
}

void UsageMetrics::submitMetricForEventBundle(double windowSeconds, const KSEventArray& events,
                                              const KSPromptMetrics::Clusters& clusters,
                                              const KSPromptMetrics::Bundles& ruleBundles) const {
    if (!platform_.devicePolicy->diagnosticSubmissionAllowed()) return;
    KSPromptMetrics prompts(*platform_.analytics, ruleNames_);
    submit(prompts, prompts.setStep(windowSeconds, events, clusters, ruleBundles));
}

}  // namespace keepsakes
