// SPDX-License-Identifier: Apache-2.0
#include "trends/KSTrendsAnalyzer.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <utility>

#include "core/Clock.h"
#include "platform/PlatformServices.h"
#include "trends/AnalyticsPlans.h"
#include "trends/TrendsKeys.h"

namespace keepsakes {

namespace {

constexpr double kNoInterval = std::numeric_limits<double>::max();
constexpr double kExpirationSeconds = 2419200;
/// Two dates closer than this are of the same event.
constexpr double kSameEventSeconds = 1;

void set(KSDictionary& trends, std::string_view key, KSValue value) {
    trends.insert_or_assign(std::string(key), std::move(value));
}

template <class Enumeration>
void setNumberOf(KSDictionary& trends, std::string_view key, Enumeration value) {
    set(trends, key, static_cast<std::int64_t>(value));
}

/// Sums of huge values overflow; a record has no form for that.
void setFinite(KSDictionary& trends, const std::string& key, double value) {
    if (std::isfinite(value)) trends.insert_or_assign(key, value);
}

void setSummary(KSDictionary& trends, std::string_view prefix, const KSAnalyticsStats& stats) {
    const std::string name(prefix);
    setFinite(trends, name + "Mean", stats.mean);
    setFinite(trends, name + "Std", stats.std);
    trends.insert_or_assign(name + "Count", stats.count);
    setFinite(trends, name + "Min", stats.min);
    setFinite(trends, name + "Max", stats.max);
}

KSDictionary trendsOf(const KSTrendsAnalyzerOptions& plan) {
    KSDictionary trends;
    set(trends, trendskey::kKeyword, plan.keyword);
    set(trends, trendskey::kTrainStartDate, plan.trainDateInterval.start.seconds);
    set(trends, trendskey::kTrainEndDate, plan.trainDateInterval.end.seconds);
    set(trends, trendskey::kTestStartDate, plan.testDateInterval.start.seconds);
    set(trends, trendskey::kTestEndDate, plan.testDateInterval.end.seconds);
    setNumberOf(trends, trendskey::kAggregationDuration, plan.aggregationDuration);
    setNumberOf(trends, trendskey::kAggregationMethod, plan.aggregationMethod);
    setNumberOf(trends, trendskey::kValueFunctionType, plan.valueFunctionType);
    return trends;
}

/// Seconds between the starts of the two newest events; the largest double when there is but one.
double newestInterval(const KSEventArray& sources) {
    if (sources.size() < 2) return kNoInterval;
    return sources.back()->startDate() - sources[sources.size() - 2]->startDate();
}

}  // namespace

KSTrendsAnalyzer::KSTrendsAnalyzer(const PlatformServices& platform,
                                   std::shared_ptr<KSVitalsManager> vitalsManager)
    : platform_(platform), vitalsManager_(std::move(vitalsManager)) {}

KSTrendsAnalyzer::~KSTrendsAnalyzer() = default;

KSTrendsAnalyzerPlans KSTrendsAnalyzer::buildAnalyticsPlans() const {
    return analyticsPlansAt(platform_.clock->now());
}

void KSTrendsAnalyzer::analyzeEvents(const KSEventArray& events, const KSTrendsAnalyzerPlans& plans,
                                     const Handler& handler) const {
    KSEventArray found;
    KSDictionary statuses;
    for (const auto& plan : plans) {
        analyzeEvents(events, *plan, [&](const KSEventPointer& event, KSTrendsVerdict verdict) {
            if (event) found.push_back(event);
            setNumberOf(statuses, plan->keyword, verdict);
        });
    }
    handler(std::move(found), std::move(statuses));
}

void KSTrendsAnalyzer::analyzeEvents(const KSEventArray& events,
                                     const KSTrendsAnalyzerOptions& plan,
                                     const ResultHandler& handler) const {
    if (events.empty()) {
        handler(nullptr, KSTrendsVerdict::notEnoughData);
        return;
    }
    const auto event = eventWithOptions(plan, lookupTrendsDataWithOptions(plan, events));
    if (!event) {
        handler(nullptr, KSTrendsVerdict::noUsableModel);
        return;
    }
    auto& trends = *event->trends;
    const auto sources = sourceEventsOf(plan, events);
    if (!sources.empty()) {
        updateTrendsData(trends, sources.back()->startDate(), newestInterval(sources));
    }
    const auto found = findTrend(plan, sources, platform_.clock->now());
    if (found.result) {
        updateTrendsData(trends, found.model);
        updateTrendsData(trends, found.verdict);
    }
    handler(event, found.verdict);
}

std::shared_ptr<KSEvent> KSTrendsAnalyzer::eventWithOptions(
    const KSTrendsAnalyzerOptions& plan, const KSEventPointer& originalTrendsData) const {
    if (plan.category == KSEventCategory::unknown) return nullptr;
    const KSDate now = platform_.clock->now();
    auto event = KSEvent::initWithEventIdentifier(
        originalTrendsData ? originalTrendsData->eventIdentifier() : KSUUID::random(),
        plan.testDateInterval.start, plan.testDateInterval.end, now, KSEventProvider::postAnalytics,
        plan.category);
    event->expirationDate = now + kExpirationSeconds;
    event->trends = trendsOf(plan);
    if (originalTrendsData && originalTrendsData->trends) {
        updateTrendsData(*event->trends, *originalTrendsData->trends);
    }
    return event;
}

KSEventPointer KSTrendsAnalyzer::lookupTrendsDataWithOptions(const KSTrendsAnalyzerOptions& plan,
                                                             const KSEventArray& events) {
    const auto wanted = trendsOf(plan);
    const auto tellsOfPlan = [&](const KSEventPointer& event) {
        if (event->provider() != KSEventProvider::postAnalytics ||
            event->category() != plan.category || !event->trends) {
            return false;
        }
        return std::ranges::all_of(
            std::array{trendskey::kKeyword, trendskey::kAggregationDuration,
                       trendskey::kAggregationMethod, trendskey::kValueFunctionType},
            [&](std::string_view key) {
                return valueForKey(wanted, key) == valueForKey(*event->trends, key);
            });
    };
    const auto found = std::ranges::find_if(events, tellsOfPlan);
    return found == events.end() ? nullptr : *found;
}

void KSTrendsAnalyzer::updateTrendsData(KSDictionary& trends, const KSDictionary& prevTrendsData) {
    for (const auto key : {trendskey::kLastEventDate, trendskey::kLastEventInterval}) {
        const auto number = valueForKey(prevTrendsData, key).asNumber();
        if (number) set(trends, key, *number);
    }
}

void KSTrendsAnalyzer::updateTrendsData(KSDictionary& trends, KSDate lastEventDate,
                                        double lastEventInterval) const {
    const auto previous = valueForKey(trends, trendskey::kLastEventDate).asNumber();
    double recorded = 0;
    if (previous) {
        const double since = std::abs(lastEventDate.seconds - *previous);
        if (since > kSameEventSeconds) {
            recorded = std::min(since, lastEventInterval);
        } else if (lastEventInterval < kNoInterval) {
            recorded = lastEventInterval;
        }
    }
    set(trends, trendskey::kLastEventDate, lastEventDate.seconds);
    setFinite(trends, std::string(trendskey::kLastEventInterval), recorded);
    const double sinceLast = platform_.clock->now() - lastEventDate;
    if (std::max(recorded, sinceLast) > kKSTrendsAnalysisLongInterval) {
        updateTrendsData(trends, KSTrendsVerdict::longAbsence);
    }
}

void KSTrendsAnalyzer::updateTrendsData(KSDictionary& trends, const KSTukeyOutlierDetector& model) {
    setSummary(trends, trendskey::kTrainPrefix, model.getTrainDataStats());
    setSummary(trends, trendskey::kTestPrefix, model.getTestDataStats());
}

void KSTrendsAnalyzer::updateTrendsData(KSDictionary& trends, KSTrendsVerdict result) {
    setNumberOf(trends, trendskey::kTrends, result);
}

int KSTrendsAnalyzer::trendsfromAnalyticsResult(std::int64_t code) {
    switch (static_cast<KSTrendsVerdict>(code)) {
        case KSTrendsVerdict::lowOutlier:
            return 3;
        case KSTrendsVerdict::normal:
            return 1;
        case KSTrendsVerdict::highOutlier:
            return 2;
        default:
            return 0;
    }
}

}  // namespace keepsakes
