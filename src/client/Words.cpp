// SPDX-License-Identifier: Apache-2.0
#include "client/Words.h"

#include <charconv>
#include <cstdint>

#include "core/Calendar.h"
#include "core/KSDate.h"
#include "core/Text.h"

namespace keepsakes {

namespace {

constexpr std::size_t kDateOnly = std::string_view("2024-06-15").size();

template <class Number>
std::optional<Number> wholeNumber(std::string_view text) {
    Number number = 0;
    const auto* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, number);
    return error == std::errc() && stop == end ? std::optional(number) : std::nullopt;
}

/// The same time of day `days` calendar days before, whatever the days' lengths.
KSDate daysBefore(KSDate date, std::uint32_t days) {
    const auto local = date + calendar::offsetAt(date);
    return calendar::fromLocal(local - kDay * days);
}

std::optional<KSDate> parseAgo(std::string_view word, KSDate now) {
    if (word.size() < 2) return std::nullopt;
    const auto count = wholeNumber<std::uint32_t>(word.substr(0, word.size() - 1));
    if (!count || *count > 100000) return std::nullopt;
    switch (word.back()) {
        case 'm':
            return now - 60.0 * *count;
        case 'h':
            return now - kHour * *count;
        case 'd':
            return daysBefore(now, *count);
        case 'w':
            return daysBefore(now, 7 * *count);
        default:
            return std::nullopt;
    }
}

/// Category 6 is unused and 0 means any.
bool isCategory(std::uint64_t number) { return number >= 1 && number <= 12 && number != 6; }

}  // namespace

// The longest day has 25 hours, the shortest 23.
KSDate GivenTime::end() const {
    return wholeDay ? calendar::startOfDay(calendar::startOfDay(date) + 26 * kHour) : date;
}

std::optional<GivenTime> parseTime(std::string_view word, KSDate now) {
    const auto lowered = lowerCased(word);
    if (lowered == "now") return GivenTime{now};
    const auto today = calendar::startOfDay(now);
    if (lowered == "today") return GivenTime{today, true};
    if (lowered == "yesterday") return GivenTime{calendar::startOfDay(today - kHour), true};
    if (const auto ago = parseAgo(lowered, now)) return GivenTime{*ago};
    const auto parsed = parseISO8601(word);
    if (!parsed) return std::nullopt;
    const auto date = parsed->offsetSeconds ? parsed->date : calendar::fromLocal(parsed->date);
    return GivenTime{date, word.size() == kDateOnly};
}

std::optional<KSEventCategory> parseCategory(std::string_view word) {
    if (const auto number = wholeNumber<std::uint64_t>(word)) {
        return *number == 0 ? std::nullopt : std::optional(static_cast<KSEventCategory>(*number));
    }
    const auto lowered = lowerCased(word);
    for (std::uint64_t number = 1; number <= 12; ++number) {
        const auto category = static_cast<KSEventCategory>(number);
        if (isCategory(number) && lowerCased(KSEvent::describeCategory(category)) == lowered) {
            return category;
        }
    }
    return std::nullopt;
}

std::string categoryNames() {
    std::string names;
    for (std::uint64_t number = 1; number <= 12; ++number) {
        if (!isCategory(number)) continue;
        if (!names.empty()) names += ", ";
        names += KSEvent::describeCategory(static_cast<KSEventCategory>(number));
    }
    return names;
}

}  // namespace keepsakes
