// SPDX-License-Identifier: Apache-2.0
#include "sources/KSPhotoKeepsakeTags.h"

#include <array>

namespace keepsakes {

namespace {

struct Tag {
    std::string_view word;
    int coarseGroup;
};

/// In the order of the tag numbers, from 1 on.
constexpr auto kTags = std::to_array<Tag>({
    {KSKeepsakeInferenceTagStringValue_Baby, 7},
    {KSKeepsakeInferenceTagStringValue_Pet, 7},
    {KSKeepsakeInferenceTagStringValue_Trip, 8},
    {KSKeepsakeInferenceTagStringValue_Nature, 4},
    {KSKeepsakeInferenceTagStringValue_Mountain, 4},
    {KSKeepsakeInferenceTagStringValue_Beach, 4},
    {KSKeepsakeInferenceTagStringValue_Home, 1},
    {KSKeepsakeInferenceTagStringValue_Work, 1},
    {KSKeepsakeInferenceTagStringValue_FrequentLocation, 1},
    {KSKeepsakeInferenceTagStringValue_Activity, 6},
    {KSKeepsakeInferenceTagStringValue_Hiking, 6},
    {KSKeepsakeInferenceTagStringValue_Climbing, 6},
    {KSKeepsakeInferenceTagStringValue_Beaching, 6},
    {KSKeepsakeInferenceTagStringValue_Diving, 6},
    {KSKeepsakeInferenceTagStringValue_WinterSport, 6},
    {KSKeepsakeInferenceTagStringValue_Entertainment, 8},
    {KSKeepsakeInferenceTagStringValue_AmusementPark, 3},
    {KSKeepsakeInferenceTagStringValue_Performance, 3},
    {KSKeepsakeInferenceTagStringValue_Concert, 3},
    {KSKeepsakeInferenceTagStringValue_Festival, 3},
    {KSKeepsakeInferenceTagStringValue_Theater, 3},
    {KSKeepsakeInferenceTagStringValue_Dance, 2},
    {KSKeepsakeInferenceTagStringValue_SportEvent, 6},
    {KSKeepsakeInferenceTagStringValue_NightOut, 2},
    {KSKeepsakeInferenceTagStringValue_Museum, 3},
    {KSKeepsakeInferenceTagStringValue_Celebration, 5},
    {KSKeepsakeInferenceTagStringValue_Birthday, 5},
    {KSKeepsakeInferenceTagStringValue_Anniversary, 5},
    {KSKeepsakeInferenceTagStringValue_Wedding, 5},
    {KSKeepsakeInferenceTagStringValue_HolidayEvent, 2},
    {KSKeepsakeInferenceTagStringValue_Gathering, 2},
});

}  // namespace

const std::map<std::string_view, int>& KSPhotoKeepsakeTags::getInferenceTagMap() {
    static const auto map = [] {
        std::map<std::string_view, int> numbers;
        int number = 0;
        for (const auto& tag : kTags) numbers.emplace(tag.word, ++number);
        return numbers;
    }();
    return map;
}

std::optional<int> KSPhotoKeepsakeTags::getCoarseInferenceTag(int tag) {
    if (tag < 1 || tag > static_cast<int>(kTags.size())) return std::nullopt;
    return kTags[static_cast<std::size_t>(tag - 1)].coarseGroup;
}

}  // namespace keepsakes
