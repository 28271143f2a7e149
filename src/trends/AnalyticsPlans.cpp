// SPDX-License-Identifier: Apache-2.0
#include "trends/AnalyticsPlans.h"

#include <algorithm>
#include <array>

#include "core/Calendar.h"
#include "core/KSDate.h"
#include "model/KSExtensions.h"

namespace keepsakes {

namespace {

constexpr std::uint64_t kWorkPlace = 2;
// Those that a person answers in person; the source of interactions knows one more.
constexpr auto kMechanisms = std::to_array<std::int64_t>({0, 2, 3, 4, 8, 9, 10, 11, 12, 16});

double workDuration(const KSEvent& visit) {
    if (visit.placeUserType != kWorkPlace) return kKSTrendsAnalysisNoValue;
    return visit.endDate() - visit.startDate();
}

double workExit(const KSEvent& visit) {
    if (visit.placeUserType != kWorkPlace) return kKSTrendsAnalysisNoValue;
    const KSDate exit = visit.endDate();
    const double minutes = timeOfDay(ClockTime{calendar::hours(exit), calendar::minutes(exit)});
    return minutes < 0 ? kKSTrendsAnalysisNoValue : minutes;
}

double playTime(const KSEvent& media) {
    const double seconds = media.mediaSumTimePlayed.value_or(0);
    return seconds > 0 ? seconds : kKSTrendsAnalysisNoValue;
}

double interactionCount(const KSEvent& contact) {
    if (!contact.interactions) return kKSTrendsAnalysisNoValue;
    const auto count =
        std::ranges::count_if(*contact.interactions, [](const KSDictionary& interaction) {
            const auto mechanism = valueForKey(interaction, "mechanism").asInteger();
            return mechanism && std::ranges::find(kMechanisms, *mechanism) != kMechanisms.end();
        });
    return count > 0 ? static_cast<double>(count) : kKSTrendsAnalysisNoValue;
}

}  // namespace

double timeOfDay(std::optional<ClockTime> time) {
    return time ? 60.0 * time->hours + time->minutes : -1.0;
}

KSTrendsAnalyzerPlans analyticsPlansAt(KSDate now) {
    return analyticsPlansOfDay(
        KSExtensions::startOfDayWithBoundaryOfADay(now, kKSTrendsAnalysisBoundaryOfADay));
}

KSTrendsAnalyzerPlans analyticsPlansOfDay(KSDate today) {
    const KSDateInterval train{today - kKSTrendsAnalysisTimeRange, today - kDay};
    const KSDateInterval test{today - kDay, today};
    const auto daily = [&](const char* keyword, KSEventCategory category,
                           KSAggregationMethod method, auto value) {
        return KSTrendsAnalyzerOptions::initWithKeyword(keyword, category, train, test,
                                                        KSAggregationDuration::day, method, value);
    };
    using Category = KSEventCategory;
    using Method = KSAggregationMethod;
    return {
        daily("workout.duration", Category::workout, Method::sum,
              KSTrendsAnalyzerValueFunctionTypeDuration),
        daily("work.duration", Category::visit, Method::sum, workDuration),
        daily("work.exit", Category::visit, Method::last, workExit),
        daily("meida.playTime", Category::leisureMedia, Method::sum, playTime),
        daily("contact.interactions", Category::significantContact, Method::sum, interactionCount),
    };
}

}  // namespace keepsakes
