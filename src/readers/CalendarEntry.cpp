// SPDX-License-Identifier: Apache-2.0
#include "readers/CalendarEntry.h"

#include <algorithm>
#include <charconv>
#include <utility>

#include "core/Text.h"
#include "readers/ReaderLimits.h"
#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

/// At most so many bytes of clean text, without a broken character at its end.
std::string cut(std::string text, std::size_t most) {
    if (text.size() <= most) return text;
    while (most > 0 && (static_cast<unsigned char>(text[most]) & 0xC0U) == 0x80U) --most;
    text.resize(most);
    return text;
}

std::optional<CalendarTime> timeOf(std::string_view text, const CardLine& line) {
    auto time = parseCalendarTime(std::string(text));
    if (time && !time->isUtc && !time->isDate) time->zone = line.parameter("TZID");
    return time;
}

/// Calls `take` for each of the values that commas separate.
template <class Take>
void eachValue(std::string_view text, const Take& take) {
    while (!text.empty()) {
        const auto end = std::min(text.find(','), text.size());
        take(text.substr(0, end));
        text.remove_prefix(std::min(end + 1, text.size()));
    }
}

}  // namespace

std::string boundedText(std::string_view text) { return cut(cardText(text), limits::kLongestName); }

void EntryBuilder::line(const CardLine& line) {
    const auto& name = line.name;
    if (name == "UID") {
        entry_.uid = boundedText(line.text);
        text_.origin += " " + entry_.uid;
    } else if (name == "SUMMARY") {
        entry_.title = boundedText(line.text);
    } else if (name == "LOCATION") {
        entry_.location = boundedText(line.text);
    } else if (name == "DESCRIPTION") {
        text_.description = cut(cardText(line.text), limits::kLongestDescription);
    } else if (name == "CATEGORIES") {
        eachValue(line.text, [this](std::string_view one) {
            if (text_.categories.size() < limits::kMostNames) {
                text_.categories.push_back(boundedText(one));
            }
        });
    } else if (name == "DTSTART") {
        time(line, entry_.start);
    } else if (name == "DTEND") {
        time(line, entry_.end);
    } else if (name == "DURATION") {
        entry_.duration = parseCalendarDuration(line.text);
    } else if (name == "RECURRENCE-ID") {
        time(line, entry_.recurrenceId);
        entry_.andFuture = lowerCased(line.parameter("RANGE")) == "thisandfuture";
    } else if (name == "RRULE") {
        if (entry_.rules.size() < limits::kMostRules) entry_.rules.push_back(line.text);
    } else if (name == "RDATE" || name == "EXDATE") {
        dates(line);
    } else if (name == "STATUS") {
        entry_.isCancelled = lowerCased(cardText(line.text)) == "cancelled";
    } else if (name == "SEQUENCE") {
        const auto* const end = line.text.data() + line.text.size();
        std::from_chars(line.text.data(), end, entry_.sequence);
    } else if (name == "ATTENDEE") {
        attendee(line);
    } else if (name == "ORGANIZER" || name == "URL") {
        text_.origin.append(" ").append(boundedText(line.text));
    } else if (name.starts_with("X-")) {
        extension(line);
    }
}

void EntryBuilder::time(const CardLine& line, std::optional<CalendarTime>& into) {
    if (!into) into = timeOf(line.text, line);
}

void EntryBuilder::dates(const CardLine& line) {
    const bool isException = line.name == "EXDATE";
    eachValue(line.text, [this, &line, isException](std::string_view one) {
        const auto slash = one.find('/');
        const auto begin = timeOf(one.substr(0, slash), line);
        if (!begin) return;
        if (isException) {
            if (entry_.exceptions.size() < limits::kMostDates) entry_.exceptions.push_back(*begin);
            return;
        }
        if (entry_.extraDates.size() >= limits::kMostDates) return;
        ExtraDate date{.time = *begin, .seconds = std::nullopt};
        if (slash != std::string_view::npos) {
            const std::string rest(one.substr(slash + 1));
            const auto end = parseCalendarTime(rest);
            date.seconds = end ? end->local - begin->local : parseCalendarDuration(rest);
            if (date.seconds && *date.seconds < 0) date.seconds.reset();
        }
        entry_.extraDates.push_back(std::move(date));
    });
}

void EntryBuilder::attendee(const CardLine& line) {
    // A room is booked, it does not attend.
    const auto kind = lowerCased(line.parameter("CUTYPE"));
    if (kind == "room" || kind == "resource") return;
    auto name = boundedText(line.parameter("CN"));
    if (name.empty()) {
        name = boundedText(line.text);
        if (lowerCased(name).starts_with("mailto:")) name.erase(0, 7);
    }
    auto& all = entry_.attendees;
    if (name.empty() || all.size() >= limits::kMostAttendees ||
        std::ranges::find(all, name) != all.end()) {
        return;
    }
    all.push_back(std::move(name));
}

void EntryBuilder::extension(const CardLine& line) {
    // A reservation as data; other extensions tell nothing that is looked for.
    const bool isData = line.text.find("schema.org") != std::string::npos;
    if (isData && text_.extensions.size() < limits::kMostRules) {
        text_.extensions.push_back(line.text);
    }
}

CalendarEntry EntryBuilder::finish() {
    text_.title = entry_.title;
    text_.location = entry_.location;
    text_.attendees = entry_.attendees.size();
    if (entry_.start) {
        text_.localStart = entry_.start->local;
        text_.isAllDay = entry_.start->isDate;
    }
    if (!entry_.isCancelled) entry_.recognition = recognise(text_);
    return std::move(entry_);
}

}  // namespace keepsakes
