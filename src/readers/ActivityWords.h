// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string_view>

namespace keepsakes {

/// What the type of a recorded track says.
struct ActivityWord {
    enum class Meaning {
        silent,     ///< Nothing: no type, "other", or a word that the table does not hold.
        transport,  ///< The owner was carried: no workout.
        activity,   ///< The activity of `code`.
    };
    Meaning meaning = Meaning::silent;
    int code = 0;  ///< Of the activity catalogue.

    friend bool operator==(const ActivityWord&, const ActivityWord&) = default;
};

/// Looks a type up: any spelling of the catalogue's names, the words that watches and apps write
/// for them, and the numbers that some write in their place (docs/device-data.md has the table).
ActivityWord activityOfWord(std::string_view type);

}  // namespace keepsakes
