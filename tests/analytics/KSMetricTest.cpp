// SPDX-License-Identifier: Apache-2.0
#include "analytics/KSMetric.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/RecordedAssertions.h"
#include "support/TestPlatform.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

class Walks final : public KSMetric {
  public:
    using KSMetric::KSMetric;
    const char* event() const override { return "walks"; }
    Keys supportedMetricKeys() const override { return {"count", "length"}; }
};

std::string textOf(const OptionalError& error) {
    return error ? error->domain + " " + std::to_string(error->code) + " " + error->description()
                 : "";
}

TEST(Metric, IsSubmittedOnceAndOnlyWithExactlyItsKeys) {
    FakeAnalytics analytics;
    Walks walks(analytics);
    EXPECT_EQ(textOf(walks.setAllMetrics({{"count", 1}, {"weather", "wet"}})),
              "KSErrorDomain 7 metric keys contains keys that metric, walks, does not support.  "
              "Extra keys, (weather)");
    EXPECT_THAT(walks.metrics, IsEmpty()) << "all pairs or none";
    EXPECT_EQ(textOf(walks.setAllMetrics({{"count", 1}})), "") << "some keys are enough to set";
    walks.metrics["weather"] = "wet";
    EXPECT_EQ(textOf(walks.submitMetrics()),
              "KSErrorDomain 7 metric keys set does not match with keys that metric, walks, "
              "supports.  Extra keys, (weather), missing keys, (length)");
    walks.metrics.erase("weather");
    walks.metrics["length"] = 2.5;
    EXPECT_EQ(walks.description(), R"(name, walks, metrics, {"count": 1, "length": 2.5})");
    EXPECT_FALSE(walks.submitted());
    EXPECT_THAT(analytics.take(), IsEmpty());
    EXPECT_EQ(textOf(walks.submitMetrics()), "");
    EXPECT_EQ(textOf(walks.submitMetrics()),
              "KSErrorDomain 0 metric, walks, has already been submitted");
    const KSDictionary sent{{"count", 1}, {"length", 2.5}};
    EXPECT_THAT(analytics.take(), ElementsAre(Pair("com.brindle.Keepsakes.walks", sent)));

    Walks renamed(analytics, false);
    renamed.metrics = sent;
    EXPECT_EQ(textOf(renamed.submitMetricsForEvent("strolls")), "");
    EXPECT_THAT(analytics.take(), ElementsAre(Pair("com.brindle.Keepsakes.strolls", sent)));
}

TEST(Metric, WithoutANameRefusesEverything) {
    FakeAnalytics analytics;
    KSMetric nameless(analytics);
    EXPECT_EQ(textOf(nameless.setAllMetrics({})),
              "KSErrorDomain 7 cannot set all metrics when metricName is nil");
    EXPECT_EQ(textOf(nameless.submitMetrics()), "KSErrorDomain 7 metricName cannot be nil");
    EXPECT_THAT(analytics.take(), IsEmpty());
}

TEST(Bins, HoldTheEndWhenItFallsOnAStep) {
    EXPECT_THAT(KSMetric::binsFromStart(0, 4, 2), ElementsAre(0, 2, 4));
    EXPECT_THAT(KSMetric::binsFromStart(0, 3.9, 2), ElementsAre(0, 2));
    EXPECT_THAT(KSMetric::binsFromStart(5, 4, 2), IsEmpty());
    EXPECT_EQ(KSMetric::binsFromStart(0, 1, 0.1).size(), 11u) << "the edges do not drift";
    RecordedAssertions assertions;
    for (const auto& [start, end, gap] : std::vector<std::array<std::optional<double>, 3>>{
             {std::nullopt, 1, 1}, {0, std::nullopt, 1}, {0, 1, std::nullopt}, {0, 1, 0}}) {
        EXPECT_THAT(KSMetric::binsFromStart(start, end, gap), IsEmpty());
    }
    EXPECT_THAT(assertions.takeDescriptions(),
                ElementsAre("Invalid parameter not satisfying: start != nil",
                            "Invalid parameter not satisfying: end != nil",
                            "Invalid parameter not satisfying: gap != nil",
                            "Invalid parameter not satisfying: gap > 0"));
}

TEST(Bins, CountTheEdgesUpToANumber) {
    const std::vector<double> edges = {0, 18, 25};
    const struct {
        double number;
        std::uint64_t bin;
    } rows[] = {{-0.5, 0}, {0, 1}, {17.9, 1}, {18, 2}, {24, 2}, {25, 3}, {1e9, 3}};
    for (const auto& row : rows) {
        EXPECT_EQ(KSMetric::binForNumber(row.number, edges), row.bin) << row.number;
    }
    RecordedAssertions assertions;
    EXPECT_EQ(KSMetric::binForNumber(std::nullopt, edges), 0u);
    EXPECT_EQ(KSMetric::binForNumber(1, {}), 0u);
    EXPECT_EQ(assertions.take().size(), 2u);
}

}  // namespace
}  // namespace keepsakes
