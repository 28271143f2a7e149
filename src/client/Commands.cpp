// SPDX-License-Identifier: Apache-2.0
#include "client/Commands.h"

#include <fmt/format.h>
#include <fmt/ranges.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>
#include <iostream>

#include "client/RecordJson.h"
#include "client/Words.h"
#include "core/Calendar.h"
#include "core/Clock.h"
#include "core/Json.h"
#include "model/ContactSummary.h"
#include "model/LinkSummary.h"
#include "model/SuggestionSummary.h"
#include "model/TopicNames.h"
#include "trends/TrendWords.h"

namespace keepsakes {

namespace {

constexpr std::string_view kMinutePattern = "yyyy-MM-dd HH:mm";
constexpr std::string_view kDayPattern = "yyyy-MM-dd";
constexpr std::string_view kAllDay = "all day";

std::string counted(std::size_t count, std::string_view what) {
    return fmt::format("{} {}{}", count, what, count == 1 ? "" : "s");
}

std::string shown(std::optional<KSDate> date) {
    if (!date || date->seconds <= KSDate::kDistantPast || date->seconds >= KSDate::kDistantFuture) {
        return "-";
    }
    return calendar::format(*date, kMinutePattern);
}

/// Whole days go without times.
std::string shownStart(KSDate start, KSDate end) {
    return calendar::isWholeDays({start, end}) ? calendar::format(start, kDayPattern)
                                               : shown(start);
}

/// The end without its day when that is the start's; nothing for a moment.
std::string shownEnd(KSDate start, KSDate end) {
    if (end == start) return {};
    if (calendar::isWholeDays({start, end})) {
        const auto last = calendar::startOfDay(end - 1);
        return last > start ? calendar::format(last, kDayPattern) : std::string(kAllDay);
    }
    const bool sameDay = calendar::startOfDay(start) == calendar::startOfDay(end);
    return sameDay ? calendar::format(end, "HH:mm") : shown(end);
}

/// "2024-06-15 10:02 to 12:31", "2024-06-15, all day", "2024-06-15 10:02".
std::string shownSpan(KSDate start, KSDate end) {
    auto from = shownStart(start, end);
    const auto to = shownEnd(start, end);
    if (to.empty()) return from;
    return to == kAllDay ? fmt::format("{}, {}", from, to) : fmt::format("{} to {}", from, to);
}

/// Where a visit was, what the place is to the owner, and how far from home it is.
std::string visitDetails(const KSEvent& event) {
    std::string details;
    if (event.placeName && !event.placeName->empty()) {
        details = *event.placeName;
    } else if (event.location) {
        details =
            fmt::format("{:.5f}, {:.5f}", event.location->latitude, event.location->longitude);
    } else {
        details = "somewhere";
    }
    const auto add = [&details](bool holds, std::string_view word) {
        if (holds) details += fmt::format(", {}", word);
    };
    add(event.placeUserType == 1, "home");
    add(event.placeUserType == 2, "work");
    add(event.mode == KSPlaceMode::local && !event.isHomeWorkVisit(), "near home");
    add(event.mode == KSPlaceMode::tourist, "away from home");
    add(event.placeDiscovery == 1, "new place");
    return details;
}

/// How often and for how long media were played: "3 times, 1 h 30 min".
std::string playedText(double repetitions, double seconds) {
    std::string text;
    if (repetitions > 0) {
        text = repetitions == 1 ? "once, " : fmt::format("{:.0f} times, ", repetitions);
    }
    const auto minutes = std::llround(std::clamp(seconds / 60, 0.0, 1e9));
    if (seconds < 60) return text + fmt::format("{:.0f} s", std::max(seconds, 0.0));
    if (minutes < 60) return text + fmt::format("{} min", minutes);
    return text + fmt::format("{} h {} min", minutes / 60, minutes % 60);
}

std::string topicsText(const KSDictionary& scoredTopics) {
    std::string text;
    for (const auto& [name, score] : topicsByScore(scoredTopics)) {
        text += fmt::format("{}{} {:.2f}", text.empty() ? "" : ", ", name, score);
    }
    return text;
}

/// What photos show, as people write it, by inference word; the others are written so.
struct PhotoWord {
    std::string_view inference;
    std::string_view word;
};
constexpr auto kPhotoWords = std::to_array<PhotoWord>({
    {"amusementpark", "amusement park"},
    {"beaching", "beach"},
    {"frequentlocation", "favourite place"},
    {"holidayevent", "holiday"},
    {"nightout", "night out"},
    {"sportevent", "sports event"},
    {"wintersport", "winter sports"},
});

/// What the photos show and whom: "wedding, celebration; with Anna Beispiel".
std::string photosText(const KSEventExtendedAttributes& photos) {
    std::vector<std::string> words;
    for (const auto& inference :
         photos.photoKeepsakeInferences.value_or(std::vector<std::string>())) {
        const auto* known = std::ranges::find(kPhotoWords, inference, &PhotoWord::inference);
        auto word = known == kPhotoWords.end() ? inference : std::string(known->word);
        if (std::ranges::find(words, word) == words.end()) words.push_back(std::move(word));
    }
    std::vector<std::string> people;
    for (const auto& person : photos.photoKeepsakePersons.value_or(std::vector<KSPerson>())) {
        if (person.name && !person.name->empty()) people.push_back(*person.name);
    }
    auto text = fmt::format("{}", fmt::join(words, ", "));
    if (people.empty()) return text;
    return fmt::format("{}{}with {}", text, text.empty() ? "" : "; ", fmt::join(people, ", "));
}

/// What tells one event from another of its kind.
std::string detailsOf(const KSEvent& event) {
    // It has the category of what it tells of, and nothing else of that.
    if (event.provider() == KSEventProvider::postAnalytics && event.trends) {
        return trendTextOf(*event.trends);
    }
    std::string details;
    const auto add = [&details](const std::optional<std::string>& part) {
        if (!part || part->empty()) return;
        if (!details.empty()) details += ", ";
        details += *part;
    };
    add(event.workoutType);
    add(event.category() == KSEventCategory::visit ? visitDetails(event) : event.placeName);
    add(event.suggestedEventTitle);
    add(std::string(suggestionWord(event.suggestedEventCategory)));
    add(suggestionPlace(event));
    add(event.tripTitle);
    add(tripPartsText(event));
    add(event.mediaTitle);
    add(event.mediaArtist);
    if (event.mediaSumTimePlayed) {
        add(playedText(event.mediaRepetitions.value_or(0), *event.mediaSumTimePlayed));
    }
    add(linkTitleOf(event));
    add(linkOriginOf(event));
    if (event.category() == KSEventCategory::significantContact) {
        const auto contact = contactSummaryOf(event);
        add(contact.peopleText());
        add(contact.countText());
        if (contact.score) add(fmt::format("score {:.2f}", *contact.score));
    }
    if (event.scoredTopics) add(topicsText(*event.scoredTopics));
    if (event.extendedAttributes) {
        add(photosText(*event.extendedAttributes));
        return details;
    }
    if (details.empty()) add(event.identifierFromProvider);
    return details;
}

std::string eventTable(const KSEventArray& events, const Screen& screen, std::size_t indent = 0) {
    Table table({"Start", "End", "Category", "Provider", "Details"});
    for (const auto& event : events) {
        table.add({shownStart(event->startDate(), event->endDate()),
                   shownEnd(event->startDate(), event->endDate()), event->describeCategory(),
                   event->describeProvider(), detailsOf(*event)});
    }
    return table.text(screen, indent);
}

/// Fills what both kinds of options share; the text of a usage error, or none.
template <class Options>
std::optional<std::string> readWords(const FetchWords& words, Options& options) {
    options.ascending = !words.descending;
    if (words.limit) options.limit = static_cast<double>(*words.limit);
    if (words.since.empty() && words.until.empty()) return std::nullopt;
    KSDateInterval window{KSDate::distantPast(), KSDate::distantFuture()};
    const auto now = SystemClock().now();
    for (const auto& [word, isStart] : {std::pair(words.since, true), {words.until, false}}) {
        if (word.empty()) continue;
        const auto time = parseTime(word, now);
        if (!time) return fmt::format("\"{}\" is not a time; see --help", word);
        (isStart ? window.start : window.end) = isStart ? time->date : time->end();
    }
    if (window.end <= window.start) return "--until lies before --since";
    options.dateInterval = window;
    return std::nullopt;
}

std::string statusJson(const DaemonStatus& status) {
    KSDictionary entries{{"Version", status.version},
                         {"DatabaseAvailable", status.databaseAvailable},
                         {"LastCollection", status.lastCollection},
                         {"CollectEnabled", status.collectEnabled},
                         {"ComputeEnabled", status.computeEnabled},
                         {"PurgeEnabled", status.purgeEnabled},
                         {"EventCount", status.eventCount},
                         {"BundleCount", status.bundleCount},
                         {"FilesIndexed", status.filesIndexed},
                         {"FilesRefused", status.filesRefused},
                         {"Problems", KSArray(status.problems.begin(), status.problems.end())}};
    if (status.lastCollection != 0) entries["LastCollection"] = KSDate{status.lastCollection};
    return jsonText(jsonForm(KSValue(entries))).value_or("{}") + "\n";
}

std::string statusText(const DaemonStatus& status, const Screen& screen) {
    const auto onOff = [](bool on) { return on ? "on" : "off"; };
    const auto last = status.lastCollection == 0 ? "never" : shown(KSDate{status.lastCollection});
    std::string text = screen.bold("keepsakesd " + printable(status.version)) + "\n";
    text += fmt::format("  Database         {}\n",
                        status.databaseAvailable ? "available" : "not available");
    text += fmt::format("  Last collection  {}\n", last);
    text += fmt::format("  Activities       collection {}, compute {}, purge {}\n",
                        onOff(status.collectEnabled), onOff(status.computeEnabled),
                        onOff(status.purgeEnabled));
    text += fmt::format("  Stored           {}, {}\n", counted(status.eventCount, "event"),
                        counted(status.bundleCount, "bundle"));
    text += fmt::format("  Files            {} indexed, {} refused\n", status.filesIndexed,
                        status.filesRefused);
    if (status.problems.empty()) return text + "  Problems         none\n";
    text += "  Problems\n";
    for (const auto& problem : status.problems) text += "    " + printable(problem) + "\n";
    return text;
}

std::string bundleTitle(const KSEventBundle& bundle) {
    return printable(bundle.promptLanguage.value_or("(no prompt)"));
}

std::string bundleText(const KSEventBundle& bundle, const Screen& screen) {
    const auto start = bundle.startDate.value_or(bundle.creationDate());
    const auto end = bundle.endDate.value_or(start);
    auto text = fmt::format("{}\n  {}{}\n", screen.bold(bundleTitle(bundle)), shownSpan(start, end),
                            bundle.filtered ? ", by a rule" : "");
    return text + eventTable(bundle.events, screen, 2);
}

bool confirmed() {
    fmt::print(stderr, "Delete every stored event and bundle? [y/N] ");
    std::string line;
    std::getline(std::cin, line);
    return line == "y" || line == "Y" || line == "yes";
}

}  // namespace

int showStatus(const Console& console) {
    const auto client = console.connect();
    if (!client) return console.fail(client.error());
    const auto status = (*client)->status();
    if (!status) return console.fail(status.error());
    return console.print(console.json() ? statusJson(*status)
                                        : statusText(*status, console.screen()));
}

int showEvents(const Console& console, const FetchWords& words) {
    KSEventFetchOptions options;
    if (const auto wrong = readWords(words, options)) return console.usage(*wrong);
    if (!words.category.empty()) {
        const auto category = parseCategory(words.category);
        if (!category) {
            return console.usage(
                fmt::format("no category \"{}\"; there are: {}", words.category, categoryNames()));
        }
        options.category = *category;
    }
    const auto client = console.connect();
    if (!client) return console.fail(client.error());
    const auto events = (*client)->fetchEventsWithOptions(options);
    if (!events) return console.fail(events.error());
    if (console.json()) return console.print(jsonRecords(*events));
    const auto table = events->empty() ? "" : eventTable(*events, console.screen());
    return console.print(table + counted(events->size(), "event") + "\n");
}

int showBundles(const Console& console, const FetchWords& words) {
    KSEventBundleFetchOptions options;
    options.filterBundle = words.filtered;
    if (const auto wrong = readWords(words, options)) return console.usage(*wrong);
    const auto client = console.connect();
    if (!client) return console.fail(client.error());
    const auto bundles = (*client)->fetchEventBundlesWithOptions(options);
    if (!bundles) return console.fail(bundles.error());
    if (console.json()) return console.print(jsonRecords(*bundles));
    std::string text;
    std::size_t count = 0;
    for (const auto& bundle : *bundles) {
        // What happened since is told by another one.
        if (bundle->events.empty()) continue;
        ++count;
        text += words.brief ? bundleTitle(*bundle) + "\n"
                            : bundleText(*bundle, console.screen()) + "\n";
    }
    return console.print(text + counted(count, "bundle") + "\n");
}

int doWork(const Console& console, Work work) {
    const auto client = console.connect();
    if (!client) return console.fail(client.error());
    const auto error = ((**client).*work)();
    if (error) return console.fail(*error);
    console.endProgress();
    return console.print(console.json() ? "{\"done\":true}\n" : "done\n");
}

int clearEvents(const Console& console, bool yes) {
    if (!yes && !isatty(STDIN_FILENO)) {
        return console.usage("clear deletes every stored event; say --yes to do so");
    }
    if (!yes && !confirmed()) return console.usage("nothing was deleted");
    return doWork(console, &ConduitClient::clearEvents);
}

}  // namespace keepsakes
