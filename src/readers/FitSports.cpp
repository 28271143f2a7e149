// SPDX-License-Identifier: Apache-2.0
#include "readers/FitSports.h"

#include <algorithm>
#include <array>

namespace keepsakes {

namespace {

struct SportRow {
    std::int64_t number;
    std::string_view word;
};

// Profile of the FIT SDK, types "sub_sport" and "sport". Sub-sports that do not change what the
// activity is (road, commuting, lap swimming, ...) are left to their sport.
constexpr auto kSubSports = std::to_array<SportRow>({
    {1, "running"},          // treadmill
    {3, "trail running"},    // trail
    {5, "stationary bike"},  // spin
    {6, "stationary bike"},  // indoor cycling
    {8, "mountain biking"},  // mountain
    {12, "hand cycling"},
    {14, "rowing"},  // indoor rowing
    {15, "elliptical"},
    {16, "stair climbing"},
    {17, "swimming"},  // lap swimming
    {18, "swimming"},  // open water
    {19, "flexibility"},
    {20, "strength training"},
    {26, "mixed cardio"},  // cardio training
    {27, "walking"},       // indoor walking
    {28, "cycling"},       // e-bike fitness
    {29, "bmx"},
    {30, "walking"},  // casual walking
    {31, "walking"},  // speed walking
    {35, "atv"},
    {36, "motorcycling"},          // motocross
    {42, "cross-country skiing"},  // skate skiing
    {43, "yoga"},
    {44, "pilates"},
    {45, "running"},          // indoor running
    {46, "cycling"},          // gravel cycling
    {47, "mountain biking"},  // e-bike mountain
    {53, "diving"},           // single-gas diving
    {54, "diving"},           // multi-gas diving
    {55, "diving"},           // gauge diving
    {56, "diving"},           // apnea diving
    {57, "diving"},           // apnea hunting
    {67, "trail running"},    // ultra
    {68, "climbing"},         // indoor climbing
    {69, "climbing"},         // bouldering
    {70, "hiit"},
    {94, "squash"},
    {95, "badminton"},
    {96, "racquetball"},
    {97, "table tennis"},
});

constexpr auto kSports = std::to_array<SportRow>({
    {1, "running"},
    {2, "cycling"},
    {5, "swimming"},
    {6, "basketball"},
    {7, "soccer"},
    {8, "tennis"},
    {10, "cross training"},  // training
    {11, "walking"},
    {12, "cross-country skiing"},
    {13, "alpine skiing"},
    {14, "snowboarding"},
    {15, "rowing"},
    {16, "climbing"},  // mountaineering
    {17, "hiking"},
    {18, "triathlon"},  // multisport
    {19, "canoeing"},   // paddling
    {20, "flying"},
    {21, "cycling"},  // e-biking
    {22, "motorcycling"},
    {23, "boat"},  // boating
    {24, "driving"},
    {25, "golf"},
    {26, "paragliding"},  // hang gliding
    {27, "horse riding"},
    {28, "hunting"},
    {29, "fishing"},
    {30, "inline skating"},
    {31, "climbing"},  // rock climbing
    {32, "sailing"},
    {33, "ice skating"},
    {35, "snowshoeing"},
    {36, "snowmobile"},
    {37, "stand-up paddling"},
    {38, "surfing"},
    {41, "kayaking"},
    {43, "windsurfing"},
    {44, "kite surfing"},
    {47, "boxing"},
    {48, "stair climbing"},  // floor climbing
    {49, "baseball"},
    {53, "diving"},
    {62, "hiit"},
    {65, "wheelchair"},  // push, walking speed
    {66, "wheelchair"},  // push, running speed
    {67, "meditation"},
    {71, "cricket"},
    {72, "rugby"},
    {74, "lacrosse"},
    {75, "volleyball"},
    {80, "martial arts"},  // mixed martial arts
    {82, "diving"},        // snorkelling
    {83, "dancing"},
    {84, "jump rope"},
});

constexpr std::int64_t kAlpineSkiing = 13;
constexpr std::int64_t kBackcountry = 37;

std::string_view wordOf(const auto& rows, std::optional<std::int64_t> number) {
    const auto* const row =
        std::ranges::find_if(rows, [&](const SportRow& one) { return number == one.number; });
    return row == rows.end() ? std::string_view() : row->word;
}

}  // namespace

std::string_view wordOfFitSport(std::optional<std::int64_t> sport,
                                std::optional<std::int64_t> subSport) {
    if (sport == kAlpineSkiing && subSport == kBackcountry) return "ski touring";
    const auto word = wordOf(kSubSports, subSport);
    return word.empty() ? wordOf(kSports, sport) : word;
}

}  // namespace keepsakes
