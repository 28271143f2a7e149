// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <span>
#include <string_view>

namespace keepsakes {

/// One kind of workout: its stable code and the name that events and rules carry.
struct Activity {
    int code;
    std::string_view name;
};

inline constexpr int kActivityHiking = 24;

/// Every activity the health store knows; codes and names are distinct. What stored events hold is
/// the name, so a name never changes.
std::span<const Activity> activityCatalogue();

/// The name of a code; nothing for a code that is not in the catalogue.
std::optional<std::string_view> activityName(int code);

/// The code of a name, exactly as the catalogue spells it.
std::optional<int> activityCode(std::string_view name);

}  // namespace keepsakes
