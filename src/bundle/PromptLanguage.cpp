// SPDX-License-Identifier: Apache-2.0
#include "bundle/PromptLanguage.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <optional>
#include <utility>
#include <vector>

#include "core/Calendar.h"
#include "model/ContactSummary.h"
#include "model/KSEventBundle.h"
#include "model/LinkSummary.h"
#include "model/TopicNames.h"
#include "trends/TrendWords.h"

namespace keepsakes {

namespace {

// ---- The words. To translate the daemon, translate these. ----

struct Phrase {
    std::string_view key;
    std::string_view text;
};

constexpr auto kRuleSentences = std::to_array<Phrase>({
    {"HikingPlusPhotos", "A hike with photos"},
    {"WeddingPhotos", "A wedding"},
    {"AnniversaryPhotos", "An anniversary"},
    {"BirthdayPhotos", "A birthday"},
    {"VisitPlusConcert", "A concert"},
    {"VisitPlusAmusementPark", "A visit to an amusement park"},
    {"CardioActivity", "A cardio workout"},
    {"ActiveBabyParent", "Active with the baby"},
    {"BabyParent", "Time with the baby"},
    {"ActivePetParent", "Active with a pet"},
    {"PetParent", "Time with a pet"},
    {"MediaOnRepeat", "Played again and again"},
    {"TravelEvent", "A trip"},
    {"StructuredEventMovie", "A film"},
    {"StructuredEventTransportation", "On the way"},
    {"SignificantContactInteraction", "In touch with somebody close"},
});

/// What a cluster is called by the categories in it; the first row that fits.
struct ClusterSentence {
    bool workout;
    bool photos;
    bool visit;
    std::string_view text;
};
constexpr auto kClusterSentences = std::to_array<ClusterSentence>({
    {true, true, false, "A workout with photos"},
    {true, false, false, "A workout"},
    {false, true, true, "A visit with photos"},
    {false, true, false, "Photos"},
    {false, false, true, "A visit"},
    {false, false, false, "A moment"},
});

/// What visits alone are called, when all of them are of one kind.
constexpr std::string_view kAtHome = "At home";
constexpr std::string_view kAtWork = "At work";
constexpr std::string_view kVisitFarFromHome = "A visit away from home";

/// What photos show, by inference word; words that say nothing about a picture are not here.
constexpr auto kSubjects = std::to_array<Phrase>({
    {"wedding", "a wedding"},
    {"anniversary", "an anniversary"},
    {"birthday", "a birthday"},
    {"baby", "a baby"},
    {"pet", "a pet"},
    {"concert", "a concert"},
    {"performance", "a performance"},
    {"festival", "a festival"},
    {"amusementpark", "an amusement park"},
    {"theater", "the theatre"},
    {"museum", "a museum"},
    {"sportevent", "a match"},
    {"celebration", "a celebration"},
    {"holidayevent", "a holiday"},
    {"gathering", "a gathering"},
    {"nightout", "a night out"},
    {"dance", "dancing"},
    {"mountain", "mountains"},
    {"beach", "the beach"},
    {"beaching", "the beach"},
    {"wintersport", "winter sports"},
    {"climbing", "climbing"},
    {"diving", "diving"},
    {"hiking", "hiking"},
    {"trip", "a trip"},
    {"nature", "nature"},
});

/// What photos are said to show in a rule's sentence, when they show several things.
constexpr auto kRuleSubjects = std::to_array<Phrase>({
    {"BirthdayPhotos", "birthday"},
    {"AnniversaryPhotos", "anniversary"},
    {"VisitPlusConcert", "concert"},
    {"VisitPlusAmusementPark", "amusementpark"},
    {"ActivePetParent", "pet"},
    {"PetParent", "pet"},
    {"ActiveBabyParent", "baby"},
    {"BabyParent", "baby"},
    {"HikingPlusPhotos", "mountain"},
});

/// What a cluster that goes on during a trip is called.
constexpr std::string_view kTripSentence = "On a trip";

/// What a cluster of nothing else but topics, or media, is called.
constexpr std::string_view kTopicSentence = "What the day was about";
constexpr std::string_view kMediaSentence = "Watched or listened to";
/// What clusters of nothing else but calendar entries are called.
constexpr std::string_view kSocialSentence = "Together";
constexpr std::string_view kPlannedSentence = "Planned";

/// What a cluster of nothing else but links is called.
constexpr std::string_view kLinksSentence = "Links shared with you";
constexpr std::string_view kLinkSentence = "A link shared with you";
constexpr std::string_view kOwnLinksSentence = "Links you shared";
constexpr std::string_view kOwnLinkSentence = "A link you shared";

/// What a finding of an analysis is called.
constexpr std::string_view kTrendSentence = "A trend";

constexpr std::string_view kWeekday = "EEEE";
constexpr std::string_view kTime = "HH:mm";

std::string timeText(KSDateInterval span) {
    const auto day = calendar::format(span.start, kWeekday);
    const auto from = calendar::format(span.start, kTime);
    const auto to = calendar::format(span.end, kTime);
    if (calendar::isWholeDays(span)) {
        const auto last = calendar::format(span.end - 1, kWeekday);
        return last == day ? day : fmt::format("{} to {}", day, last);
    }
    if (calendar::startOfDay(span.start) != calendar::startOfDay(span.end)) {
        return fmt::format("{} {} to {} {}", day, from, calendar::format(span.end, kWeekday), to);
    }
    return from == to ? fmt::format("{} {}", day, from) : fmt::format("{} {} to {}", day, from, to);
}

std::string photosText(std::int64_t count, std::string_view subject) {
    auto text = count == 1 ? "1 photo" : count > 1 ? fmt::format("{} photos", count) : "photos";
    if (!subject.empty()) text += fmt::format(" of {}", subject);
    return text;
}

std::string mediaText(const std::string& title, const std::string& artist, double repetitions) {
    auto text = artist.empty() ? title : fmt::format("{} by {}", title, artist);
    if (repetitions > 1) text += fmt::format(" ({:.0f} times)", repetitions);
    return text;
}

/// The title of a page stands in quotes, beside names of places and people.
std::string linkText(const std::string& title, const std::string& origin) {
    if (title.empty()) return {};
    return origin.empty() ? fmt::format("\"{}\"", title) : fmt::format("\"{}\" {}", title, origin);
}

std::string peopleText(const std::vector<std::string>& names) {
    constexpr std::size_t kMostNamed = 3;
    std::string text = "with ";
    const auto named = std::min(names.size(), kMostNamed);
    for (std::size_t index = 0; index < named; ++index) {
        const bool last = index + 1 == names.size();
        if (index > 0) text += last ? " and " : ", ";
        text += names[index];
    }
    if (names.size() > named) text += fmt::format(" and {} others", names.size() - named);
    return text;
}

// ---- What the events hold. ----

template <std::size_t N>
std::string_view phraseOf(const std::array<Phrase, N>& phrases, std::string_view key) {
    const auto found = std::ranges::find(phrases, key, &Phrase::key);
    return found == phrases.end() ? std::string_view() : found->text;
}

bool holds(const KSEventBundle& bundle, KSEventCategory category) {
    return std::ranges::any_of(
        bundle.events, [category](const auto& event) { return event->category() == category; });
}

/// Nothing where there is more than visits, or visits of several kinds.
std::string_view visitHeadline(const KSEventBundle& bundle) {
    constexpr std::uint64_t kHome = 1;
    constexpr std::uint64_t kWork = 2;
    const auto all = [&bundle](const auto& condition) {
        return std::ranges::all_of(bundle.events, [&condition](const auto& event) {
            return event->category() == KSEventCategory::visit && condition(*event);
        });
    };
    if (all([](const KSEvent& event) { return event.placeUserType == kHome; })) return kAtHome;
    if (all([](const KSEvent& event) { return event.placeUserType == kWork; })) return kAtWork;
    if (all([](const KSEvent& event) { return event.mode == KSPlaceMode::tourist; })) {
        return kVisitFarFromHome;
    }
    return {};
}

bool isMedia(const KSEventPointer& event) {
    return event->category() == KSEventCategory::mediaOnRepeat ||
           event->category() == KSEventCategory::leisureMedia;
}

bool hasTopics(const KSEventPointer& event) { return event->scoredTopics.has_value(); }

bool isLink(const KSEventPointer& event) { return event->category() == KSEventCategory::linkshelf; }

/// An event that an analysis made.
bool isTrend(const KSEventPointer& event) {
    return event->provider() == KSEventProvider::postAnalytics;
}

bool isSocial(const KSEventPointer& event) {
    return event->category() == KSEventCategory::socialEvent ||
           event->suggestedEventCategory == KSSuggestedEventCategorySocial;
}

bool isSuggested(const KSEventPointer& event) {
    return event->category() == KSEventCategory::structuredEvent || isSocial(event);
}

std::string_view headline(const KSEventBundle& bundle) {
    if (std::ranges::all_of(bundle.events, isTrend)) return kTrendSentence;
    if (const auto sentence = phraseOf(kRuleSentences, bundle.bundleType); !sentence.empty()) {
        return sentence;
    }
    if (std::ranges::all_of(bundle.events, isMedia)) return kMediaSentence;
    if (std::ranges::all_of(bundle.events, hasTopics)) return kTopicSentence;
    if (std::ranges::all_of(bundle.events, isLink)) {
        const bool one = bundle.events.size() == 1;
        const bool own = std::ranges::all_of(bundle.events,
                                             [](const auto& event) { return event->itemIsShared; });
        if (own) return one ? kOwnLinkSentence : kOwnLinksSentence;
        return one ? kLinkSentence : kLinksSentence;
    }
    if (std::ranges::all_of(bundle.events, isSocial)) return kSocialSentence;
    if (std::ranges::all_of(bundle.events, isSuggested)) return kPlannedSentence;
    if (holds(bundle, KSEventCategory::travel)) return kTripSentence;
    const bool workout = holds(bundle, KSEventCategory::workout);
    const bool photos = holds(bundle, KSEventCategory::photoKeepsake);
    const bool visit = holds(bundle, KSEventCategory::visit);
    if (const auto words = visitHeadline(bundle); !words.empty()) return words;
    for (const auto& row : kClusterSentences) {
        if (row.workout == workout && row.photos == photos && (workout || row.visit == visit)) {
            return row.text;
        }
    }
    return kClusterSentences.back().text;
}

void addDistinct(std::vector<std::string>& texts, const std::optional<std::string>& text) {
    if (!text || text->empty()) return;
    if (std::ranges::find(texts, *text) == texts.end()) texts.push_back(*text);
}

/// What each event that is not a photo occasion is called.
std::vector<std::string> titles(const KSEventBundle& bundle) {
    std::vector<std::string> texts;
    for (const auto& event : bundle.events) {
        if (isTrend(event) && event->trends) addDistinct(texts, trendTextOf(*event->trends));
        if (event->scoredTopics) {
            for (const auto& [name, score] : topicsByScore(*event->scoredTopics)) {
                addDistinct(texts, name);
            }
        }
        addDistinct(texts, event->workoutType);
        addDistinct(texts, event->placeName);
        addDistinct(texts, event->tripTitle);
        addDistinct(texts, event->suggestedEventTitle);
        if (event->mediaTitle && !event->mediaTitle->empty()) {
            addDistinct(texts, mediaText(*event->mediaTitle, event->mediaArtist.value_or(""),
                                         event->mediaRepetitions.value_or(0)));
        }
        addDistinct(texts, contactSummaryOf(*event).peopleText());
        addDistinct(texts, linkText(linkTitleOf(*event), linkOriginOf(*event)));
    }
    return texts;
}

/// The span of what was done; the photos' own, with their margins, only when there is nothing else.
std::optional<KSDateInterval> mainSpan(const KSEventBundle& bundle) {
    std::optional<KSDateInterval> span;
    const bool onlyPhotos = std::ranges::all_of(bundle.events, [](const auto& event) {
        return event->category() == KSEventCategory::photoKeepsake;
    });
    for (const auto& event : bundle.events) {
        if (!onlyPhotos && event->category() == KSEventCategory::photoKeepsake) continue;
        if (!span) span = KSDateInterval{event->startDate(), event->endDate()};
        span->start.seconds = std::min(span->start.seconds, event->startDate().seconds);
        span->end.seconds = std::max(span->end.seconds, event->endDate().seconds);
    }
    return span;
}

struct PhotoFacts {
    bool any = false;
    std::int64_t count = 0;
    std::string_view subject;
    std::vector<std::string> people;
};

/// The preferred word's text where the photos have it, or else the first of the table that they
/// have.
std::string_view subjectOf(const std::vector<std::string>& inferences, std::string_view preferred) {
    const auto shown = [&inferences](std::string_view word) {
        return std::ranges::find(inferences, word) != inferences.end();
    };
    if (shown(preferred)) return phraseOf(kSubjects, preferred);
    for (const auto& subject : kSubjects) {
        if (shown(subject.key)) return subject.text;
    }
    return {};
}

PhotoFacts photoFacts(const KSEventBundle& bundle) {
    PhotoFacts facts;
    std::vector<std::string> inferences;
    for (const auto& event : bundle.events) {
        if (event->category() != KSEventCategory::photoKeepsake) continue;
        facts.any = true;
        if (!event->extendedAttributes) continue;
        const auto& attributes = *event->extendedAttributes;
        facts.count += attributes.photoCount.value_or(0);
        const auto& words = attributes.photoKeepsakeInferences;
        if (words) inferences.insert(inferences.end(), words->begin(), words->end());
        for (const auto& person :
             attributes.photoKeepsakePersons.value_or(std::vector<KSPerson>())) {
            addDistinct(facts.people, person.name);
        }
    }
    facts.subject = subjectOf(inferences, phraseOf(kRuleSubjects, bundle.bundleType));
    return facts;
}

}  // namespace

std::string promptLanguageOf(const KSEventBundle& bundle) {
    auto parts = titles(bundle);
    if (const auto span = mainSpan(bundle)) parts.push_back(timeText(*span));
    for (const auto& event : bundle.events) {
        const auto counts = contactSummaryOf(*event).countText();
        if (!counts.empty()) parts.push_back(counts);
    }
    if (const auto photos = photoFacts(bundle); photos.any) {
        parts.push_back(photosText(photos.count, photos.subject));
        if (!photos.people.empty()) parts.push_back(peopleText(photos.people));
    }
    return fmt::format("{}: {}", headline(bundle), fmt::join(parts, ", "));
}

}  // namespace keepsakes
