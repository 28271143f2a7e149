// SPDX-License-Identifier: Apache-2.0
#include "bundle/PromptLanguage.h"

#include <gtest/gtest.h>

#include "bundle/BundleRules.h"
#include "core/Calendar.h"
#include "model/KSEventBundle.h"
#include "support/TestEvents.h"

namespace keepsakes {
namespace {

std::shared_ptr<KSEvent> photosOf(std::int64_t count, std::vector<std::string> words,
                                  std::vector<std::string> people, KSDate start, KSDate end) {
    auto event = makePhotos(2, start.seconds, end.seconds, {});
    auto attributes = KSEventExtendedAttributes::initWithLocalIdentifier("k");
    attributes->photoKeepsakeInferences = std::move(words);
    attributes->photoCount = count;
    for (const auto& name : people) {
        if (!attributes->photoKeepsakePersons) attributes->photoKeepsakePersons.emplace();
        attributes->photoKeepsakePersons->push_back({{}, name, {}, {}});
    }
    event->extendedAttributes = std::move(attributes);
    return event;
}

std::string prompt(std::string rule, KSEventArray events) {
    const auto bundle = KSEventBundle::initWithEventSet(std::move(events), true, {});
    bundle->bundleType = std::move(rule);
    return promptLanguageOf(*bundle);
}

TEST(PromptLanguage, SaysWhatABundleHolds) {
    const KSDate saturday = *calendar::dateOfDay(2024, 6, 15);
    const KSDate start = saturday + 10 * 3600 + 120;
    const KSDate end = saturday + 12 * 3600 + 1860;
    const auto hike = makeWorkout(1, start.seconds, end.seconds, "Hiking");
    const auto mountains = photosOf(14, {"nature", "mountain"}, {}, start - 60, end + 60);
    EXPECT_EQ(prompt("HikingPlusPhotos", {hike, mountains}),
              "A hike with photos: Hiking, Saturday 10:02 to 12:31, 14 photos of mountains");
    EXPECT_EQ(prompt("", {hike, photosOf(1, {}, {"Anna"}, start, end)}),
              "A workout with photos: Hiking, Saturday 10:02 to 12:31, 1 photo, with Anna");
    EXPECT_EQ(
        prompt("BirthdayPhotos", {photosOf(3, {"birthday"}, {"Anna", "Ben", "Cleo", "Dan", "Eva"},
                                           saturday + 22 * 3600, saturday + 25 * 3600)}),
        "A birthday: Saturday 22:00 to Sunday 01:00, 3 photos of a birthday, with Anna, Ben, "
        "Cleo and 2 others");
    const auto both = photosOf(2, {"baby", "pet"}, {}, start, start);
    EXPECT_EQ(prompt("PetParent", {both}), "Time with a pet: Saturday 10:02, 2 photos of a pet");
    EXPECT_EQ(prompt("BabyParent", {both}),
              "Time with the baby: Saturday 10:02, 2 photos of a baby");
    EXPECT_EQ(prompt("", {makeVisit(1, start.seconds, start.seconds, "Museum")}),
              "A visit: Museum, Saturday 10:02");
    const auto link = makeEvent(1, start.seconds, start.seconds, KSEventProvider::foresight,
                                KSEventCategory::linkshelf);
    link->itemURL = "https://www.example.org/tours/?id=1";
    EXPECT_EQ(prompt("", {link}), "A link shared with you: \"example.org/tours\", Saturday 10:02");
    EXPECT_EQ(prompt("", {link, link}),
              "Links shared with you: \"example.org/tours\", Saturday 10:02");
    link->itemIsShared = true;
    EXPECT_EQ(prompt("", {link}), "A link you shared: \"example.org/tours\", Saturday 10:02");
    link->itemIsShared = false;
    link->itemLinkTitle = "Tours";
    link->itemDisplayName = "Anna";
    EXPECT_EQ(prompt("", {link, hike}),
              "A workout: \"Tours\" from Anna, Hiking, Saturday 10:02 to 12:31");
    const auto home = makeVisit(1, start.seconds, start.seconds, "Elm Street");
    home->placeUserType = 1;
    EXPECT_EQ(prompt("", {home}), "At home: Elm Street, Saturday 10:02");
    const auto far = makeVisit(2, start.seconds, start.seconds, "Lake");
    far->mode = KSPlaceMode::tourist;
    EXPECT_EQ(prompt("", {far}), "A visit away from home: Lake, Saturday 10:02");
    EXPECT_EQ(prompt("", {home, far}), "A visit: Elm Street, Lake, Saturday 10:02");
    const auto contact = makeEvent(1, start.seconds, end.seconds, KSEventProvider::foresight,
                                   KSEventCategory::significantContact);
    contact->interactionScoredContact = KSDictionary{{"name", "Anna"}};
    contact->interactions = {{KSDictionary{{"mechanism", 2}}, KSDictionary{{"mechanism", 4}},
                              KSDictionary{{"mechanism", 0}}}};
    EXPECT_EQ(prompt("SignificantContactInteraction", {contact}),
              "In touch with somebody close: Anna, Saturday 10:02 to 12:31, 2 messages and 1 call");
    const auto topics = makeEvent(1, start.seconds, end.seconds, KSEventProvider::foresight,
                                  KSEventCategory::topic);
    topics->scoredTopics =
        KSDictionary{{"TFZX59DDWR22CqH8gMQt4Lw", 0.6}, {"TN5KR8Z7ESDORJr1QSxzJFA", 0.8}};
    EXPECT_EQ(prompt("", {topics}),
              "What the day was about: Hiking, Food, Saturday 10:02 to 12:31");
    EXPECT_EQ(prompt("", {makeEvent(1, start.seconds, end.seconds, KSEventProvider::foresight,
                                    KSEventCategory::topic)}),
              "A moment: Saturday 10:02 to 12:31");
    const auto party = makeEvent(1, start.seconds, end.seconds, KSEventProvider::foresight,
                                 KSEventCategory::socialEvent);
    party->suggestedEventTitle = "Annas Geburtstag";
    EXPECT_EQ(prompt("", {party}), "Together: Annas Geburtstag, Saturday 10:02 to 12:31");
    const auto table = makeEvent(2, start.seconds, end.seconds, KSEventProvider::foresight,
                                 KSEventCategory::structuredEvent);
    table->suggestedEventTitle = "Tisch";
    const auto trip = makeEvent(3, saturday.seconds, (saturday + 2 * 86400).seconds,
                                KSEventProvider::foresight, KSEventCategory::travel);
    trip->tripTitle = "Lisbon";
    EXPECT_EQ(prompt("TravelEvent", {trip}), "A trip: Lisbon, Saturday to Sunday");
    EXPECT_EQ(prompt("", {trip, far}), "On a trip: Lisbon, Lake, Saturday to Sunday");
    EXPECT_EQ(prompt("", {party, table}),
              "Planned: Annas Geburtstag, Tisch, Saturday 10:02 to 12:31");
    const auto song = makeEvent(1, start.seconds, end.seconds, KSEventProvider::foresight,
                                KSEventCategory::mediaOnRepeat);
    song->mediaTitle = "Song";
    song->mediaArtist = "Band";
    song->mediaRepetitions = 3;
    EXPECT_EQ(prompt("MediaOnRepeat", {song}),
              "Played again and again: Song by Band (3 times), Saturday 10:02 to 12:31");
    const auto film = makeEvent(2, start.seconds, end.seconds, KSEventProvider::foresight,
                                KSEventCategory::leisureMedia);
    film->mediaTitle = "Film";
    EXPECT_EQ(prompt("", {film}), "Watched or listened to: Film, Saturday 10:02 to 12:31");
}

TEST(PromptLanguage, TellsWhatAnAnalysisFound) {
    const KSDate day = *calendar::dateOfDay(2024, 6, 15) + 3 * 3600;
    const auto trend = makeEvent(1, day.seconds, (day + 86400).seconds,
                                 KSEventProvider::postAnalytics, KSEventCategory::workout);
    trend->trends = KSDictionary{{"keyword", "workout.duration"}, {"trends", 6}};
    EXPECT_EQ(prompt("", {trend}),
              "A trend: workouts, more workout time than usual, Saturday 03:00 to Sunday 03:00");
    trend->trends = KSDictionary{{"keyword", "unheard of"}};
    EXPECT_EQ(prompt("", {trend}),
              "A trend: trend, not enough data, Saturday 03:00 to Sunday 03:00");
}

TEST(PromptLanguage, HasASentenceForEveryRule) {
    for (const auto& rule : predicatesOfDesiredExperiences()) {
        EXPECT_NE(prompt(std::string(rule.name), {makeWorkout(1, 1, 2, "x")}),
                  prompt("", {makeWorkout(1, 1, 2, "x")}))
            << rule.name;
    }
}

}  // namespace
}  // namespace keepsakes
