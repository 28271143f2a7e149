// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <map>
#include <optional>
#include <string_view>

namespace keepsakes {

/// The inference words of photo keepsakes, one constant a word.
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Baby = "baby";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Pet = "pet";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Trip = "trip";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Nature = "nature";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Mountain = "mountain";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Beach = "beach";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Home = "home";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Work = "work";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_FrequentLocation =
    "frequentLocation";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Activity = "Activity";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Hiking = "Hiking";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Climbing = "Climbing";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Beaching = "Beaching";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Diving = "Diving";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_WinterSport = "WinterSport";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Entertainment = "Entertainment";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_AmusementPark = "AmusementPark";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Performance = "Performance";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Concert = "Concert";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Festival = "Festival";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Theater = "Theater";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Dance = "Dance";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_SportEvent = "SportEvent";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_NightOut = "NightOut";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Museum = "Museum";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Celebration = "Celebration";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Birthday = "Birthday";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Anniversary = "Anniversary";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Wedding = "Wedding";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_HolidayEvent = "HolidayEvent";
inline constexpr std::string_view KSKeepsakeInferenceTagStringValue_Gathering = "Gathering";

/// Two fixed tables: inference words to tag numbers, and tag numbers to coarse groups.
struct KSPhotoKeepsakeTags {
    static const std::map<std::string_view, int>& getInferenceTagMap();
    /// The coarse group of a tag; nothing for a number outside 1 to 31.
    static std::optional<int> getCoarseInferenceTag(int tag);
};

}  // namespace keepsakes
