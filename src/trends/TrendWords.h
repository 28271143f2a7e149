// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>

#include "core/KSValue.h"
#include "trends/TrendFindings.h"

namespace keepsakes {

/// What the values of a plan are.
enum class TrendUnit { seconds, minutesOfDay, count };

/// How one plan is spoken of.
struct TrendWording {
    std::string_view keyword;
    std::string_view title;
    std::string_view more;
    std::string_view less;
    TrendUnit unit;
};

/// Of a plan, or of any trend for a keyword that no plan has.
const TrendWording& trendWordingOf(std::string_view keyword);

/// "more workout time than usual"; "nothing unusual" and the like where it is not.
std::string_view wordsOf(const TrendWording& wording, KSTrendsVerdict verdict);

/// What a trends event found: "workouts, more workout time than usual".
std::string trendTextOf(const KSDictionary& trends);

}  // namespace keepsakes
