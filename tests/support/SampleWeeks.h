// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "support/TestEvents.h"

namespace keepsakes::samples {

/// Four weeks before `today` (the start of a day) that say something on every kind of trend, by
/// ascending start: each day a workout, a day at work, music and a contact, each a little longer
/// every third day. Yesterday's workout alone is three hours.
inline KSEventArray weeks(double today) {
    constexpr double kHour = 3600;
    KSEventArray events;
    std::uint32_t number = 1;
    for (int daysAgo = 28; daysAgo >= 1; --daysAgo) {
        const double day = today - 86400.0 * daysAgo;
        const double more = daysAgo % 3;
        const double run = daysAgo == 1 ? 3 * kHour : (20 + 10 * more) * 60;
        events.push_back(makeWorkout(number++, day + 2 * kHour, day + 2 * kHour + run, "Running"));
        auto work = makeVisit(number++, day + 6 * kHour, day + (14 + more) * kHour, "Office");
        work->placeUserType = 2;
        events.push_back(std::move(work));
        auto music = makeEvent(number++, day + 15 * kHour, day + 16 * kHour,
                               KSEventProvider::foresight, KSEventCategory::leisureMedia);
        music->mediaSumTimePlayed = 600 * (1 + more);
        events.push_back(std::move(music));
        auto friends = makeEvent(number++, day + 17 * kHour, day + 18 * kHour,
                                 KSEventProvider::foresight, KSEventCategory::significantContact);
        friends->interactions.emplace();
        for (int call = 0; call <= daysAgo % 3; ++call) {
            friends->interactions->push_back({{"mechanism", 3}});
        }
        events.push_back(std::move(friends));
    }
    return events;
}

}  // namespace keepsakes::samples
