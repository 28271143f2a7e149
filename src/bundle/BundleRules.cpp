// SPDX-License-Identifier: Apache-2.0
#include "bundle/BundleRules.h"

#include <algorithm>
#include <array>

#include "core/Text.h"
#include "platform/ActivityCatalogue.h"

namespace keepsakes {

namespace {

using Words = std::vector<std::string>;

constexpr double kRepetitionsAbove = 2;
constexpr double kContactScoreAbove = 0.85;

// "hiking" stands in it twice; the list is matched as it stands.
const Words kOutdoorWords = {"hiking",   "nature", "mountain", "beach",   "wintersport",
                             "activity", "hiking", "climbing", "beaching"};

constexpr auto kCardioActivities = std::to_array({
    37, 71, 64, 77, 73, 16, 63, 11, 78, 44, 69, 24, 49, 22, 41, 1,
    6,  46, 54, 13, 8,  65, 35, 34, 23, 79, 27, 36, 51, 48, 25,
});

EventPredicate of(KSEventProvider provider, KSEventCategory category) {
    return [provider, category](const KSEvent& event) {
        return event.provider() == provider && event.category() == category;
    };
}

EventPredicate both(EventPredicate a, EventPredicate b) {
    return
        [a = std::move(a), b = std::move(b)](const KSEvent& event) { return a(event) && b(event); };
}

EventPredicate workout() { return of(KSEventProvider::health, KSEventCategory::workout); }

EventPredicate workoutIn(Words names) {
    return both(workout(), [names = std::move(names)](const KSEvent& event) {
        return event.workoutType && std::ranges::find(names, *event.workoutType) != names.end();
    });
}

EventPredicate photosOfAny(Words words) {
    for (auto& word : words) word = lowerCased(word);
    const auto holdsAny = [words = std::move(words)](const KSEvent& event) {
        const auto& attributes = event.extendedAttributes;
        if (!attributes || !attributes->photoKeepsakeInferences) return false;
        return std::ranges::find_first_of(*attributes->photoKeepsakeInferences, words) !=
               attributes->photoKeepsakeInferences->end();
    };
    return both(of(KSEventProvider::photo, KSEventCategory::photoKeepsake), holdsAny);
}

EventPredicate namedVisit() {
    return both(of(KSEventProvider::routine, KSEventCategory::visit),
                [](const KSEvent& event) { return event.placeName && !event.placeName->empty(); });
}

EventPredicate foresight(KSEventCategory category) {
    return of(KSEventProvider::foresight, category);
}

EventPredicate structuredEventIn(std::vector<std::uint64_t> categories) {
    return both(foresight(KSEventCategory::structuredEvent), [categories = std::move(categories)](
                                                                 const KSEvent& event) {
        return std::ranges::find(categories, event.suggestedEventCategory) != categories.end();
    });
}

Words namesOf(std::span<const int> codes) {
    Words names;
    for (const int code : codes) {
        if (const auto name = activityName(code)) names.emplace_back(*name);
    }
    return names;
}

}  // namespace

std::vector<BundleRule> predicatesOfDesiredExperiences() {
    return {
        {"HikingPlusPhotos",
         {workoutIn(namesOf(std::array{kActivityHiking})), photosOfAny(kOutdoorWords)}},
        {"WeddingPhotos", {photosOfAny({"wedding"})}},
        {"AnniversaryPhotos", {photosOfAny({"anniversary"})}},
        {"BirthdayPhotos", {photosOfAny({"birthday"})}},
        {"VisitPlusConcert", {namedVisit(), photosOfAny({"concert", "performance"})}},
        {"VisitPlusAmusementPark",
         {namedVisit(), photosOfAny({"amusementpark", "amusement park"})}},
        {"CardioActivity", {workoutIn(namesOf(kCardioActivities))}},
        {"ActiveBabyParent", {workout(), photosOfAny({"baby"})}},
        {"BabyParent", {photosOfAny({"baby"})}},
        {"ActivePetParent", {workout(), photosOfAny({"pet"})}},
        {"PetParent", {photosOfAny({"pet"})}},
        {"MediaOnRepeat",
         {both(foresight(KSEventCategory::mediaOnRepeat),
               [](const KSEvent& event) {
                   return event.mediaRepetitions && *event.mediaRepetitions > kRepetitionsAbove;
               })}},
        {"TravelEvent", {foresight(KSEventCategory::travel)}},
        {"StructuredEventMovie", {structuredEventIn({KSSuggestedEventCategoryMovie})}},
        {"StructuredEventTransportation",
         {structuredEventIn({KSSuggestedEventCategoryFlight, KSSuggestedEventCategoryTrain,
                             KSSuggestedEventCategoryBus, KSSuggestedEventCategoryBoat})}},
        {"SignificantContactInteraction",
         {both(foresight(KSEventCategory::significantContact),
               [](const KSEvent& event) {
                   return event.interactionContactScore &&
                          *event.interactionContactScore > kContactScoreAbove;
               })}},
    };
}

std::map<std::string, std::string> propertyNameDictionary() {
    return {
        {"strProvider", "provider"},
        {"strCategory", "category"},
        {"strWorkoutType", "workoutType"},
        {"strPlaceName", "placeName"},
        {"strStartDate", "startDate"},
        {"strEndDate", "endDate"},
        {"strCreationDate", "creationDate"},
        {"strExpirationDate", "expirationDate"},
        {"strMediaRepetitions", "mediaRepetitions"},
        {"strInteractionContactScore", "interactionContactScore"},
        {"strPhotoKeepsakeInferences", "extendedAttributes.photoKeepsakeInferences"},
        {"strPhotoKeepsakeHolidays", "extendedAttributes.photoKeepsakeHolidays"},
        {"strPhotoKeepsakePublicEvents", "extendedAttributes.photoKeepsakePublicEvents"},
        {"strPhotoKeepsakePersons", "extendedAttributes.photoKeepsakePersons"},
        {"strSuggestedEventCategory", "suggestedEventCategory"},
    };
}

}  // namespace keepsakes
