// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <array>
#include <charconv>
#include <chrono>

#include "readers/MailHeaders.h"

namespace keepsakes {

namespace {

constexpr int kHour = 3600;

/// Words and numbers of a date, one by one; comments are passed over.
class DateWords {
  public:
    explicit DateWords(std::string_view text) : text_(text) {}

    std::string_view next() {
        skip();
        const auto end = std::min(text_.find_first_of(" \t\r\n(),"), text_.size());
        const auto word = text_.substr(0, end);
        text_.remove_prefix(end);
        return word;
    }

  private:
    void skip() {
        int depth = 0;
        while (!text_.empty()) {
            const char c = text_.front();
            if (c == '(') ++depth;
            if (c == ')' && depth > 0) --depth;
            if (depth == 0 && std::string_view(" \t\r\n,)").find(c) == std::string_view::npos) {
                return;
            }
            text_.remove_prefix(1);
        }
    }

    std::string_view text_;
};

std::optional<int> number(std::string_view digits, std::size_t most) {
    int value = 0;
    const auto* end = digits.data() + digits.size();
    const auto [stop, error] = std::from_chars(digits.data(), end, value);
    const bool good = error == std::errc() && stop == end && digits.size() <= most && value >= 0;
    return good ? std::optional(value) : std::nullopt;
}

std::string lowered(std::string_view word) {
    std::string text(word);
    for (char& c : text) {
        if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
    }
    return text;
}

std::optional<unsigned> monthOf(std::string_view word) {
    static constexpr std::array<std::string_view, 12> kMonths{
        "jan", "feb", "mar", "apr", "may", "jun", "jul", "aug", "sep", "oct", "nov", "dec"};
    const auto* const found = std::ranges::find(kMonths, lowered(word.substr(0, 3)));
    if (found == kMonths.end()) return std::nullopt;
    return static_cast<unsigned>(found - kMonths.begin()) + 1;
}

/// Two digits are of this century up to 49, three count from 1900.
std::optional<int> yearOf(std::string_view word) {
    const auto year = number(word, 4);
    if (!year || word.size() < 2) return std::nullopt;
    if (word.size() == 2) return *year + (*year < 50 ? 2000 : 1900);
    return word.size() == 3 ? *year + 1900 : *year;
}

/// Seconds since midnight of "hh:mm" or "hh:mm:ss".
std::optional<int> timeOf(std::string_view word) {
    std::array<int, 3> parts{};
    for (std::size_t part = 0; part < parts.size(); ++part) {
        const auto end = std::min(word.find(':'), word.size());
        const auto value = number(word.substr(0, end), 2);
        if (!value) return std::nullopt;
        parts[part] = *value;
        if (end == word.size()) {
            if (part == 0) return std::nullopt;
            break;
        }
        word.remove_prefix(end + 1);
    }
    if (parts[0] > 23 || parts[1] > 59 || parts[2] > 60) return std::nullopt;
    return parts[0] * kHour + parts[1] * 60 + parts[2];
}

/// Seconds east of UTC. A zone that is missing or means nothing is UTC, as RFC 5322, 4.3 asks.
int zoneOf(std::string_view word) {
    if (word.size() == 5 && (word[0] == '+' || word[0] == '-')) {
        const auto hours = number(word.substr(1, 2), 2);
        const auto minutes = number(word.substr(3, 2), 2);
        if (!hours || !minutes) return 0;
        const int seconds = *hours * kHour + *minutes * 60;
        return word[0] == '-' ? -seconds : seconds;
    }
    static constexpr std::string_view kZones = "pmce";
    const auto zone = lowered(word);
    if (zone.size() != 3 || zone[2] != 't' || (zone[1] != 's' && zone[1] != 'd')) return 0;
    const auto west = kZones.find(zone[0]);
    if (west == std::string_view::npos) return 0;
    return (static_cast<int>(west) - 8 + (zone[1] == 'd' ? 1 : 0)) * kHour;
}

}  // namespace

std::optional<KSDate> parseMailDate(std::string_view text) {
    DateWords words(text);
    auto word = words.next();
    if (!word.empty() && (word.front() < '0' || word.front() > '9')) word = words.next();
    const auto day = number(word, 2);
    const auto month = monthOf(words.next());
    const auto year = yearOf(words.next());
    const auto time = timeOf(words.next());
    if (!day || !month || !year || !time) return std::nullopt;
    const std::chrono::year_month_day date{std::chrono::year(*year), std::chrono::month(*month),
                                           std::chrono::day(static_cast<unsigned>(*day))};
    if (!date.ok()) return std::nullopt;
    const auto midnight =
        std::chrono::duration<double>(std::chrono::sys_days(date).time_since_epoch());
    return KSDate::fromUnix(midnight.count() + *time - zoneOf(words.next()));
}

}  // namespace keepsakes
