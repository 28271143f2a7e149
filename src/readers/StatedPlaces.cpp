// SPDX-License-Identifier: Apache-2.0
#include "readers/StatedPlaces.h"

#include <algorithm>
#include <charconv>
#include <limits>

#include "readers/PhotoWords.h"
#include "readers/Position.h"
#include "readers/ReaderLimits.h"
#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

/// Takes a number from the front, after blanks.
std::optional<double> takeNumber(std::string_view& text) {
    text.remove_prefix(std::min(text.find_first_not_of(' '), text.size()));
    double value = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (error != std::errc()) return std::nullopt;
    text.remove_prefix(static_cast<std::size_t>(end - text.data()));
    return value;
}

void skip(std::string_view& text, std::string_view prefix) {
    if (text.starts_with(prefix)) text.remove_prefix(prefix.size());
}

}  // namespace

std::optional<ParsedDate> TimeTally::take(const std::optional<ParsedDate>& parsed) {
    if (!parsed) {
        ++unreadable_;
        return std::nullopt;
    }
    if (!limits::isSane(parsed->date, now_)) {
        ++insane_;
        return std::nullopt;
    }
    ++taken_;
    return parsed;
}

std::optional<std::string> TimeTally::complaint() const {
    if (taken_ > 0) return std::nullopt;
    if (insane_ > 0) return "no timestamp lies between 1990-01-01 and a day from now";
    if (unreadable_ > 0) return "no timestamp can be read";
    return std::nullopt;
}

std::optional<ParsedDate> timeOf(const JsonScalar& value) {
    constexpr double kLeastMilliseconds = 1e11;
    if (const auto number = value.asNumber()) {
        const double seconds = *number < kLeastMilliseconds ? *number : *number / 1000;
        return ParsedDate{KSDate::fromUnix(seconds), std::nullopt};
    }
    if (!value.text) return std::nullopt;
    return parseISO8601(*value.text);
}

std::optional<GeoPoint> positionOfText(std::string_view text) {
    const bool isUri = text.starts_with("geo:");
    skip(text, "geo:");
    const auto latitude = takeNumber(text);
    skip(text, "°");
    if (!latitude || !text.starts_with(',')) return std::nullopt;
    text.remove_prefix(1);
    const auto longitude = takeNumber(text);
    skip(text, "°");
    if (!longitude || !(text.empty() || (isUri && (text[0] == ';' || text[0] == ',')))) {
        return std::nullopt;
    }
    return geoPoint(latitude, longitude);
}

float accuracyOf(const JsonScalar& value) {
    // Beyond the earth's half girth nothing is said.
    constexpr double kFarthest = 20'037'508;
    const auto meters = value.asNumber();
    if (!meters || !(*meters > 0 && *meters <= kFarthest)) {
        return std::numeric_limits<float>::quiet_NaN();
    }
    return static_cast<float>(*meters);
}

std::string nameOf(const JsonScalar& value) {
    if (!value.text || value.text->size() > limits::kLongestName) return {};
    return cleanText(*value.text);
}

PlaceUse useOfLabel(std::string_view label) {
    const auto folded = foldWord(label);
    for (const auto* prefix : {"", "inferred", "type"}) {
        if (folded == std::string(prefix) + "home") return PlaceUse::home;
        if (folded == std::string(prefix) + "work") return PlaceUse::work;
    }
    return PlaceUse::unknown;
}

PlaceUse useOfPlaceName(std::string_view name) {
    const auto word = inferenceOfKeyword(name);
    if (word == "home") return PlaceUse::home;
    return word == "work" ? PlaceUse::work : PlaceUse::unknown;
}

void addZone(std::vector<ZoneSpan>& zones, KSDateInterval span, int offsetSeconds) {
    constexpr double kLongestGap = 86400;
    if (!limits::isOffset(offsetSeconds)) return;
    if (!zones.empty() && zones.back().offsetSeconds == offsetSeconds &&
        span.start >= zones.back().span.start &&
        span.start - zones.back().span.end <= kLongestGap) {
        zones.back().span.end = std::max(zones.back().span.end, span.end);
    } else if (zones.size() < limits::kMostZoneSpans) {
        zones.push_back({span, offsetSeconds});
    }
}

}  // namespace keepsakes
