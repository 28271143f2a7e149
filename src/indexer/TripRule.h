// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <vector>

#include "platform/ProfileEventStore.h"

namespace keepsakes {

/// A suggested event of travel or lodging.
struct JourneyLeg {
    std::string identifier;
    KSDateInterval span;
    SuggestionCategory category = SuggestionCategory::none;
    std::string origin;       ///< Town; empty when nobody says.
    std::string destination;  ///< Likewise; of a stay, its town.
};

/// What begins at most so many seconds after the journey's last part ended belongs to it, wherever
/// it is: a day and a half.
inline constexpr double kLongestPause = 36 * 3600.0;
/// A way that goes on where the last one ended, or that leads home, belongs to the journey for so
/// many seconds: three weeks.
inline constexpr double kLongestStayAway = 21 * 86400.0;
/// Ways that follow each other within so many seconds are one part, with changes: six hours.
inline constexpr double kLongestChange = 6 * 3600.0;

/// The trips that the legs make, in whatever order those come; ascending by start. A journey ends
/// with the way that leads to where its first one began. It is a trip when it has a stay, or two
/// legs that lead back or lie on different days. Its title names the towns stayed in, else those
/// gone to, and the days: "Lisbon and Porto, 3 to 9 May".
std::vector<Trip> tripsOf(std::vector<JourneyLeg> legs);

}  // namespace keepsakes
