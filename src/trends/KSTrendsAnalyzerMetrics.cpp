// SPDX-License-Identifier: Apache-2.0
// What the analyzer tells the analytics service of each trends event.
#include <fmt/format.h>

#include <array>
#include <cmath>
#include <memory>
#include <mutex>
#include <optional>

#include "analytics/AnalyticsSubmission.h"
#include "analytics/KSMetric.h"
#include "core/Clock.h"
#include "core/KSDate.h"
#include "core/KSError.h"
#include "core/Log.h"
#include "model/KSExtensions.h"
#include "platform/DeviceState.h"
#include "platform/PlatformServices.h"
#include "sources/KSVitalsManager.h"
#include "trends/AnalyticsPlans.h"
#include "trends/KSTrendsAnalyzer.h"
#include "trends/TrendsKeys.h"

namespace keepsakes {

namespace {

constexpr std::string_view kEvent = "com.brindle.Keepsakes.trends";

/// The value, its decimal scale and its two leading digits: 1234 has scale 3 and digits 12. Zero
/// has neither scale nor digits, which stand as 0.
void addDecimated(KSDictionary& payload, const std::string& key, const KSValue& value) {
    const auto number = value.asNumber();
    if (!number || !std::isfinite(*number)) return;
    payload.insert_or_assign(key, value);
    const long double size = std::abs(static_cast<long double>(*number));
    long double scale = 0;
    long double digits = 0;
    if (size > 0) {
        scale = std::floor(std::log10(size));
        digits = std::copysign(std::round(size * std::pow(10.0L, 1 - scale)), *number);
    }
    payload.insert_or_assign(key + "_Scale", static_cast<std::int64_t>(scale));
    payload.insert_or_assign(key + "_SignificantValue", static_cast<std::int64_t>(digits));
}

void addDuration(KSDictionary& payload, const std::string& key, const KSDictionary& trends,
                 std::string_view startKey, std::string_view endKey) {
    static const auto bins = KSMetric::binsFromStart(0, kKSTrendsAnalysisTimeRange, kDay);
    const auto start = valueForKey(trends, startKey).asNumber();
    const auto end = valueForKey(trends, endKey).asNumber();
    if (!start || !end) return;
    payload.insert_or_assign(key, *end - *start);
    payload.insert_or_assign(key + "_Bucketed", KSMetric::binForNumber(*end - *start, bins));
}

KSDictionary payloadOf(const KSEvent& event) {
    const auto& trends = *event.trends;
    KSDictionary payload{
        {"creationDate", event.creationDate().seconds},
        {"creationDateStartOfDay", KSExtensions::startOfDay(event.creationDate()).seconds},
        {"category", static_cast<std::int64_t>(event.category())}};
    addDuration(payload, "trainDuration", trends, trendskey::kTrainStartDate,
                trendskey::kTrainEndDate);
    addDuration(payload, "testDuration", trends, trendskey::kTestStartDate,
                trendskey::kTestEndDate);
    for (const auto key :
         {trendskey::kKeyword, trendskey::kAggregationDuration, trendskey::kAggregationMethod,
          trendskey::kValueFunctionType, trendskey::kTrends}) {
        const auto found = trends.find(key);
        if (found != trends.end()) payload.insert(*found);
    }
    for (const auto prefix : {trendskey::kTrainPrefix, trendskey::kTestPrefix}) {
        for (const char* what : {"Mean", "Std", "Count", "Min", "Max"}) {
            const auto key = fmt::format("{}{}", prefix, what);
            addDecimated(payload, key, valueForKey(trends, key));
        }
    }
    return payload;
}

/// The number that the vitals manager answers, or none when it fails or says nothing in time.
template <class Fetch>
std::optional<int> waitFor(Clock& clock, std::string_view what, const Fetch& fetch) {
    struct Answer {
        std::mutex mutex;
        std::optional<int> number;
        OptionalError error;
    };
    // Shared: an answer that comes too late finds a place to go.
    const auto answer = std::make_shared<Answer>();
    const Semaphore answered;
    fetch([answer, answered](std::optional<int> number, OptionalError error) {
        {
            const std::lock_guard lock(answer->mutex);
            answer->number = number;
            answer->error = std::move(error);
        }
        Semaphore(answered).signal();
    });
    Semaphore waiting(answered);
    OptionalError failed;
    if (!clock.wait(waiting, KSTrendsAnalyzer::kVitalsWaitSeconds)) {
        failed = KSError::make(KSErrorCode::waitTimedOut, "semaphore wait timeout");
    }
    const std::lock_guard lock(answer->mutex);
    if (!failed) failed = answer->error;
    if (!failed) return answer->number;
    logWarning(fmt::format("{}: {}", what, failed->description()));
    return std::nullopt;
}

}  // namespace

KSDictionary KSTrendsAnalyzer::setCommonFields() const {
    KSDictionary fields;
    if (!vitalsManager_ || !platform_.devicePolicy->healthDataSubmissionAllowed()) return fields;
    fields.emplace("IHA_State", true);
    const auto age = waitFor(*platform_.clock, "age", [this](KSVitalsManager::AgeHandler handler) {
        vitalsManager_->fetchUserAgeWithHandler(std::move(handler));
    });
    if (age) {
        fields.emplace("Age", *age);
        fields.emplace("Age_Bucketed", KSMetric::binForNumber(*age, {0, 18, 25, 35, 45, 65}));
    }
    const auto sex =
        waitFor(*platform_.clock, "biological sex", [this](KSVitalsManager::SexHandler handler) {
            vitalsManager_->fetchUserBiologicalSexWithHandler(std::move(handler));
        });
    if (sex) fields.emplace("BiologicalSex", *sex);
    return fields;
}

void KSTrendsAnalyzer::sendMetricsForTrendsEvents(const KSEventArray& events) const {
    const auto common = setCommonFields();
    for (const auto& event : events) {
        if (!event->trends) continue;
        auto payload = payloadOf(*event);
        payload.insert(common.begin(), common.end());
        submitAnalyticsEvent(*platform_.analytics, kEvent, payload);
    }
}

}  // namespace keepsakes
