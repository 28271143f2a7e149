// SPDX-License-Identifier: Apache-2.0
#include "readers/Recurrence.h"

#include <fmt/format.h>
#include <libical/ical.h>

#include <algorithm>
#include <chrono>
#include <cmath>
#include <memory>

#include "readers/ReaderLimits.h"

namespace keepsakes {

namespace {

struct FreeIterator {
    void operator()(icalrecur_iterator* iterator) const { icalrecur_iterator_free(iterator); }
};

/// Nothing for what is no time of day on no day of the calendar.
std::optional<KSDate> localDate(const icaltimetype& time) {
    using namespace std::chrono;
    const year_month_day date{year{time.year}, month{static_cast<unsigned>(time.month)},
                              day{static_cast<unsigned>(time.day)}};
    if (time.year < 1 || time.year > 9999 || !date.ok()) return std::nullopt;
    double seconds = static_cast<double>(sys_days{date}.time_since_epoch().count()) * 86400;
    if (!time.is_date) {
        // A leap second is the one before it.
        if (time.hour > 23 || time.minute > 59 || time.second > 60) return std::nullopt;
        seconds += time.hour * 3600.0 + time.minute * 60.0 + std::min(time.second, 59);
    }
    return KSDate::fromUnix(seconds);
}

icaltimetype icalTime(KSDate local, bool isDate) {
    const auto unix = local.unixSeconds();
    const auto days = std::floor(unix / 86400);
    using namespace std::chrono;
    const year_month_day date{sys_days{std::chrono::days{static_cast<int>(days)}}};
    icaltimetype time = icaltime_null_time();
    time.year = static_cast<int>(date.year());
    time.month = static_cast<int>(static_cast<unsigned>(date.month()));
    time.day = static_cast<int>(static_cast<unsigned>(date.day()));
    time.is_date = isDate ? 1 : 0;
    if (isDate) return time;
    const auto seconds = static_cast<int>(unix - days * 86400);
    time.hour = seconds / 3600;
    time.minute = seconds / 60 % 60;
    time.second = seconds % 60;
    return time;
}

}  // namespace

std::optional<CalendarTime> parseCalendarTime(const std::string& text) {
    const auto time = icaltime_from_string(text.c_str());
    if (icaltime_is_null_time(time)) return std::nullopt;
    const auto local = localDate(time);
    if (!local) return std::nullopt;
    return CalendarTime{
        .local = *local, .isDate = time.is_date != 0, .isUtc = text.ends_with('Z'), .zone = {}};
}

std::optional<double> parseCalendarDuration(const std::string& text) {
    const auto duration = icaldurationtype_from_string(text.c_str());
    if (icaldurationtype_is_bad_duration(duration) || duration.is_neg != 0) return std::nullopt;
    return duration.weeks * 604800.0 + duration.days * 86400.0 + duration.hours * 3600.0 +
           duration.minutes * 60.0 + duration.seconds;
}

std::expected<std::vector<KSDate>, std::string> recurrences(
    const std::string& rule, const CalendarTime& start, KSDateInterval window,
    const std::function<KSDate(KSDate)>& localOf) {
    auto parsed = icalrecurrencetype_from_string(rule.c_str());
    if (parsed.freq == ICAL_NO_RECURRENCE || parsed.interval < 1 || parsed.count < 0) {
        return std::unexpected("a rule that cannot be read");
    }
    // By these, a rule that never holds would be searched for hours.
    if (parsed.freq == ICAL_SECONDLY_RECURRENCE || parsed.freq == ICAL_MINUTELY_RECURRENCE ||
        parsed.freq == ICAL_HOURLY_RECURRENCE) {
        return std::unexpected("a rule by the hour or more often");
    }
    if (icaltime_is_utc(parsed.until) && !start.isUtc) {
        // libical would compare it with local times as though they were UTC.
        if (const auto until = localDate(parsed.until)) {
            parsed.until = icalTime(localOf(*until), false);
        }
    }
    const std::unique_ptr<icalrecur_iterator, FreeIterator> iterator(
        icalrecur_iterator_new(parsed, icalTime(start.local, start.isDate)));
    if (!iterator) return std::unexpected("a rule that cannot be read");
    // A rule that counts has to be followed from its start.
    if (parsed.count == 0 && start.local < window.start) {
        icalrecur_iterator_set_start(iterator.get(), icalTime(window.start, start.isDate));
    }
    std::vector<KSDate> found;
    for (std::size_t step = 0;; ++step) {
        if (step == limits::kMostRuleSteps) return std::unexpected("a rule that goes on for ages");
        const auto time = icalrecur_iterator_next(iterator.get());
        const auto local = icaltime_is_null_time(time) ? std::nullopt : localDate(time);
        if (!local || *local > window.end) return found;
        if (*local < window.start) continue;
        if (found.size() == limits::kMostOccurrences) {
            return std::unexpected("a rule that holds too often");
        }
        found.push_back(*local);
    }
}

}  // namespace keepsakes
