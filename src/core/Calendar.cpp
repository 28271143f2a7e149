// SPDX-License-Identifier: Apache-2.0
#include "core/Calendar.h"

#include <unicode/basictz.h>
#include <unicode/calendar.h>
#include <unicode/datefmt.h>
#include <unicode/gregocal.h>
#include <unicode/smpdtfmt.h>
#include <unicode/timezone.h>

#include <chrono>
#include <cmath>
#include <memory>
#include <stdexcept>

namespace keepsakes::calendar {

namespace {

UDate toICU(KSDate date) { return date.unixSeconds() * 1000.0; }
KSDate fromICU(UDate date) { return KSDate::fromUnix(date / 1000.0); }

std::unique_ptr<icu::Calendar> calendarAt(KSDate date) {
    UErrorCode status = U_ZERO_ERROR;
    std::unique_ptr<icu::Calendar> calendar(icu::Calendar::createInstance(status));
    if (U_SUCCESS(status)) calendar->setTime(toICU(date), status);
    if (U_FAILURE(status)) throw std::runtime_error(u_errorName(status));
    return calendar;
}

int field(KSDate date, UCalendarDateFields which) {
    if (!std::isfinite(date.seconds)) return 0;
    UErrorCode status = U_ZERO_ERROR;
    const auto value = calendarAt(date)->get(which, status);
    return U_SUCCESS(status) ? value : 0;
}

std::string formatWith(const icu::DateFormat* format, KSDate date) {
    if (!format || !std::isfinite(date.seconds)) return "invalid";
    icu::UnicodeString text;
    format->format(toICU(date), text);
    std::string utf8;
    text.toUTF8String(utf8);
    return utf8;
}

}  // namespace

KSDate startOfDay(KSDate date) {
    if (!std::isfinite(date.seconds)) return date;
    auto calendar = calendarAt(date);
    UErrorCode status = U_ZERO_ERROR;
    // Taken from the day's own numbers: setting the hour to 0 would miss where midnight is skipped.
    const int year = calendar->get(UCAL_EXTENDED_YEAR, status);
    const int month = calendar->get(UCAL_MONTH, status);
    const int day = calendar->get(UCAL_DATE, status);
    calendar->clear();
    calendar->set(UCAL_EXTENDED_YEAR, year);
    calendar->set(UCAL_MONTH, month);
    calendar->set(UCAL_DATE, day);
    const UDate midnight = calendar->getTime(status);
    return U_SUCCESS(status) ? fromICU(midnight) : date;
}

int hours(KSDate date) { return field(date, UCAL_HOUR_OF_DAY); }
int minutes(KSDate date) { return field(date, UCAL_MINUTE); }
int weekday(KSDate date) { return field(date, UCAL_DAY_OF_WEEK); }

bool isWholeDays(KSDateInterval span) {
    const auto isMidnight = [](KSDate date) { return startOfDay(date) == date; };
    return span.end > span.start && isMidnight(span.start) &&
           (isMidnight(span.end) || isMidnight(span.end + 1));
}

int yearsBetween(KSDate from, KSDate to) {
    if (!std::isfinite(from.seconds) || !std::isfinite(to.seconds)) return 0;
    UErrorCode status = U_ZERO_ERROR;
    const int years = calendarAt(from)->fieldDifference(toICU(to), UCAL_YEAR, status);
    return U_SUCCESS(status) ? years : 0;
}

std::optional<KSDate> dateOfDay(int year, int month, int day) {
    const std::chrono::year_month_day numbers{std::chrono::year(year),
                                              std::chrono::month(static_cast<unsigned>(month)),
                                              std::chrono::day(static_cast<unsigned>(day))};
    if (month < 1 || day < 1 || !numbers.ok()) return std::nullopt;
    // Not ICU's strict mode, which also refuses a day whose midnight is skipped.
    UErrorCode status = U_ZERO_ERROR;
    icu::GregorianCalendar calendar(status);
    calendar.clear();
    calendar.set(year, month - 1, day);
    const UDate midnight = calendar.getTime(status);
    return U_SUCCESS(status) ? std::optional(fromICU(midnight)) : std::nullopt;
}

int offsetAt(KSDate date) {
    const std::unique_ptr<icu::TimeZone> zone(icu::TimeZone::createDefault());
    std::int32_t raw = 0;
    std::int32_t saving = 0;
    UErrorCode status = U_ZERO_ERROR;
    zone->getOffset(toICU(date), 0, raw, saving, status);
    return U_SUCCESS(status) ? (raw + saving) / 1000 : 0;
}

KSDate fromLocal(KSDate local) {
    if (!std::isfinite(local.seconds)) return local;
    const std::unique_ptr<icu::TimeZone> zone(icu::TimeZone::createDefault());
    std::int32_t raw = 0;
    std::int32_t saving = 0;
    UErrorCode status = U_ZERO_ERROR;
    // Every zone of ICU's own is a basic one.
    const auto* basic = dynamic_cast<const icu::BasicTimeZone*>(zone.get());
    if (!basic) return local;
    basic->getOffsetFromLocal(toICU(local), UCAL_TZ_LOCAL_FORMER, UCAL_TZ_LOCAL_FORMER, raw, saving,
                              status);
    return U_SUCCESS(status) ? local - (raw + saving) / 1000.0 : local;
}

std::string fullDateLongTime(KSDate date) {
    const std::unique_ptr<icu::DateFormat> format(
        icu::DateFormat::createDateTimeInstance(icu::DateFormat::kFull, icu::DateFormat::kLong));
    return formatWith(format.get(), date);
}

std::string shortDateLongTime(KSDate date) {
    const std::unique_ptr<icu::DateFormat> format(
        icu::DateFormat::createDateTimeInstance(icu::DateFormat::kShort, icu::DateFormat::kLong));
    return formatWith(format.get(), date);
}

std::string format(KSDate date, std::string_view pattern) {
    UErrorCode status = U_ZERO_ERROR;
    const icu::SimpleDateFormat format(
        icu::UnicodeString::fromUTF8({pattern.data(), static_cast<int32_t>(pattern.size())}),
        status);
    return U_SUCCESS(status) ? formatWith(&format, date) : "invalid";
}

}  // namespace keepsakes::calendar
