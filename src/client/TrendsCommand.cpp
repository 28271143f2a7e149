// SPDX-License-Identifier: Apache-2.0
// keepsakesctl trends.
#include <fmt/format.h>

#include <charconv>
#include <expected>
#include <optional>
#include <string>
#include <vector>

#include "client/Commands.h"
#include "client/RecordJson.h"
#include "client/TrendView.h"
#include "client/Words.h"
#include "core/Clock.h"
#include "trends/AnalyticsPlans.h"
#include "trends/TrendsKeys.h"

namespace keepsakes {

namespace {

/// What the daemon found: the trends events, or the error that names each plan's verdict.
struct Answer {
    KSEventArray trends;
    OptionalError error;
};

/// The stored events of the categories that are analyzed, each by ascending start.
std::expected<KSEventArray, KSError> storedEvents(ConduitClient& client) {
    KSEventArray events;
    for (const auto category :
         {KSEventCategory::workout, KSEventCategory::visit, KSEventCategory::leisureMedia,
          KSEventCategory::significantContact}) {
        KSEventFetchOptions options;
        options.ascending = true;
        options.category = category;
        auto stored = client.fetchEventsWithOptions(options);
        if (!stored) return std::unexpected(std::move(stored.error()));
        events.insert(events.end(), stored->begin(), stored->end());
    }
    return events;
}

std::expected<KSEventArray, KSError> eventsOfFile(const std::string& file) {
    const auto text = readInput(file);
    if (!text) return std::unexpected(text.error());
    return eventsFromJson(*text);
}

bool namesVerdicts(const KSError& error) {
    return error.domain == KSErrorDomain &&
           error.code == static_cast<int>(KSErrorCode::trendAnalysisFailed);
}

/// The verdict of a plan in "(work.exit:1)(workout.duration:5)".
std::optional<KSTrendsVerdict> verdictIn(std::string_view text, const std::string& keyword) {
    const auto name = fmt::format("({}:", keyword);
    const auto at = text.find(name);
    if (at == std::string_view::npos) return std::nullopt;
    int number = 0;
    const auto rest = text.substr(at + name.size());
    const auto [end, error] = std::from_chars(rest.data(), rest.data() + rest.size(), number);
    if (error != std::errc()) return std::nullopt;
    return static_cast<KSTrendsVerdict>(number);
}

KSEventPointer trendsEventOf(const KSTrendsAnalyzerOptions& plan, const KSEventArray& trends) {
    for (const auto& event : trends) {
        if (!event->trends) continue;
        const auto* keyword = valueForKey(*event->trends, trendskey::kKeyword).asString();
        if (keyword && *keyword == plan.keyword) return event;
    }
    return nullptr;
}

/// One view for each plan that the daemon tells of. A trends event spans the day that was tested,
/// which makes the plans the daemon's own, whatever this computer's clock says.
std::vector<TrendView> viewsOf(const Answer& answer, const KSEventArray& events, KSDate now) {
    const auto plans = answer.trends.empty()
                           ? analyticsPlansAt(now)
                           : analyticsPlansOfDay(answer.trends.front()->endDate());
    std::vector<TrendView> views;
    for (const auto& plan : plans) {
        const auto event = trendsEventOf(*plan, answer.trends);
        std::optional<KSTrendsVerdict> verdict;
        if (answer.error) {
            verdict = verdictIn(answer.error->description(), plan->keyword);
        } else if (event) {
            const auto code = valueForKey(*event->trends, trendskey::kTrends).asInteger();
            if (code) verdict = static_cast<KSTrendsVerdict>(*code);
        }
        if (verdict) views.emplace_back(plan, events, *verdict, event);
    }
    return views;
}

std::string textOf(const std::vector<TrendView>& views, const Screen& screen) {
    std::string text;
    bool agree = true;
    for (const auto& view : views) {
        text += view.text(screen);
        agree = agree && view.agrees();
    }
    if (!agree) {
        text +=
            "Figures are left out where the daemon looked at other days than this command, which "
            "goes by its own clock and time zone; --now sets the clock.\n";
    }
    return text;
}

std::string jsonOf(const std::vector<TrendView>& views) {
    std::vector<KSDictionary> records;
    records.reserve(views.size());
    for (const auto& view : views) records.push_back(view.json());
    return jsonRecords(records);
}

}  // namespace

int showTrends(const Console& console, const std::string& file, const std::string& nowWord) {
    KSDate now = SystemClock().now();
    if (!nowWord.empty()) {
        const auto time = parseTime(nowWord, now);
        if (!time) return console.usage(fmt::format("\"{}\" is not a time; see --help", nowWord));
        now = time->date;
    }
    std::expected<KSEventArray, KSError> events;
    if (!file.empty()) events = eventsOfFile(file);
    if (!events) return console.fail(events.error());
    const auto client = console.connect();
    if (!client) return console.fail(client.error());
    if (file.empty()) events = storedEvents(**client);
    if (!events) return console.fail(events.error());

    Answer answer;
    auto trends = (*client)->analyzeTrendsInEvents(*events);
    console.endProgress();
    if (trends) {
        answer.trends = std::move(*trends);
    } else {
        if (!namesVerdicts(trends.error())) return console.fail(trends.error());
        answer.error = trends.error();
    }
    const auto views = viewsOf(answer, *events, now);
    const int status =
        console.print(console.json() ? jsonOf(views) : textOf(views, console.screen()));
    return answer.error && status == kDone ? console.fail(*answer.error) : status;
}

}  // namespace keepsakes
