// SPDX-License-Identifier: Apache-2.0
#include "client/TrendView.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <utility>

#include "client/RecordJson.h"
#include "core/KSDate.h"
#include "trends/TrendWords.h"

namespace keepsakes {

namespace {

constexpr std::size_t kDays = 28;
constexpr std::size_t kDaysOfAWeek = 7;
constexpr auto kBars = std::to_array<std::string_view>({"▁", "▂", "▃", "▄", "▅", "▆", "▇", "█"});
constexpr std::string_view kNoBar = "·";

std::string timeSpan(double seconds) {
    if (seconds < 0) return fmt::format("-{}", timeSpan(-seconds));
    if (seconds == 0) return "none";
    if (seconds < 59.5) return fmt::format("{:.0f} s", seconds);
    const double minutes = std::round(seconds / 60);
    const double hours = std::floor(minutes / 60);
    if (hours == 0) return fmt::format("{:.0f} min", minutes);
    if (minutes == 60 * hours) return fmt::format("{:.0f} h", hours);
    return fmt::format("{:.0f} h {:.0f} min", hours, minutes - 60 * hours);
}

std::string shown(TrendUnit unit, double value) {
    switch (unit) {
        case TrendUnit::seconds:
            return timeSpan(value);
        case TrendUnit::minutesOfDay: {
            const double minutes = std::round(value);
            const double hours = std::floor(minutes / 60);
            return fmt::format("{:02.0f}:{:02.0f}", hours, minutes - 60 * hours);
        }
        case TrendUnit::count:
            break;
    }
    return value == 0 ? "none" : fmt::format("{:.6g}", value);
}

/// Whether the summaries that the daemon sent are those of the findings.
bool tellsOf(const TrendFindings& findings, const KSDictionary& trends) {
    const auto same = [&trends](std::string_view key, double value) {
        return valueForKey(trends, key).asNumber() == value;
    };
    const auto& train = findings.model.getTrainDataStats();
    const auto& test = findings.model.getTestDataStats();
    return same("trainCount", static_cast<double>(train.count)) && same("trainMean", train.mean) &&
           same("trainStd", train.std) && same("testMean", test.mean);
}

}  // namespace

TrendView::TrendView(KSTrendsAnalyzerOptions::Pointer plan, const KSEventArray& events,
                     KSTrendsVerdict verdict, KSEventPointer trendsEvent)
    : plan_(std::move(plan)), verdict_(verdict), trendsEvent_(std::move(trendsEvent)) {
    auto found = findTrend(*plan_, sourceEventsOf(*plan_, events), plan_->testDateInterval.end);
    const bool agrees =
        found.verdict == verdict_ && (!trendsEvent_ || (trendsEvent_->trends && found.result &&
                                                        tellsOf(found, *trendsEvent_->trends)));
    if (agrees) findings_ = std::move(found);
}

std::string TrendView::words() const {
    const auto& wording = trendWordingOf(plan_->keyword);
    const auto verdict = wordsOf(wording, verdict_);
    if (!findings_) return std::string(verdict);
    if (!findings_->result) {
        return fmt::format("{}: {} of the 27 days before yesterday", verdict,
                           findings_->train.size());
    }
    const auto median = shown(wording.unit, findings_->model.q2());
    // An empty day counts as zero, and nobody left at midnight.
    if (wording.unit == TrendUnit::minutesOfDay && findings_->test.front().count == 0) {
        return fmt::format("no work yesterday, against a median of {}", median);
    }
    return fmt::format("{}: {} against a median of {}", verdict,
                       shown(wording.unit, findings_->result->actual), median);
}

std::vector<std::optional<double>> TrendView::days() const {
    std::vector<std::optional<double>> values(kDays);
    const KSDate first = plan_->trainDateInterval.start;
    const auto place = [&](const KSTimeSeriesArray& points) {
        for (const auto& point : points) {
            const auto day = indexDate(point.date, plan_->aggregationDuration, first);
            if (!day || point.count == 0) continue;
            // Rounded: a day of 23 or 25 hours shifts those before it.
            const double number = std::round((*day - first) / kDay);
            if (number < 0 || number >= static_cast<double>(kDays)) continue;
            values[static_cast<std::size_t>(number)] = point.value;
        }
    };
    if (findings_) {
        place(findings_->train);
        place(findings_->test);
    }
    return values;
}

std::string TrendView::barLine() const {
    const auto values = days();
    // A time of day is never near zero: there the earliest is the lowest bar.
    const bool fromZero = trendWordingOf(plan_->keyword).unit != TrendUnit::minutesOfDay;
    double lowest = fromZero ? 0 : HUGE_VAL;
    double highest = fromZero ? 0 : -HUGE_VAL;
    for (const auto& value : values) {
        if (!value) continue;
        lowest = std::min(lowest, *value);
        highest = std::max(highest, *value);
    }
    std::string line;
    for (std::size_t day = 0; day < values.size(); ++day) {
        if (day > 0 && day % kDaysOfAWeek == 0) line += ' ';
        const auto& value = values[day];
        const double share = value && highest > lowest ? (*value - lowest) / (highest - lowest) : 1;
        const auto height = static_cast<double>(kBars.size() - 1) * share;
        line += value ? kBars[static_cast<std::size_t>(std::lround(height))] : kNoBar;
    }
    return line;
}

std::string TrendView::fences() const {
    const auto& model = findings_->model;
    const auto unit = trendWordingOf(plan_->keyword).unit;
    const auto upper = shown(unit, model.upperFence());
    // No day is below nothing.
    if (model.lowerFence() <= 0) return "up to " + upper;
    return fmt::format("{} to {}", shown(unit, model.lowerFence()), upper);
}

std::string TrendView::text(const Screen& screen) const {
    const auto& wording = trendWordingOf(plan_->keyword);
    auto text = screen.bold(wording.title) + "\n  " + words() + "\n";
    if (!findings_ || findings_->train.empty()) return text;
    text += "  " + barLine();
    if (findings_->result) {
        const auto& yesterday = findings_->test.front();
        text += fmt::format(
            "  fences: {}; yesterday: {}", fences(),
            yesterday.count > 0 ? shown(wording.unit, findings_->result->actual) : "none");
    }
    return text + "\n";
}

KSDictionary TrendView::json() const {
    auto record = trendsEvent_ ? jsonForm(*trendsEvent_) : KSDictionary();
    KSDictionary analysis{{"keyword", plan_->keyword},
                          {"verdict", static_cast<std::int64_t>(verdict_)},
                          {"words", words()}};
    if (findings_) {
        KSArray values;
        for (const auto& value : days()) {
            auto& told = values.emplace_back();
            if (value) told = *value;
        }
        analysis.emplace("days", std::move(values));
    }
    if (findings_ && findings_->result) {
        const auto& model = findings_->model;
        analysis.emplace("median", model.q2());
        analysis.emplace("lowerFence", model.lowerFence());
        analysis.emplace("upperFence", model.upperFence());
        analysis.emplace("yesterday", findings_->result->actual);
    }
    record.insert_or_assign("analysis", jsonForm(KSValue(std::move(analysis))));
    return record;
}

}  // namespace keepsakes
