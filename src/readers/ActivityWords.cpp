// SPDX-License-Identifier: Apache-2.0
#include "readers/ActivityWords.h"

#include <array>
#include <string>
#include <unordered_map>

#include "platform/ActivityCatalogue.h"
#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

struct ActivityRow {
    std::string_view activity;  ///< A name of the catalogue.
    std::string_view words;     ///< Folded words, apart by blanks.
};

constexpr auto kActivityRows = std::to_array<ActivityRow>({
    {"Alpine Skiing",
     "2 ski skiing alpineski downhillskiing downhillski resortskiing resortskiingsnowboarding "
     "resortskiingsnowboardingws skifahren"},
    {"Badminton", "badminton"},
    {"Canoeing", "canoe canoeing kanu"},
    {"Climbing",
     "climb climbing rockclimb rockclimbing indoorclimbing bouldering mountaineering klettern "
     "30"},
    {"Cross Training", "crosstraining crossfit workout fitness 11"},
    {"Cross-Country Skiing",
     "7 8 nordicski nordicskiing crosscountryskiing crosscountryskiingws skateskiingws "
     "skateskiing rollerski rollerskiing langlauf langlaufen xcski"},
    {"Cycling",
     "1 17 18 bike biking bicycle bicycling cycle cycling ride roadbike roadbiking roadcycling "
     "cyclingroad cyclingsport cyclingtransportation gravelride gravelcycling gravelbiking "
     "cyclocross "
     "trackcycling recumbentcycling ebike ebikeride ebiking ebikefitness virtualride bikeride "
     "commuting commute velo radfahren fahrrad radtour rennrad fietsen bicicletta ciclismo "
     "velomobile bmx touringbicycle racingbike"},
    {"Diving", "diving scubadiving freediving snorkeling"},
    {"Elliptical", "elliptical ellipticaltrainer 27"},
    {"Fishing", "fishing"},
    {"Golf", "golf golfing"},
    {"Hand Cycling", "handcycle handcycling"},
    {"High-Intensity Interval Training", "hiit intervaltraining"},
    {"Hiking",
     "4 hike hiking trek trekking tramping backpacking onfoothiking wandern wanderung "
     "bergwandern randonnee senderismo escursione escursionismo wandelen hikingmountain"},
    {"Horse Riding", "horseriding horseback horsebackriding equestrian reiten"},
    {"Ice Skating", "5 iceskate iceskating eislaufen"},
    {"Inline Skating",
     "6 inlineskate inlineskating inline rollerblading rollerskating inlineskater"},
    {"Kayaking", "kayak kayaking kayakingv2 paddling paddlingv2 22"},
    {"Kite Surfing", "14 kitesurf kitesurfing kiteboarding kiteboardingv2"},
    {"Mountain Biking",
     "mtb mountainbike mountainbiking mountainbikeride downhillbiking emtb ebikemountain "
     "emountainbikeride enduromtb"},
    {"Nordic Walking", "nordicwalking nordicwalk"},
    {"Orienteering", "orienteering orientierungslauf"},
    {"Paragliding", "paragliding paraglider gleitschirm hanggliding"},
    {"Rowing", "row rowing rowingv2 indoorrowing 23"},
    {"Running",
     "9 run running jog jogging streetrunning roadrunning trackrunning treadmill treadmillrunning "
     "indoorrunning virtualrun virtualrunning race laufen lauf joggen course courseapied correr "
     "corsa hardlopen carrera"},
    {"Sailing", "sail sailing sailingv2 segeln"},
    {"Skateboarding", "skateboard skateboarding longboarding"},
    {"Ski Touring",
     "3 skitour skitouring backcountryski backcountryskiing backcountryskiingsnowboarding "
     "backcountryskiingsnowboardingws skialpinism"},
    {"Sledding", "sled sledding sledging rodeln tobogganing"},
    {"Snowboarding", "12 snowboard snowboarding"},
    {"Snowshoeing", "13 snowshoe snowshoeing snowshoews schneeschuh"},
    {"Soccer", "football fussball"},
    {"Stair Climbing", "stairclimbing stairs stairstepper floorclimbing 29"},
    {"Stand-Up Paddling",
     "sup standuppaddling standuppaddleboarding standuppaddleboardingv2 paddleboarding 24"},
    {"Stationary Bike", "indoorcycling indoorbiking spinning bikestationary cyclinghometrainer"},
    {"Strength Training", "strength weighttraining weights"},
    {"Surfing", "surf surfing surfingv2 25"},
    {"Swimming",
     "16 swim swimming lapswimming poolswimming openwater openwaterswimming openwaterswim "
     "schwimmen natation nuoto natacion zwemmen"},
    {"Trail Running", "trailrun trailrunning trail ultrarun mountainrunning traillauf"},
    {"Triathlon", "multisport duathlon"},
    {"Walking",
     "10 walk walking casualwalking speedwalking racewalking fitnesswalking onfoot foot stroll "
     "powerwalking indoorwalking dogwalking spazieren spaziergang gehen marche camminata "
     "caminata caminar passeggiata wandeling"},
    {"Wheelchair", "wheelchair wheelchairpushwalk wheelchairpushrun"},
    {"Windsurfing", "15 windsurf windsurfing windsurfingv2"},
    {"Yoga", "yoga 31"},
});

constexpr std::string_view kTransport =
    "car auto automobile driving drive taxi cab rideshare invehicle vehicle motorvehicle bus coach "
    "train rail railway tram streetcar lightrail subway metro underground ferry boat motorboat "
    "ship motorcycle motorbike motorcycling motorrad moped scooter escooter motorscooter airplane "
    "aeroplane plane aircraft flight flying flugzeug helicopter truck van transport transit "
    "publictransport passenger passengervehicle funicular gondola cablecar skilift tractor "
    "zug bahn voiture coche macchina treno tren trein avion stationary offroad4x4 atv snowmobile "
    "motorsports motorsport";

using ActivityTable = std::unordered_map<std::string, ActivityWord>;

ActivityTable makeTable() {
    ActivityTable table;
    for (auto& word : foldedWords(kTransport)) {
        table[std::move(word)] = {ActivityWord::Meaning::transport, 0};
    }
    for (const auto& activity : activityCatalogue()) {
        // try_emplace: "Driving", "Flying" and "Motor Sports" stay transport, which moves the
        // owner without any effort of the owner's.
        table.try_emplace(foldWord(activity.name),
                          ActivityWord{ActivityWord::Meaning::activity, activity.code});
    }
    for (const auto& row : kActivityRows) {
        const ActivityWord meaning{ActivityWord::Meaning::activity,
                                   activityCode(row.activity).value()};
        for (auto& word : foldedWords(row.words)) table.try_emplace(std::move(word), meaning);
    }
    table.erase("other");
    return table;
}

}  // namespace

ActivityWord activityOfWord(std::string_view type) {
    static const ActivityTable table = makeTable();
    const auto found = table.find(foldWord(type));
    return found == table.end() ? ActivityWord{} : found->second;
}

}  // namespace keepsakes
