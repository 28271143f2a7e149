// SPDX-License-Identifier: Apache-2.0
#include "readers/CalendarZones.h"

#include <libical/ical.h>
#include <unicode/basictz.h>
#include <unicode/timezone.h>

#include <cctype>
#include <charconv>
#include <chrono>
#include <cmath>
#include <cstdlib>
#include <optional>

#include "core/Calendar.h"
#include "readers/ReaderLimits.h"

namespace keepsakes {

namespace {

/// A component that libical made.
struct FreeComponent {
    void operator()(icalcomponent* component) const { icalcomponent_free(component); }
};
struct FreeZone {
    void operator()(icaltimezone* zone) const { icaltimezone_free(zone, 1); }
};
using ZonePointer = std::unique_ptr<icaltimezone, FreeZone>;

bool isKnown(const icu::TimeZone& zone) { return zone != icu::TimeZone::getUnknown(); }

std::unique_ptr<icu::TimeZone> databaseZone(std::string_view name) {
    // ICU would take "GMT+2" and "EST5EDT" as well; what is asked here are places and UTC.
    const bool isUtc = name == "UTC" || name == "GMT" || name == "Z";
    if (!isUtc && name.find('/') == std::string_view::npos) return nullptr;
    const auto id = icu::UnicodeString::fromUTF8(isUtc ? "Etc/UTC" : std::string(name));
    std::unique_ptr<icu::TimeZone> zone(icu::TimeZone::createTimeZone(id));
    return zone && isKnown(*zone) ? std::move(zone) : nullptr;
}

/// The zone that the name's last parts are a name of.
std::unique_ptr<icu::TimeZone> placeZone(std::string_view name) {
    for (std::string_view rest = name;;) {
        if (auto zone = databaseZone(rest)) return zone;
        const auto slash = rest.find('/');
        if (slash == std::string_view::npos) return nullptr;
        rest.remove_prefix(slash + 1);
    }
}

std::unique_ptr<icu::TimeZone> windowsZone(const std::string& name) {
    UErrorCode status = U_ZERO_ERROR;
    icu::UnicodeString id;
    icu::TimeZone::getIDForWindowsID(icu::UnicodeString::fromUTF8(name), nullptr, id, status);
    if (U_FAILURE(status) || id.isEmpty()) return nullptr;
    return std::unique_ptr<icu::TimeZone>(icu::TimeZone::createTimeZone(id));
}

/// The definition as libical reads it, when all its changes recur by the year at most: one that
/// changes each second would be computed to the end of time.
ZonePointer definedZone(const std::string& text) {
    std::unique_ptr<icalcomponent, FreeComponent> component(
        icalcomponent_new_from_string(text.c_str()));
    if (!component || icalcomponent_isa(component.get()) != ICAL_VTIMEZONE_COMPONENT) {
        return nullptr;
    }
    int observances = 0;
    for (auto* part = icalcomponent_get_first_component(component.get(), ICAL_ANY_COMPONENT); part;
         part = icalcomponent_get_next_component(component.get(), ICAL_ANY_COMPONENT)) {
        const bool isObservance = icalcomponent_isa(part) == ICAL_XSTANDARD_COMPONENT ||
                                  icalcomponent_isa(part) == ICAL_XDAYLIGHT_COMPONENT;
        if (!isObservance) continue;
        ++observances;
        if (!icalcomponent_get_first_property(part, ICAL_DTSTART_PROPERTY) ||
            !icalcomponent_get_first_property(part, ICAL_TZOFFSETTO_PROPERTY)) {
            return nullptr;
        }
        for (auto* rule = icalcomponent_get_first_property(part, ICAL_RRULE_PROPERTY); rule;
             rule = icalcomponent_get_next_property(part, ICAL_RRULE_PROPERTY)) {
            const auto recurrence = icalproperty_get_rrule(rule);
            if (recurrence.freq != ICAL_YEARLY_RECURRENCE || recurrence.interval < 1) {
                return nullptr;
            }
        }
    }
    if (observances == 0) return nullptr;
    ZonePointer zone(icaltimezone_new());
    if (!zone || icaltimezone_set_component(zone.get(), component.get()) == 0) return nullptr;
    component.release();  // NOLINT(bugprone-unused-return-value): the zone's now
    return zone;
}

/// "UTC+11", "GMT-3:30", "(UTC+01:00) Amsterdam", "+0200"; in seconds.
std::optional<int> offsetInName(std::string_view name) {
    const auto sign = name.find_first_of("+-");
    if (sign == std::string_view::npos) return std::nullopt;
    auto before = name.substr(0, sign);
    while (before.starts_with('(') || before.starts_with('/')) before.remove_prefix(1);
    if (!before.empty() && before != "UTC" && before != "GMT" && before != "Etc/GMT") {
        return std::nullopt;
    }
    std::string digits;
    for (const char c : name.substr(sign + 1)) {
        if (c == ':' && digits.size() < 3) continue;
        if (std::isdigit(static_cast<unsigned char>(c)) == 0) break;
        digits += c;
    }
    if (digits.empty() || digits.size() > 4) return std::nullopt;
    const int number = std::stoi(digits);
    const int seconds =
        digits.size() <= 2 ? number * 3600 : (number / 100 * 60 + number % 100) * 60;
    const int offset = name[sign] == '-' ? -seconds : seconds;
    return limits::isOffset(offset) ? std::optional(offset) : std::nullopt;
}

icaltimetype icalTime(KSDate local) {
    using namespace std::chrono;
    const auto whole = static_cast<std::int64_t>(std::floor(local.unixSeconds()));
    const sys_seconds time{seconds{whole}};
    const auto day = floor<days>(time);
    const year_month_day date(day);
    const hh_mm_ss clock(time - day);
    icaltimetype result = icaltime_null_time();
    result.year = static_cast<int>(date.year());
    result.month = static_cast<int>(static_cast<unsigned>(date.month()));
    result.day = static_cast<int>(static_cast<unsigned>(date.day()));
    result.hour = static_cast<int>(clock.hours().count());
    result.minute = static_cast<int>(clock.minutes().count());
    result.second = static_cast<int>(clock.seconds().count());
    return result;
}

}  // namespace

struct CalendarZones::Zone {
    std::unique_ptr<icu::TimeZone> known;
    ZonePointer defined;
    std::optional<int> offset;  ///< In seconds.
    bool isUnknown = false;
};

CalendarZones::CalendarZones() { icalerror_set_errors_are_fatal(0); }
CalendarZones::~CalendarZones() = default;

void CalendarZones::define(const std::string& name, const std::string& component) {
    definitions_.try_emplace(name, component);
}

CalendarZones::Zone& CalendarZones::zoneOf(const std::string& name) {
    auto& zone = zones_[name];
    if (zone) return *zone;
    zone = std::make_unique<Zone>();
    if (name.empty()) return *zone;
    zone->known = placeZone(name);
    if (!zone->known) zone->known = windowsZone(name);
    if (zone->known) return *zone;
    if (const auto found = definitions_.find(name); found != definitions_.end()) {
        zone->defined = definedZone(found->second);
    }
    if (zone->defined) return *zone;
    zone->offset = offsetInName(name);
    zone->isUnknown = !zone->offset;
    return *zone;
}

bool CalendarZones::isUnknown(const std::string& name) { return zoneOf(name).isUnknown; }

KSDate CalendarZones::instantOf(KSDate local, const std::string& name) {
    const auto& zone = zoneOf(name);
    if (zone.offset) return local - *zone.offset;
    if (zone.defined) {
        auto time = icalTime(local);
        int isDaylight = 0;
        return local - icaltimezone_get_utc_offset(zone.defined.get(), &time, &isDaylight);
    }
    const auto* basic = dynamic_cast<const icu::BasicTimeZone*>(zone.known.get());
    if (!basic) return calendar::fromLocal(local);
    std::int32_t raw = 0;
    std::int32_t saving = 0;
    UErrorCode status = U_ZERO_ERROR;
    basic->getOffsetFromLocal(local.unixSeconds() * 1000, UCAL_TZ_LOCAL_FORMER,
                              UCAL_TZ_LOCAL_FORMER, raw, saving, status);
    return U_SUCCESS(status) ? local - (raw + saving) / 1000.0 : local;
}

KSDate CalendarZones::localOf(KSDate instant, const std::string& name) {
    const auto& zone = zoneOf(name);
    if (zone.offset) return instant + *zone.offset;
    if (zone.defined) {
        auto time = icalTime(instant);
        int isDaylight = 0;
        return instant +
               icaltimezone_get_utc_offset_of_utc_time(zone.defined.get(), &time, &isDaylight);
    }
    if (!zone.known) return instant + calendar::offsetAt(instant);
    std::int32_t raw = 0;
    std::int32_t saving = 0;
    UErrorCode status = U_ZERO_ERROR;
    zone.known->getOffset(instant.unixSeconds() * 1000, 0, raw, saving, status);
    return U_SUCCESS(status) ? instant + (raw + saving) / 1000.0 : instant;
}

}  // namespace keepsakes
