// SPDX-License-Identifier: Apache-2.0
#include "trends/TrendWords.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>

#include "core/Text.h"
#include "trends/TrendsKeys.h"

namespace keepsakes {

namespace {

constexpr auto kWordings = std::to_array<TrendWording>({
    {"workout.duration", "Workouts", "more workout time than usual", "less workout time than usual",
     TrendUnit::seconds},
    {"work.duration", "Time at work", "more time at work than usual",
     "less time at work than usual", TrendUnit::seconds},
    {"work.exit", "Leaving work", "left work later than usual", "left work earlier than usual",
     TrendUnit::minutesOfDay},
    {"meida.playTime", "Media", "more media played than usual", "less media played than usual",
     TrendUnit::seconds},
    {"contact.interactions", "Contacts", "more contact with others than usual",
     "less contact with others than usual", TrendUnit::count},
});
constexpr TrendWording kOther = {"", "Trend", "more than usual", "less than usual",
                                 TrendUnit::count};

}  // namespace

const TrendWording& trendWordingOf(std::string_view keyword) {
    const auto* found = std::ranges::find(kWordings, keyword, &TrendWording::keyword);
    return found == kWordings.end() ? kOther : *found;
}

std::string_view wordsOf(const TrendWording& wording, KSTrendsVerdict verdict) {
    switch (verdict) {
        case KSTrendsVerdict::highOutlier:
            return wording.more;
        case KSTrendsVerdict::lowOutlier:
            return wording.less;
        case KSTrendsVerdict::normal:
            return "nothing unusual";
        case KSTrendsVerdict::noUsableModel:
            return "no verdict, too many of the days are alike";
        case KSTrendsVerdict::longAbsence:
            return "nothing for three weeks";
        case KSTrendsVerdict::notEnoughData:
            break;
    }
    return "not enough data";
}

std::string trendTextOf(const KSDictionary& trends) {
    const auto* keyword = valueForKey(trends, trendskey::kKeyword).asString();
    const auto& wording = trendWordingOf(keyword ? *keyword : std::string());
    const auto code = valueForKey(trends, trendskey::kTrends).asInteger();
    const auto verdict =
        code ? static_cast<KSTrendsVerdict>(*code) : KSTrendsVerdict::notEnoughData;
    return fmt::format("{}, {}", lowerCased(wording.title), wordsOf(wording, verdict));
}

}  // namespace keepsakes
