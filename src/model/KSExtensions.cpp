// SPDX-License-Identifier: Apache-2.0
#include "model/KSExtensions.h"

#include <fmt/format.h>

#include <algorithm>

#include "core/Calendar.h"

namespace keepsakes::KSExtensions {

KSEventArray sortKSEventArrayByStartDate(KSEventArray events) {
    std::ranges::stable_sort(events, {},
                             [](const auto& event) { return event->startDate().seconds; });
    return events;
}

KSEventArray sortKSEventArrayByEndDate(KSEventArray events) {
    std::ranges::stable_sort(events, {},
                             [](const auto& event) { return event->endDate().seconds; });
    return events;
}

std::optional<KSDateInterval> getDurationOfKSEventArray(const KSEventArray& events) {
    if (events.empty()) return std::nullopt;
    KSDateInterval envelope{events.front()->startDate(), events.front()->endDate()};
    for (const auto& event : events) {
        envelope.start.seconds = std::min(envelope.start.seconds, event->startDate().seconds);
        envelope.end.seconds = std::max(envelope.end.seconds, event->endDate().seconds);
    }
    return envelope;
}

std::string stringFromDate(KSDate date) {
    return fmt::format("{:f} ({})", date.seconds, calendar::shortDateLongTime(date));
}

bool betweenDate(KSDate date, std::optional<KSDate> bound, std::optional<KSDate> otherBound) {
    if (!bound || !otherBound) return false;
    const auto [first, last] = std::minmax(bound->seconds, otherBound->seconds);
    return first <= date.seconds && date.seconds <= last;
}

bool isBeforeDate(KSDate date, KSDate other) { return date < other; }
bool isOnOrBefore(KSDate date, KSDate other) { return date <= other; }
bool isAfterDate(KSDate date, KSDate other) { return date > other; }
bool isOnOrAfter(KSDate date, KSDate other) { return date >= other; }

KSDate startOfDay(KSDate date) { return calendar::startOfDay(date); }

KSDate startOfDayWithBoundaryOfADay(KSDate date, double boundarySeconds) {
    return calendar::startOfDay(date - boundarySeconds) + boundarySeconds;
}

int hours(KSDate date) { return calendar::hours(date); }
int minutes(KSDate date) { return calendar::minutes(date); }

}  // namespace keepsakes::KSExtensions
