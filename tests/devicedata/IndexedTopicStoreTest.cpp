// SPDX-License-Identifier: Apache-2.0
#include "devicedata/IndexedTopicStore.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <set>

#include "core/Problems.h"
#include "devicedata/IndexSchema.h"
#include "devicedata/TopicWords.h"
#include "platform/TopicCatalogue.h"
#include "support/TemporaryFolder.h"
#include "support/TestPlatform.h"

namespace keepsakes {
namespace {

using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr double kDay = 86400;
constexpr double kEnough = 0.55;

std::set<std::string> namesOf(const std::set<std::string_view>& topics) {
    std::set<std::string> names;
    for (const auto topic : topics) names.emplace(topicName(topic).value_or("?"));
    return names;
}

class Topics : public testing::Test {
  protected:
    Topics() {
        SQLite::Database made(path.string(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE);
        made.exec(std::string(indexSchema()));
        made.exec("PRAGMA user_version = " + std::to_string(kIndexVersion));
    }

    void execute(const std::string& sql) {
        SQLite::Database(path.string(), SQLite::OPEN_READWRITE).exec(sql);
    }
    void photo(double taken, const std::string& keywords) {
        execute(
            fmt::format("INSERT INTO photos(file, number, taken, timeSource, localTime, keywords)"
                        " VALUES({}, 0, {}, 0, 0, '{}')",
                        ++files, taken, keywords));
    }
    void workout(double end, int type) {
        execute(fmt::format("INSERT INTO workouts VALUES({}, {}, {}, {})", ++files, end - 3600, end,
                            type));
    }
    void calendarEntry(double end, const std::string& title) {
        execute(fmt::format(
            "INSERT INTO calendarEvents VALUES({}, 'id', {}, {}, 0, 0, '{}', '', '', '',"
            " NULL, NULL, NULL, NULL)",
            ++files, end - 3600, end, title));
    }
    void link(double sent, const std::string& title) {
        execute(
            fmt::format("INSERT INTO links VALUES({}, 1, {}, 'https://x.org', '{}', '', '', '',"
                        " NULL, 0)",
                        ++files, sent, title));
    }
    void play(double start, double seconds, const std::string& title, const std::string& genre) {
        NowPlayingRecord record;
        record.title = title;
        record.genre = genre;
        record.duration = 200;
        for (const auto state : {PlaybackState::playing, PlaybackState::stopped}) {
            record.playbackState = state;
            record.absoluteTimestamp = {start};
            stream.records.push_back(record);
            start += seconds;
        }
    }

    /// The scores of the first day by the topics' names.
    std::map<std::string, double> scores(double decayRate = 0.000001) {
        std::map<std::string, double> named;
        const auto found = store.scoresForTopicMapping(
            "keepsakes-topics",
            {.fromDate = {0}, .toDate = {kDay}, .scoringDate = {kDay}, .decayRate = decayRate});
        if (!found) return {{found.error().description(), -1}};
        for (const auto& [topic, score] : *found) {
            named.emplace(topicName(topic).value_or("?"), score);
        }
        return named;
    }
    double score(const std::string& topic) {
        const auto all = scores();
        const auto found = all.find(topic);
        return found == all.end() ? 0 : found->second;
    }

    TemporaryFolder folder;
    const std::filesystem::path path = folder / "deviceData.sqlite";
    int files = 0;
    FakeNowPlayingStream stream;
    Problems problems;
    IndexedTopicStore store{path, folder / "topics.txt", stream, problems};
};

TEST(TopicWords, FindsWordsOfSixLanguagesAndTakesTheLongest) {
    const TopicWords words;
    const std::vector<std::pair<std::string, std::set<std::string>>> rows = {
        {"Wandern", {"Hiking"}},
        {"RANDONNÉE du dimanche", {"Hiking"}},
        {"mountain hiking\nski", {"Hiking", "Skiing"}},
        {"Film-Festival am See", {"Film festivals"}},
        {"ein film\nfestival", {"Movies"}},
        {"Nationalpark Gesäuse: Ausflug", {"National parks", "Travel"}},
        {"film, piano & sushi", {"Movies", "Piano", "Cuisines"}},
        {"Fußball", {"Sports"}},
        {"hikingboots", {}},
        {"workout Running", {"Sports"}},
        {"running late", {}},
        {"\nrock\ngenre rock", {"Music"}},
        {"rock", {}},
        {"", {}},
        {"\xFF\xFE ski \xC3", {"Skiing"}},
    };
    for (const auto& [text, expected] : rows) {
        EXPECT_EQ(namesOf(words.topicsOf(text)), expected) << text;
    }
    std::string longText(100000, '-');
    EXPECT_THAT(words.topicsOf(longText + "ski"), testing::SizeIs(1));
    for (int i = 0; i < 300; ++i) longText.insert(0, "word ");
    EXPECT_THAT(words.topicsOf(longText + "ski"), IsEmpty()) << "beyond the words looked at";
}

TEST(TopicWords, HasWordsForEveryTopic) {
    const TopicWords words;
    for (const auto& topic : topicCatalogue()) {
        EXPECT_THAT(namesOf(words.topicsOf(topic.name)),
                    testing::Contains(std::string(topic.name)));
    }
}

TEST_F(Topics, ClearEvidenceReachesTheThresholdAndStrayEvidenceDoesNot) {
    struct Row {
        const char* what;
        std::function<void()> add;
        const char* topic;
        bool isEnough;
    };
    const std::vector<Row> rows = {
        {"one photo", [this] { photo(100, "hiking"); }, "Hiking", false},
        {"a burst of it",
         [this] {
             for (int i = 1; i < 9; ++i) photo(100 + i, "hiking");
         },
         "Hiking", false},
        {"and a hike, early on the day", [this] { workout(1000, 24); }, "Hiking", true},
        {"a hike alone", [this] { workout(kDay, 24); }, "Hiking", false},
        {"recorded twice", [this] { workout(kDay, 24), workout(kDay - 30, 24); }, "Hiking", false},
        {"three photos apart",
         [this] {
             for (int i = 0; i < 3; ++i) photo(43200 + 3600 * i, "dinner\nanna");
         },
         "Food", true},
        {"one song", [this] { play(50000, 200, "Klavier", "Jazz"); }, "Music", false},
        {"an hour of songs",
         [this] {
             for (int i = 0; i < 18; ++i) play(50000 + 200 * i, 199, "Song", "Jazz");
         },
         "Music", true},
        {"songs passed over",
         [this] {
             for (int i = 0; i < 60; ++i) play(40000 + 600 * i, 20, "Song", "Jazz");
         },
         "Music", false},
        {"an entry of the calendar", [this] { calendarEntry(kDay, "Klavierstunde"); }, "Piano",
         false},
        {"and a link, in the morning",
         [this] { link(30000, "The best piano bars"), link(40000, "A piano trio"); }, "Piano",
         true},
        {"what is not of the day",
         [this] {
             for (int i = 1; i < 9; ++i) photo(-3600 * i, "ski"), photo(kDay + 3600 * i, "ski");
             workout(kDay + 1, 7);
             for (int i = 1; i < 9; ++i) {
                 calendarEntry(kDay + 3600 * i, "ski"), link(-3600 * i, "ski");
             }
             for (int i = 1; i < 9; ++i) play(kDay + 3600 * i, 100, "ski", "");
         },
         "Skiing", false},
    };
    for (const auto& row : rows) {
        const std::string what = row.what;
        if (!what.starts_with("and ")) {
            execute(
                "DELETE FROM photos; DELETE FROM workouts; DELETE FROM calendarEvents;"
                "DELETE FROM links");
            stream.records.clear();
        }
        row.add();
        EXPECT_EQ(score(row.topic) >= kEnough, row.isEnough) << what << ": " << score(row.topic);
    }
}

TEST_F(Topics, EvidenceCountsTheLessTheOlderItIs) {
    photo(0, "ski");
    photo(kDay, "piano");
    const auto found = scores(0.00001);
    EXPECT_NEAR(found.at("Piano"), 0.25, 1e-9);
    EXPECT_NEAR(found.at("Skiing"), 0.25 * std::exp(-0.864), 1e-9);
    workout(kDay, 7);
    EXPECT_NEAR(scores(0).at("Skiing"), 1 - 0.75 * 0.5, 1e-9);
}

TEST_F(Topics, WithoutAllTheEvidenceThereIsNoScore) {
    photo(100, "ski");
    execute("INSERT INTO meta VALUES('occasionsStale', 1)");
    EXPECT_THAT(scores(), ElementsAre(testing::Pair(HasSubstr("are being looked at"), -1)));
    execute("UPDATE meta SET value = 0");
    EXPECT_THAT(scores(), ElementsAre(testing::Key("Skiing")));
    std::filesystem::remove(path);
    EXPECT_THAT(scores(), ElementsAre(testing::Pair(HasSubstr("have not been looked at"), -1)));
    EXPECT_FALSE(store.scoresForTopicMapping("others", {}));
}

TEST_F(Topics, TakesTheOwnersOwnWordsAndSaysWhatIsWrongWithThem) {
    photo(100, "klettersteig");
    EXPECT_THAT(problems.list(), IsEmpty());
    scores();
    EXPECT_THAT(problems.list(), ElementsAre(HasSubstr("topics.txt")))
        << "the configured file is missing";
    folder.write("topics.txt",
                 "# mine\nhiking: via ferrata, Klettersteig # and so on\nFlying: plane\n\nwords\n");
    EXPECT_THAT(scores(), ElementsAre(testing::Key("Hiking")));
    scores();
    EXPECT_THAT(problems.list(),
                ElementsAre(AllOf(HasSubstr("topics.txt:5"), HasSubstr("a colon")),
                            HasSubstr("topics.txt:3: there is no topic \"Flying\""),
                            HasSubstr("topics.txt")));
    folder.write("topics.txt", std::string(TopicWords::kLargestFile + 1, 'x'));
    EXPECT_THAT(scores(), IsEmpty());
    EXPECT_EQ(problems.list().size(), 4u);
}

}  // namespace
}  // namespace keepsakes
