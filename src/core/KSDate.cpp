// SPDX-License-Identifier: Apache-2.0
#include "core/KSDate.h"

#include <fmt/format.h>

#include <chrono>
#include <cmath>
#include <cstdint>

namespace keepsakes {

namespace {

/// A cursor over the text; every reader leaves it where it was when it answers no.
class Cursor {
  public:
    explicit Cursor(std::string_view text) : rest_(text) {}

    bool atEnd() const { return rest_.empty(); }

    bool accept(std::string_view anyOf) {
        if (rest_.empty() || anyOf.find(rest_.front()) == std::string_view::npos) return false;
        last_ = rest_.front();
        rest_.remove_prefix(1);
        return true;
    }
    char last() const { return last_; }

    std::optional<int> digits(std::size_t count) {
        if (rest_.size() < count) return std::nullopt;
        int value = 0;
        for (char c : rest_.substr(0, count)) {
            if (c < '0' || c > '9') return std::nullopt;
            value = value * 10 + (c - '0');
        }
        rest_.remove_prefix(count);
        return value;
    }

    std::optional<double> fraction() {
        double value = 0;
        double scale = 0.1;
        bool any = false;
        while (auto digit = digits(1)) {
            value += *digit * scale;
            scale /= 10;
            any = true;
        }
        return any ? std::optional(value) : std::nullopt;
    }

  private:
    std::string_view rest_;
    char last_ = 0;
};

struct TimeOfDay {
    int hour = 0;
    int minute = 0;
    int second = 0;
    double fraction = 0;
};

std::optional<TimeOfDay> readTime(Cursor& in) {
    TimeOfDay time;
    auto hour = in.digits(2);
    if (!hour || !in.accept(":")) return std::nullopt;
    auto minute = in.digits(2);
    if (!minute || *hour > 24 || *minute > 59) return std::nullopt;
    time.hour = *hour;
    time.minute = *minute;
    if (in.accept(":")) {
        auto second = in.digits(2);
        if (!second || *second > 60) return std::nullopt;
        time.second = *second;
        if (in.accept(".,")) {
            auto fraction = in.fraction();
            if (!fraction) return std::nullopt;
            time.fraction = *fraction;
        }
    }
    const bool pastTheHour = time.minute != 0 || time.second != 0 || time.fraction != 0;
    if (time.hour == 24 && pastTheHour) return std::nullopt;
    return time;
}

std::optional<int> readOffset(Cursor& in) {
    if (in.accept("Zz")) return 0;
    if (!in.accept("+-")) return std::nullopt;
    const int sign = in.last() == '-' ? -1 : 1;
    auto hours = in.digits(2);
    if (!hours || *hours > 18) return std::nullopt;
    int minutes = 0;
    const bool colon = in.accept(":");
    if (auto read = in.digits(2)) {
        minutes = *read;
    } else if (colon) {
        return std::nullopt;
    }
    if (minutes > 59) return std::nullopt;
    return sign * (*hours * 3600 + minutes * 60);
}

}  // namespace

std::optional<ParsedDate> parseISO8601(std::string_view text) {
    namespace chr = std::chrono;
    Cursor in(text);
    auto year = in.digits(4);
    if (!year || !in.accept("-")) return std::nullopt;
    auto month = in.digits(2);
    if (!month || !in.accept("-")) return std::nullopt;
    auto day = in.digits(2);
    if (!day) return std::nullopt;
    const chr::year_month_day ymd{chr::year(*year), chr::month(static_cast<unsigned>(*month)),
                                  chr::day(static_cast<unsigned>(*day))};
    if (!ymd.ok()) return std::nullopt;

    TimeOfDay time;
    std::optional<int> offset;
    if (in.accept("Tt ")) {
        auto read = readTime(in);
        if (!read) return std::nullopt;
        time = *read;
        if (!in.atEnd()) {
            offset = readOffset(in);
            if (!offset) return std::nullopt;
        }
    }
    if (!in.atEnd()) return std::nullopt;

    const auto days = chr::sys_days(ymd).time_since_epoch().count();
    const double unixSeconds = static_cast<double>(days) * 86400.0 + time.hour * 3600 +
                               time.minute * 60 + time.second + time.fraction - offset.value_or(0);
    return ParsedDate{KSDate::fromUnix(unixSeconds), offset};
}

std::string formatISO8601(KSDate date) {
    namespace chr = std::chrono;
    constexpr double kYear1 = -62135596800000.0;  // in milliseconds
    constexpr double kYear10000 = 253402300800000.0;
    const double rounded = std::round(date.unixSeconds() * 1000);
    if (!(rounded >= kYear1 && rounded < kYear10000)) return "invalid";
    const auto total = static_cast<std::int64_t>(rounded);
    const chr::sys_time<chr::milliseconds> instant{chr::milliseconds(total)};
    const auto midnight = chr::floor<chr::days>(instant);
    const chr::year_month_day ymd(midnight);
    const chr::hh_mm_ss time(instant - midnight);
    auto text = fmt::format("{:04}-{:02}-{:02}T{:02}:{:02}:{:02}", static_cast<int>(ymd.year()),
                            static_cast<unsigned>(ymd.month()), static_cast<unsigned>(ymd.day()),
                            time.hours().count(), time.minutes().count(), time.seconds().count());
    if (time.subseconds().count() != 0) {
        text += fmt::format(".{:03}", time.subseconds().count());
    }
    return text + "Z";
}

}  // namespace keepsakes
