// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>

#include <cstdio>
#include <cstdlib>

#include "client/RecordJson.h"
#include "client/Terminal.h"
#include "client/Words.h"
#include "core/Calendar.h"
#include "core/Files.h"
#include "core/Json.h"
#include "support/FakeConduit.h"
#include "support/SampleRecords.h"
#include "support/SampleWeeks.h"
#include "support/TemporaryFolder.h"
#include "support/TestPlatform.h"
#include "trends/KSTrendsAnalyzer.h"
#include "wire/BusListener.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;

struct Outcome {
    int status = -1;
    std::string output;  ///< Standard output, then standard error.
};

class KeepsakesctlTest : public testing::Test {
  protected:
    KeepsakesctlTest() {
        setenv("TZ", "Europe/Berlin", 1);
        setenv("XDG_CONFIG_HOME", folder_.path().c_str(), 1);
        listener_->resume(conduit_, conduit_);
    }

    Outcome run(const std::string& arguments) const {
        const auto errors = (folder_ / "errors").string();
        const auto command = fmt::format("{} {} 2>{}", KEEPSAKESCTL, arguments, errors);
        Outcome result;
        FILE* pipe = popen(command.c_str(), "r");
        for (int byte = std::fgetc(pipe); byte != EOF; byte = std::fgetc(pipe)) {
            result.output += static_cast<char>(byte);
        }
        const int status = pclose(pipe);
        result.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
        result.output += readFile(errors, 1 << 20).value_or("");
        return result;
    }
    std::string path(std::string_view name) const { return (folder_ / name).string(); }

    TemporaryFolder folder_;
    FakeConduit conduit_;
    std::unique_ptr<BusListener> listener_ = BusListener::claim().value();
};

TEST_F(KeepsakesctlTest, ExitStatusesAndTexts) {
    conduit_.setProblems({"a\033[2Jb.gpx could not be read"});
    folder_.write("broken.json", R"([{"eventIdentifier":"x"}])");
    folder_.write("not.json", "{");
    folder_.write("broken.jsonl", "\n{\"kind\":\"event\",\"startDate\":\"x\"}\n");
    const struct {
        const char* arguments;
        int status;
        const char* text;
    } rows[] = {
        {"status", 0, "Last collection"},
        {"status", 0, "a\uFFFD[2Jb.gpx"},
        {"collect", 0, "done"},
        {"purge --json", 0, "{\"done\":true}"},
        {"clear --yes", 0, "done"},
        {"clear </dev/null", 2, "--yes"},
        {"events", 0, "0 events"},
        {"", 2, "subcommand"},
        {"dance", 2, "dance"},
        {"events --limit 0", 2, "limit"},
        {"events --since someday", 2, "\"someday\" is not a time"},
        {"events --since today --until yesterday", 2, "--until lies before --since"},
        {"events --category dancing", 2, "there are: "},
        {"--help", 0, "Exit status"},
        {"store /nonexistent.json", 1, "/nonexistent.json"},
        {"store {folder}/broken.json", 1, "event 0: eventIdentifier: not a UUID"},
        {"store {folder}/not.json", 1, "not JSON"},
        {"import {folder}/broken.jsonl", 1, "line 2: startDate: not a date"},
        {"defaults read ../x key", 2, "not a domain"},
        {"defaults read d key", 1, "no value"},
    };
    for (const auto& row : rows) {
        std::string arguments = row.arguments;
        if (const auto at = arguments.find("{folder}"); at != std::string::npos) {
            arguments.replace(at, 8, folder_.path().string());
        }
        const auto result = run(arguments);
        EXPECT_EQ(result.status, row.status) << arguments << "\n" << result.output;
        EXPECT_THAT(result.output, HasSubstr(row.text)) << arguments;
    }
    EXPECT_THAT(conduit_.calls(),
                ElementsAre("collectEvents", "purgeEvents", "clearEvents", "fetchEvents"));

    conduit_.failWith(KSError::make(KSErrorCode::databaseUnavailable, "no database"));
    for (const char* command : {"bundle", "analytics", "events", "bundles --json", "export"}) {
        const auto result = run(command);
        EXPECT_EQ(result.status, 1) << command;
        EXPECT_EQ(result.output, "keepsakesctl: no database\n") << command;
    }
    listener_->invalidate();
    for (const char* command : {"status --json", "collect", "trends", "export"}) {
        EXPECT_EQ(run(command).status, 3) << command;
    }
}

TEST_F(KeepsakesctlTest, OptionsReachTheDaemon) {
    ASSERT_EQ(run("events --since 2024-06-15 --until 2024-06-15 --category WORKOUT --limit 3 "
                  "--descending")
                  .status,
              0);
    KSEventFetchOptions wanted;
    wanted.category = KSEventCategory::workout;
    wanted.limit = 3;
    wanted.dateInterval = {parseISO8601("2024-06-15T00:00:00+02:00")->date,
                           parseISO8601("2024-06-16T00:00:00+02:00")->date};
    EXPECT_EQ(conduit_.lastEventOptions(), wanted) << conduit_.lastEventOptions().description();
    ASSERT_EQ(run("bundles --filtered").status, 0);
    EXPECT_TRUE(conduit_.lastBundleOptions().filterBundle);
    EXPECT_TRUE(conduit_.lastBundleOptions().ascending);
}

TEST_F(KeepsakesctlTest, VisitsTellWhatThePlaceIsToTheOwner) {
    const auto shown = [this](const std::function<void(KSEvent&)>& change) {
        const auto visit = samples::event(1);
        change(*visit);
        conduit_.setEvents({visit});
        return run("events").output;
    };
    EXPECT_THAT(shown([](KSEvent& visit) {
                    visit.mode = KSPlaceMode::tourist;
                    visit.placeDiscovery = 1;
                }),
                HasSubstr("Caf\u00e9 \u6771\u4eac, away from home, new place\n"));
    EXPECT_THAT(shown([](KSEvent& visit) {
                    visit.placeName.reset();
                    visit.location = KSLocation{47.5, -13.6};
                    visit.mode = KSPlaceMode::local;
                    visit.placeUserType = 2;
                    visit.placeDiscovery = 2;
                }),
                HasSubstr("47.50000, -13.60000, work\n"));
}

TEST_F(KeepsakesctlTest, TopicsAreShownByTheirNamesTheStrongestFirst) {
    const auto topic = samples::event(1);
    topic->placeName.reset();
    topic->scoredTopics = KSDictionary{
        {"TFZX59DDWR22CqH8gMQt4Lw", 0.55}, {"TN5KR8Z7ESDORJr1QSxzJFA", 0.825}, {"Tother", 1}};
    conduit_.setEvents({topic});
    EXPECT_THAT(run("events").output, HasSubstr("Tother 1.00, Hiking 0.82, Food 0.55\n"));
}

TEST_F(KeepsakesctlTest, TrendsAmongTheEventsSayWhatTheyFound) {
    const auto trend =
        makeEvent(1, 100, 200, KSEventProvider::postAnalytics, KSEventCategory::visit);
    trend->trends = KSDictionary{{"keyword", "work.exit"}, {"trends", 6}};
    conduit_.setEvents({trend});
    EXPECT_THAT(run("events").output,
                HasSubstr("Post Analytics  leaving work, left work later than usual\n"));
}

TEST_F(KeepsakesctlTest, PhotosTellWhatTheyShowAndWhom) {
    const auto detailsOf = [this](std::vector<std::string> words,
                                  const std::vector<std::string>& people) {
        auto attributes = KSEventExtendedAttributes::initWithLocalIdentifier("k");
        attributes->photoKeepsakeInferences = std::move(words);
        attributes->photoKeepsakePersons.emplace();
        for (const auto& name : people) {
            attributes->photoKeepsakePersons->push_back({{}, name, {}, {}});
        }
        const KSDate day = *calendar::dateOfDay(2024, 6, 15);
        const auto photos = makePhotos(1, day.seconds, (day + 86400).seconds, {});
        photos->extendedAttributes = std::move(attributes);
        conduit_.setEvents({photos});
        return run("events").output;
    };
    EXPECT_THAT(detailsOf({"beach", "beaching", "amusementpark"}, {"Anna", "Ben"}),
                HasSubstr("\n2024-06-15  all day  Photo Keepsake  Photo     "
                          "beach, amusement park; with Anna, Ben\n"));
    EXPECT_THAT(detailsOf({}, {"Anna"}), HasSubstr(" Photo     with Anna\n"));
}

TEST_F(KeepsakesctlTest, TheJsonFormIsStableAndGoesBackIn) {
    conduit_.setEvents({samples::fullEvent(1), samples::event(2)});
    const auto json = run("events --json");
    ASSERT_EQ(json.status, 0) << json.output;
    EXPECT_THAT(json.output,
                HasSubstr(R"("startDate":700003600.0,"startDateISO":"2023-03-08T21:26:40Z")"));
    EXPECT_THAT(json.output, HasSubstr(R"("location":[48.137154,-11.576124])"));
    EXPECT_THAT(json.output, HasSubstr(R"("scoredTopics":{"topic-1":0.5})"));

    folder_.write("events.json", json.output);
    conduit_.setEvents({});
    ASSERT_EQ(run("store " + path("events.json")).status, 0);
    EXPECT_EQ(run("events --json").output, json.output);
    EXPECT_EQ(run("store - --json <" + path("events.json")).output,
              "{\"events\":2,\"bundles\":0}\n");
}

TEST_F(KeepsakesctlTest, AnExportIsImportedAgain) {
    conduit_.setEvents({samples::fullEvent(1), samples::event(2)});
    conduit_.setBundles({samples::bundle({samples::event(2), samples::event(3)})});
    ASSERT_EQ(run("export " + path("all.jsonl")).status, 0);
    const auto before = run("events --json").output;
    conduit_.setEvents({});
    const auto imported = run("import " + path("all.jsonl"));
    ASSERT_EQ(imported.status, 0) << imported.output;
    EXPECT_THAT(imported.output, HasSubstr("stored 3 events\nof 1 bundles their events"));
    EXPECT_EQ(run("events --json --limit 2").output, before);
}

TEST_F(KeepsakesctlTest, AnExportLargerThanAMessageIsFetchedInParts) {
    KSEventArray events;
    for (std::uint32_t number = 0; number < 700; ++number) {
        auto event = samples::event(number);
        event->placeName = std::string(100 << 10, 'x');
        events.push_back(std::move(event));
    }
    conduit_.setEvents(events);
    EXPECT_EQ(run("export --json " + path("all.jsonl")).output, "{\"events\":700,\"bundles\":0}\n");
    conduit_.setEvents({});
    EXPECT_THAT(run("import " + path("all.jsonl")).output, HasSubstr("stored 700 events"));
    EXPECT_EQ(conduit_.events().size(), 700u);
}

TEST_F(KeepsakesctlTest, TablesShowLocalTimesAndBundlesTheirEvents) {
    const auto workout = samples::fullEvent(1);
    conduit_.setEvents({workout});
    conduit_.setBundles({samples::bundle({workout})});
    const auto events = run("events").output;
    EXPECT_THAT(events, HasSubstr("2023-03-08 22:26  22:56  "));
    EXPECT_THAT(events, HasSubstr("Song, Artist, 17 times, 1 h 0 min"));
    EXPECT_THAT(events, HasSubstr("1 event\n"));
    EXPECT_THAT(events, Not(HasSubstr("\033")));
    const auto bundles = run("bundles").output;
    EXPECT_THAT(bundles, HasSubstr("A hike with photos\n  2023-03-08 22:26 to 22:56, by a rule\n"
                                   "  Start"));
    EXPECT_EQ(run("bundles --brief").output, "A hike with photos\n1 bundle\n");
    conduit_.setBundles({samples::bundle({})});
    EXPECT_EQ(run("bundles").output, "0 bundles\n") << "its events are gone";
}

/// Answers as the daemon does that counts days from `now`.
FakeConduit::Analysis analysisAt(KSDate now) {
    return [now](const KSEventArray& events) {
        TestPlatform platform;
        platform.clock.step(now - platform.clock.now());
        const KSTrendsAnalyzer analyzer(platform.services, nullptr);
        std::pair<KSEventArray, OptionalError> answer;
        analyzer.analyzeEvents(
            events, analyzer.buildAnalyticsPlans(),
            [&answer](KSEventArray trends, const KSDictionary& statuses) {
                std::string text;
                for (const auto& [keyword, status] : statuses) {
                    text += fmt::format("({}:{})", keyword, status.description());
                }
                answer.first = std::move(trends);
                if (text.find(":1)") != std::string::npos) {
                    answer = {{}, KSError::make(KSErrorCode::trendAnalysisFailed, text)};
                }
            });
        return answer;
    };
}

TEST_F(KeepsakesctlTest, TrendsAreShownWithTheirSeriesAndInWords) {
    const auto now = parseISO8601("2024-06-16T20:00:00+02:00")->date;
    const auto today = parseISO8601("2024-06-16T03:00:00+02:00")->date;
    conduit_.analyzeWith(analysisAt(now));
    conduit_.setEvents(samples::weeks(today.seconds));
    const auto shown = run("trends");
    EXPECT_EQ(shown.status, 0);
    EXPECT_EQ(shown.output,
              "Workouts\n"
              "  more workout time than usual: 3 h against a median of 30 min\n"
              "  ▂▂▃▂▂▃▂ ▂▃▂▂▃▂▂ ▃▂▂▃▂▂▃ ▂▂▃▂▂▃█  fences: up to 1 h 10 min; yesterday: 3 h\n"
              "Time at work\n"
              "  nothing unusual: 9 h against a median of 9 h\n"
              "  ▇▇█▇▇█▇ ▇█▇▇█▇▇ █▇▇█▇▇█ ▇▇█▇▇█▇  fences: 5 h to 13 h; yesterday: 9 h\n"
              "Leaving work\n"
              "  nothing unusual: 18:00 against a median of 18:00\n"
              "  ▅▁█▅▁█▅ ▁█▅▁█▅▁ █▅▁█▅▁█ ▅▁█▅▁█▅  fences: 14:00 to 22:00; yesterday: 18:00\n"
              "Media\n"
              "  nothing unusual: 20 min against a median of 20 min\n"
              "  ▆▃█▆▃█▆ ▃█▆▃█▆▃ █▆▃█▆▃█ ▆▃█▆▃█▆  fences: up to 1 h; yesterday: 20 min\n"
              "Contacts\n"
              "  nothing unusual: 2 against a median of 2\n"
              "  ▆▃█▆▃█▆ ▃█▆▃█▆▃ █▆▃█▆▃█ ▆▃█▆▃█▆  fences: up to 6; yesterday: 2\n");
    EXPECT_THAT(conduit_.calls(), ElementsAre("fetchEvents", "fetchEvents", "fetchEvents",
                                              "fetchEvents", "analyzeTrends"));

    folder_.write("weeks.json", run("events --json").output);
    EXPECT_EQ(run("trends " + path("weeks.json")).output, shown.output);
    const auto json = parseJson(run("trends --json").output);
    ASSERT_TRUE(json && json->asArray() && json->asArray()->size() == 5u);
    const auto& first = *json->asArray()->front().asDictionary();
    EXPECT_EQ(valueForKey(first, "category"), KSValue(2));
    EXPECT_TRUE(first.contains("startDateISO"));
    const auto& analysis = *valueForKey(first, "analysis").asDictionary();
    EXPECT_EQ(valueForKey(analysis, "days").asArray()->size(), 28u);
    EXPECT_EQ(valueForKey(analysis, "days").asArray()->back(), KSValue(10800.0));
    EXPECT_EQ(valueForKey(analysis, "upperFence"), KSValue(4200.0));
    EXPECT_EQ(valueForKey(analysis, "verdict"), KSValue(6));
}

TEST_F(KeepsakesctlTest, TrendsWithoutEnoughDataSaySoAndWhatIsKnown) {
    const auto now = parseISO8601("2024-06-16T20:00:00+02:00")->date;
    auto events = samples::weeks(parseISO8601("2024-06-16T03:00:00+02:00")->date.seconds);
    std::erase_if(events, [](const auto& event) {
        return event->category() == KSEventCategory::leisureMedia;
    });
    std::erase_if(events, [now](const auto& event) {
        return event->category() == KSEventCategory::visit && now - event->startDate() < 172800;
    });
    conduit_.analyzeWith(analysisAt(now));
    conduit_.setEvents(events);
    const auto shown = run("trends --now 2024-06-16T20:00:00+02:00");
    EXPECT_EQ(shown.status, 1);
    EXPECT_THAT(shown.output, HasSubstr("3 h against a median of 30 min"));
    EXPECT_THAT(shown.output, HasSubstr("  no work yesterday, against a median of 18:00\n"));
    EXPECT_THAT(shown.output, HasSubstr("  less time at work than usual: none against"));
    EXPECT_THAT(shown.output,
                HasSubstr("Media\n  not enough data: 0 of the 27 days before yesterday\nContacts"));
    EXPECT_THAT(shown.output,
                HasSubstr("keepsakesctl: (contact.interactions:5)(meida.playTime:1)"));

    const auto elsewhere = run("trends --now 2024-01-01");
    EXPECT_EQ(elsewhere.status, 1);
    EXPECT_THAT(elsewhere.output, HasSubstr("Workouts\n  more workout time than usual\n"));
    EXPECT_THAT(elsewhere.output, HasSubstr("Figures are left out"));
    EXPECT_EQ(run("trends --now someday").status, 2);
    EXPECT_EQ(run("trends /nonexistent.json").status, 1);
    conduit_.analyzeWith(nullptr);
    conduit_.failWith(KSError::make(KSErrorCode::databaseUnavailable, "no database"));
    EXPECT_EQ(run("trends").output, "keepsakesctl: no database\n");
}

TEST_F(KeepsakesctlTest, DefaultsKeepTheirTypes) {
    const struct {
        const char* typed;
        const char* json;
    } rows[] = {{"true", "true"},   {"17", "17"},
                {"-2.5", "-2.5"},   {"inf", "\"inf\""},
                {"1e3", "1000.0"},  {"text", "\"text\""},
                {"' 7'", "\" 7\""}, {"2024-06-15T10:00:00Z", "740138400.0"}};
    for (const auto& row : rows) {
        ASSERT_EQ(run(fmt::format("defaults write d.x key -- {}", row.typed)).status, 0)
            << row.typed;
        EXPECT_EQ(run("defaults read d.x key --json").output, std::string(row.json) + "\n");
    }
    EXPECT_EQ(run("defaults delete d.x key").status, 0);
    EXPECT_EQ(run("defaults read d.x --json").output, "{}\n");
}

TEST(TerminalTest, WidthsCountWhatATerminalShows) {
    EXPECT_EQ(displayWidth("Cafe\u0301 \u6771\u4eac"), 9u);
    EXPECT_EQ(fitted("\u6771\u4eac\u90fd", 4), "\u6771…");
    EXPECT_EQ(fitted("abc", 3), "abc");
    EXPECT_EQ(printable("a\033]0;x\007\u202eb\u009b\nc\xff"),
              "a\uFFFD]0;x\uFFFD\uFFFDb\uFFFD c\uFFFD");

    Table table({"Name", "Where"});
    table.add({"\u6771\u4eac", "a long place that does not fit"});
    table.add({"x", "y"});
    Screen screen;
    screen.columns = 20;
    EXPECT_EQ(table.text(screen), "Name  Where\n\u6771\u4eac  a long place …\nx     y\n");
    screen.columns = 4;
    EXPECT_EQ(table.text(screen), "Name\n\u6771\u4eac\nx\n");
}

TEST(WordsTest, TimesAreTheOwnersOwn) {
    setenv("TZ", "Europe/Berlin", 1);
    const auto at = [](std::string_view text) { return parseISO8601(text)->date; };
    const auto now = at("2024-03-31T12:00:00+02:00");  // The night lost an hour.
    const struct {
        const char* word;
        const char* date;
        const char* end;
    } rows[] = {
        {"now", "2024-03-31T12:00:00+02:00", "2024-03-31T12:00:00+02:00"},
        {"Today", "2024-03-31T00:00:00+01:00", "2024-04-01T00:00:00+02:00"},
        {"yesterday", "2024-03-30T00:00:00+01:00", "2024-03-31T00:00:00+01:00"},
        {"1d", "2024-03-30T12:00:00+01:00", "2024-03-30T12:00:00+01:00"},
        {"24h", "2024-03-30T11:00:00+01:00", "2024-03-30T11:00:00+01:00"},
        {"2w", "2024-03-17T12:00:00+01:00", "2024-03-17T12:00:00+01:00"},
        {"2024-10-27", "2024-10-27T00:00:00+02:00", "2024-10-28T00:00:00+01:00"},
        {"2024-06-15T10:00", "2024-06-15T10:00:00+02:00", "2024-06-15T10:00:00+02:00"},
        {"2024-06-15T10:00Z", "2024-06-15T10:00:00Z", "2024-06-15T10:00:00Z"},
    };
    for (const auto& row : rows) {
        const auto time = parseTime(row.word, now);
        ASSERT_TRUE(time.has_value()) << row.word;
        EXPECT_EQ(formatISO8601(time->date), formatISO8601(at(row.date))) << row.word;
        EXPECT_EQ(formatISO8601(time->end()), formatISO8601(at(row.end))) << row.word;
    }
    for (const char* word : {"", "d", "3", "-1d", "3y", "99999999999d", "2024-02-30"}) {
        EXPECT_FALSE(parseTime(word, now).has_value()) << word;
    }
}

}  // namespace
}  // namespace keepsakes
