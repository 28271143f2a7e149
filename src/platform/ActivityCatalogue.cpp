// SPDX-License-Identifier: Apache-2.0
#include "platform/ActivityCatalogue.h"

#include <algorithm>
#include <array>

namespace keepsakes {

namespace {

constexpr auto kCatalogue = std::to_array<Activity>({
    // Endurance on foot, wheels, water, snow and ice, and the sports that are mostly running.
    {1, "Orienteering"},
    {6, "Basketball"},
    {8, "Boxing"},
    {11, "Cross Training"},
    {13, "Cycling"},
    {16, "Elliptical"},
    {22, "Handball"},
    {23, "Hand Cycling"},
    {24, "Hiking"},
    {25, "Ice Hockey"},
    {27, "Lacrosse"},
    {34, "Racquetball"},
    {35, "Rowing"},
    {36, "Rugby"},
    {37, "Running"},
    {41, "Soccer"},
    {44, "Stair Climbing"},
    {46, "Swimming"},
    {48, "Tennis"},
    {49, "Trail Running"},
    {51, "Water Polo"},
    {54, "Cross-Country Skiing"},
    {63, "High-Intensity Interval Training"},
    {64, "Jump Rope"},
    {65, "Kickboxing"},
    {69, "Stationary Bike"},
    {71, "Inline Skating"},
    {73, "Mixed Cardio"},
    {77, "Cardio Dance"},
    {78, "Nordic Walking"},
    {79, "Mountain Biking"},
    // The others.
    {2, "Archery"},
    {3, "Barre"},
    {4, "Baseball"},
    {5, "Bowling"},
    {7, "Alpine Skiing"},
    {9, "Climbing"},
    {10, "Cricket"},
    {12, "Diving"},
    {14, "Fencing"},
    {15, "Fishing"},
    {17, "Flexibility"},
    {18, "Functional Strength Training"},
    {19, "Golf"},
    {20, "Gymnastics"},
    {21, "Horse Riding"},
    {26, "Kayaking"},
    {28, "Kite Surfing"},
    {29, "Martial Arts"},
    {30, "Motor Sports"},
    {31, "Paragliding"},
    {32, "Pilates"},
    {33, "Sailing"},
    {38, "Skateboarding"},
    {39, "Ice Skating"},
    {40, "Snowboarding"},
    {42, "Snowshoeing"},
    {43, "Stand-Up Paddling"},
    {45, "Surfing"},
    {47, "Table Tennis"},
    {50, "Volleyball"},
    {52, "Walking"},
    {53, "Windsurfing"},
    {55, "Strength Training"},
    {56, "Core Training"},
    {57, "Yoga"},
    {58, "Tai Chi"},
    {59, "Meditation"},
    {60, "Wheelchair"},
    {61, "Ski Touring"},
    {62, "Badminton"},
    {66, "Squash"},
    {67, "Triathlon"},
    {68, "Dancing"},
    {70, "Sledding"},
    {72, "Hunting"},
    {74, "Canoeing"},
    {75, "Water Fitness"},
    {76, "Driving"},
    {80, "Flying"},
    {3000, "Other"},
});

}  // namespace

std::span<const Activity> activityCatalogue() { return kCatalogue; }

std::optional<std::string_view> activityName(int code) {
    const auto found = std::ranges::find(kCatalogue, code, &Activity::code);
    return found == kCatalogue.end() ? std::nullopt : std::optional(found->name);
}

std::optional<int> activityCode(std::string_view name) {
    const auto found = std::ranges::find(kCatalogue, name, &Activity::name);
    return found == kCatalogue.end() ? std::nullopt : std::optional(found->code);
}

}  // namespace keepsakes
