// SPDX-License-Identifier: Apache-2.0
#include "trends/KSTrendsAnalyzerOptions.h"

#include <fmt/format.h>

#include <utility>

#include "core/KSAssertion.h"

namespace keepsakes {

namespace {

constexpr double kLongEventSeconds = 600;

double duration(const KSEvent& event) { return event.endDate() - event.startDate(); }

KSTrendsAnalyzerOptions::ValueFunction builtIn(KSTrendsAnalyzerValueFunctionType type) {
    switch (type) {
        case KSTrendsAnalyzerValueFunctionTypeLongEvent:
            return [](const KSEvent& event) {
                return duration(event) > kLongEventSeconds ? 1.0 : 0.0;
            };
        case KSTrendsAnalyzerValueFunctionTypeDuration:
            return duration;
        default:
            return nullptr;
    }
}

}  // namespace

KSTrendsAnalyzerOptions::KSTrendsAnalyzerOptions(std::string name, KSEventCategory ofCategory,
                                                 const KSDateInterval& train,
                                                 const KSDateInterval& test,
                                                 KSAggregationDuration duration,
                                                 KSAggregationMethod method, ValueFunction function,
                                                 KSTrendsAnalyzerValueFunctionType type)
    : keyword(std::move(name)),
      category(ofCategory),
      trainDateInterval(train),
      testDateInterval(test),
      aggregationDuration(duration),
      aggregationMethod(method),
      valueFunction(std::move(function)),
      valueFunctionType(type) {}

KSTrendsAnalyzerOptions::Pointer KSTrendsAnalyzerOptions::initWithKeyword(
    std::string keyword, KSEventCategory category, std::optional<KSDateInterval> trainDateInterval,
    std::optional<KSDateInterval> testDateInterval, KSAggregationDuration aggregationDuration,
    KSAggregationMethod aggregationMethod, ValueFunction valueFunction) {
    const bool good =
        assertParameter(trainDateInterval.has_value(), "trainDateInterval", kUnit, __LINE__) &&
        assertParameter(testDateInterval.has_value(), "testDateInterval", kUnit, __LINE__) &&
        assertParameter(valueFunction != nullptr, "valueFunction", kUnit, __LINE__);
    if (!good) return nullptr;
    return Pointer(new KSTrendsAnalyzerOptions(
        std::move(keyword), category, *trainDateInterval, *testDateInterval, aggregationDuration,
        aggregationMethod, std::move(valueFunction), KSTrendsAnalyzerValueFunctionTypeCustom));
}

KSTrendsAnalyzerOptions::Pointer KSTrendsAnalyzerOptions::initWithKeyword(
    std::string keyword, KSEventCategory category, std::optional<KSDateInterval> trainDateInterval,
    std::optional<KSDateInterval> testDateInterval, KSAggregationDuration aggregationDuration,
    KSAggregationMethod aggregationMethod, KSTrendsAnalyzerValueFunctionType valueType) {
    // The text names the category where the value type is meant; others search for it as it is.
    const bool good =
        assertParameter(trainDateInterval.has_value(), "trainDateInterval", kUnit, __LINE__) &&
        assertParameter(testDateInterval.has_value(), "testDateInterval", kUnit, __LINE__) &&
        assertParameter(valueType != KSTrendsAnalyzerValueFunctionTypeCustom,
                        "category != KSTrendsAnalyzerValueFunctionTypeCustom", kUnit, __LINE__);
    if (!good) return nullptr;
    return Pointer(new KSTrendsAnalyzerOptions(std::move(keyword), category, *trainDateInterval,
                                               *testDateInterval, aggregationDuration,
                                               aggregationMethod, builtIn(valueType), valueType));
}

std::string KSTrendsAnalyzerOptions::description() const {
    return fmt::format(
        "keyword, {}, category, {}@, train.startDate, {}, train.endDate, {}, test.startDate, {}, "
        "test.endDate, {}, aggregationDuration, {}, aggregationMethod, {}, valueFunctionType, {}",
        keyword, static_cast<std::uint64_t>(category), formatISO8601(trainDateInterval.start),
        formatISO8601(trainDateInterval.end), formatISO8601(testDateInterval.start),
        formatISO8601(testDateInterval.end), static_cast<std::uint64_t>(aggregationDuration),
        static_cast<std::uint64_t>(aggregationMethod),
        static_cast<std::uint64_t>(valueFunctionType));
}

}  // namespace keepsakes
