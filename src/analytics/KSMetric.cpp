// SPDX-License-Identifier: Apache-2.0
#include "analytics/KSMetric.h"

#include <fmt/format.h>

#include <algorithm>

#include "analytics/AnalyticsSubmission.h"
#include "core/KSAssertion.h"
#include "model/Description.h"

namespace keepsakes {

namespace {

KSError invalid(std::string_view text) {
    return KSError::make(KSErrorCode::invalidParameter, text);
}

std::vector<std::string> extraKeys(const KSDictionary& metrics, const KSMetric::Keys& supported) {
    std::vector<std::string> extra;
    for (const auto& [key, value] : metrics) {
        if (!supported.contains(key)) extra.push_back(key);
    }
    return extra;
}

std::vector<std::string> missingKeys(const KSDictionary& metrics, const KSMetric::Keys& supported) {
    std::vector<std::string> missing;
    std::ranges::copy_if(supported, std::back_inserter(missing),
                         [&metrics](const auto& key) { return !metrics.contains(key); });
    return missing;
}

}  // namespace

KSMetric::KSMetric(AnalyticsService& analytics, bool loggingEnabled)
    : analytics_(analytics), loggingEnabled_(loggingEnabled) {}

KSMetric::~KSMetric() = default;

std::optional<std::string> KSMetric::metricNameFromEvent(const char* event) {
    return event ? std::optional<std::string>(event) : std::nullopt;
}

OptionalError KSMetric::setAllMetrics(const KSDictionary& given) {
    const auto name = metricName();
    if (!name) return invalid("cannot set all metrics when metricName is nil");
    const auto extra = extraKeys(given, supportedMetricKeys());
    if (!extra.empty()) {
        return invalid(fmt::format(
            "metric keys contains keys that metric, {}, does not support.  Extra keys, {}", *name,
            describe(extra)));
    }
    for (const auto& [key, value] : given) metrics.insert_or_assign(key, value);
    return std::nullopt;
}

OptionalError KSMetric::submitMetricsForEvent(const char* event) {
    const auto name = metricNameFromEvent(event);
    if (!name) return invalid("metricName cannot be nil");
    if (submitted_) {
        return KSError::make(KSErrorDomain, 0,
                             fmt::format("metric, {}, has already been submitted", *name));
    }
    const auto supported = supportedMetricKeys();
    const auto extra = extraKeys(metrics, supported);
    const auto missing = missingKeys(metrics, supported);
    if (!extra.empty() || !missing.empty()) {
        return invalid(
            fmt::format("metric keys set does not match with keys that metric, {}, supports.  "
                        "Extra keys, {}, missing keys, {}",
                        *name, describe(extra), describe(missing)));
    }
    submitAnalyticsEvent(analytics_, "com.brindle.Keepsakes." + *name, metrics, loggingEnabled_);
    submitted_ = true;
    return std::nullopt;
}

std::string KSMetric::description() const {
    return fmt::format("name, {}, metrics, {}", describe(metricName()), describe(metrics));
}

std::vector<double> KSMetric::binsFromStart(std::optional<double> start, std::optional<double> end,
                                            std::optional<double> gap) {
    const bool good = assertParameter(start.has_value(), "start != nil", kUnit, __LINE__) &&
                      assertParameter(end.has_value(), "end != nil", kUnit, __LINE__) &&
                      assertParameter(gap.has_value(), "gap != nil", kUnit, __LINE__) &&
                      assertParameter(*gap > 0, "gap > 0", kUnit, __LINE__);
    std::vector<double> edges;
    if (!good) return edges;
    // Counted, not added up: the sum of many gaps would drift off the last edge.
    const auto edge = [&](std::size_t number) {
        return *start + *gap * static_cast<double>(number);
    };
    while (edge(edges.size()) <= *end) edges.push_back(edge(edges.size()));
    return edges;
}

std::uint64_t KSMetric::binForNumber(std::optional<double> number,
                                     const std::vector<double>& bins) {
    const bool good = assertParameter(number.has_value(), "number != nil", kUnit, __LINE__) &&
                      assertParameter(!bins.empty(), "bins.count > 0", kUnit, __LINE__);
    if (!good) return 0;
    return static_cast<std::uint64_t>(std::ranges::upper_bound(bins, *number) - bins.begin());
}

}  // namespace keepsakes
