// SPDX-License-Identifier: Apache-2.0
#include "indexer/PhotoText.h"

#include "core/Json.h"
#include "indexer/FolderListing.h"

namespace keepsakes {

namespace {

constexpr const char* kInferences = "inferences";
constexpr const char* kPersons = "persons";
constexpr const char* kHolidays = "holidays";
constexpr const char* kEvents = "events";
constexpr const char* kName = "name";
constexpr const char* kVenue = "venue";
constexpr const char* kPerformers = "performers";

void put(KSDictionary& words, const char* key, const std::vector<std::string>& values) {
    if (values.empty()) return;
    KSArray array;
    for (const auto& value : values) array.emplace_back(escaped(value));
    words.emplace(key, std::move(array));
}

std::vector<std::string> stringsOf(const KSDictionary& words, const char* key) {
    std::vector<std::string> values;
    if (const auto* array = valueForKey(words, key).asArray()) {
        for (const auto& value : *array) {
            if (const auto* text = value.asString()) values.push_back(*text);
        }
    }
    return values;
}

std::string stringOf(const KSDictionary& words, const char* key) {
    const auto* text = valueForKey(words, key).asString();
    return text ? *text : std::string();
}

}  // namespace

std::optional<std::string> wordsText(const PhotoRecord& photo) {
    KSDictionary words;
    put(words, kInferences, photo.inferences);
    put(words, kPersons, photo.persons);
    put(words, kHolidays, photo.holidays);
    KSArray events;
    for (const auto& event : photo.publicEvents) {
        KSDictionary dictionary{{kName, escaped(event.name)}, {kVenue, escaped(event.venue)}};
        put(dictionary, kPerformers, event.performers);
        events.emplace_back(std::move(dictionary));
    }
    if (!events.empty()) words.emplace(kEvents, std::move(events));
    if (words.empty()) return std::nullopt;
    return jsonText(KSValue(std::move(words)));
}

OccasionWords parseWords(std::string_view text) {
    OccasionWords found;
    const auto value = parseJson(text);
    const auto* words = value ? value->asDictionary() : nullptr;
    if (!words) return found;
    found.inferences = stringsOf(*words, kInferences);
    found.persons = stringsOf(*words, kPersons);
    found.holidays = stringsOf(*words, kHolidays);
    if (const auto* events = valueForKey(*words, kEvents).asArray()) {
        for (const auto& event : *events) {
            const auto* dictionary = event.asDictionary();
            if (!dictionary) continue;
            found.publicEvents.push_back({.name = stringOf(*dictionary, kName),
                                          .performers = stringsOf(*dictionary, kPerformers),
                                          .venue = stringOf(*dictionary, kVenue)});
        }
    }
    return found;
}

}  // namespace keepsakes
