// SPDX-License-Identifier: Apache-2.0
#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>

#include "devicedata/IndexSchema.h"
#include "devicedata/IndexedHealthStore.h"
#include "devicedata/IndexedPhotoAnalysis.h"
#include "support/TemporaryFolder.h"

namespace keepsakes {

void PrintTo(const WorkoutSample& sample, std::ostream* out) {
    *out << sample.activityType << " " << sample.start.seconds << ".." << sample.end.seconds;
}

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class IndexedStores : public testing::Test {
  protected:
    void makeIndex(const std::string& rows) {
        SQLite::Database index(path_.string(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE);
        index.exec("PRAGMA journal_mode = WAL");
        index.exec(std::string(indexSchema()));
        index.exec("PRAGMA user_version = " + std::to_string(kIndexVersion));
        if (!rows.empty()) index.exec(rows);
    }

    HealthStore::Workouts workouts(double from, double to) {
        HealthStore::Workouts answer;
        {
            IndexedHealthStore store(path_, {});
            store.queryWorkouts({{from}, {to}}, [&answer](auto found) { answer = found; });
        }
        return answer;
    }

    std::vector<std::string> keepsakes(const PhotoAnalysis::Summary& summary) {
        std::vector<std::string> identifiers;
        if (!summary) return {"error: " + summary.error().description()};
        for (const auto& event : *valueForKey(*summary, kKSKeyEvents).asArray()) {
            identifiers.push_back(
                *valueForKey(*event.asDictionary(), kKSKeyLocalIdentifier).asString());
        }
        return identifiers;
    }

    TemporaryFolder folder_;
    const std::filesystem::path path_ = folder_ / "deviceData.sqlite";
};

TEST_F(IndexedStores, AnswerNothingBeforeTheFirstScan) {
    IndexedPhotoAnalysis photos(path_);
    for (const bool isBegun : {false, true}) {
        if (isBegun) folder_.write("deviceData.sqlite", "");
        const auto samples = workouts(0, 1e9);
        ASSERT_TRUE(samples);
        EXPECT_THAT(*samples, IsEmpty());
        EXPECT_THAT(keepsakes(photos.summary(KSDateInterval{{0}, {1e9}})), IsEmpty());
    }
}

TEST_F(IndexedStores, SayWhenTheIndexCannotBeRead) {
    IndexedPhotoAnalysis photos(path_);
    makeIndex("PRAGMA user_version = 99");
    EXPECT_FALSE(workouts(0, 1e9));
    EXPECT_FALSE(photos.summary(KSDateInterval{{0}, {1e9}}));
    std::filesystem::remove(path_);
    folder_.write("deviceData.sqlite", std::string(8192, 'x'));
    EXPECT_FALSE(workouts(0, 1e9));
    std::filesystem::remove(path_);
    std::filesystem::create_directory(path_);
    EXPECT_FALSE(workouts(0, 1e9));
}

TEST_F(IndexedStores, WorkoutsAreThoseThatEndInTheWindowEachOnce) {
    makeIndex(
        "INSERT INTO workouts(file, start, end, type) VALUES"
        "(1, 50, 100, 24), (2, 50, 100, 24), (3, 50, 100, 37), (4, 90, 200, 24),"
        "(5, 10, 99, 24), (6, 150, 201, 24)");
    const auto samples = workouts(100, 200);
    ASSERT_TRUE(samples);
    EXPECT_THAT(*samples,
                ElementsAre(WorkoutSample{{90}, {200}, 24}, WorkoutSample{{50}, {100}, 24},
                            WorkoutSample{{50}, {100}, 37}));
}

TEST_F(IndexedStores, KeepsakesAreThoseThatOverlapTheInterval) {
    makeIndex(
        "INSERT INTO meta VALUES('lastChanged', 777.5);"
        "INSERT INTO occasions(identifier, start, end, photos, content) VALUES"
        "('late', 300, 400, 2, '{\"inferences\": [\"beach\"]}'), ('early', 100, 200, 1, '{}'),"
        "('over', 401, 500, 1, '{}'), ('before', 0, 99, 1, '{}')");
    IndexedPhotoAnalysis photos(path_);
    EXPECT_THAT(keepsakes(photos.summary(KSDateInterval{{200}, {300}})),
                ElementsAre("early", "late"));
    EXPECT_THAT(keepsakes(photos.summary(KSDateInterval{{201}, {299}})), IsEmpty());
    const std::vector<std::string> wanted{"over", "gone", "late"};
    const auto summary = photos.summary(wanted);
    EXPECT_THAT(keepsakes(summary), ElementsAre("late", "over"));
    EXPECT_EQ(valueForKey(*summary, kKSKeyGraphCreationDate), KSValue(KSDate{777.5}));
    EXPECT_EQ(valueForKey(*summary, kKSKeyEvents).asArray()->front(),
              KSValue(KSDictionary{{"localIdentifier", "late"},
                                   {"inferences", KSArray{"beach"}},
                                   {"photoCount", 2},
                                   {"eventUniversalDateInterval",
                                    KSDictionary{{"start", KSDate{300}}, {"end", KSDate{400}}}}}));
    EXPECT_FALSE(photos.summary(std::vector<std::string>(PhotoAnalysis::kMostIdentifiers + 1)));
}

TEST_F(IndexedStores, SeeAnIndexThatTookAnothersPlace) {
    IndexedPhotoAnalysis photos(path_);
    const auto row = [](const std::string& name) {
        return "INSERT INTO occasions(identifier, start, end, photos, content) VALUES('" + name +
               "', 1, 2, 1, '{}')";
    };
    makeIndex(row("first"));
    EXPECT_THAT(keepsakes(photos.summary(KSDateInterval{{0}, {9}})), ElementsAre("first"));
    for (const char* suffix : {"", "-wal", "-shm"}) {
        std::filesystem::remove(path_.string() + suffix);
    }
    EXPECT_THAT(keepsakes(photos.summary(KSDateInterval{{0}, {9}})), IsEmpty());
    makeIndex(row("second"));
    EXPECT_THAT(keepsakes(photos.summary(KSDateInterval{{0}, {9}})), ElementsAre("second"));
}

}  // namespace
}  // namespace keepsakes
