// SPDX-License-Identifier: Apache-2.0
#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fmt/format.h>

#include <filesystem>

#include "devicedata/IndexSchema.h"
#include "devicedata/IndexedHealthStore.h"
#include "devicedata/IndexedPhotoAnalysis.h"
#include "devicedata/IndexedRoutineService.h"
#include "support/TemporaryFolder.h"
#include "support/VirtualClock.h"

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

class IndexedRoutine : public IndexedStores {
  protected:
    template <class Result, class Ask>
    Result answerOf(const Ask& ask) {
        Result answer;
        {
            IndexedRoutineService service(path_, clock_);
            ask(service, [&answer](Result given) { answer = std::move(given); });
        }
        return answer;
    }

    RoutineService::Visits visits(const VisitFetchOptions& options) {
        return answerOf<RoutineService::Visits>([&options](auto& service, auto handler) {
            service.fetchStoredVisits(options, handler);
        });
    }

    std::uint64_t modeAt(double latitude) {
        return *answerOf<RoutineService::Mode>([latitude](auto& service, auto handler) {
            service.fetchRoutineModeFromLocation({latitude, 8}, handler);
        });
    }

    const VirtualClock clock_{{100000}};
};

TEST_F(IndexedRoutine, AnswersTheVisitsThatOverlapWithTheirPlaces) {
    makeIndex(
        "INSERT INTO places VALUES(1, '00000000-0000-0000-0000-000000000007', 50, 8, 'Mine', 'Map',"
        " 1), (2, '00000000-0000-0000-0000-000000000008', 51, 8, NULL, 'Inn', 0);"
        "INSERT INTO visits(start, end, latitude, longitude, confidence, isOpen, isStated, name,"
        " use, recorded, place) VALUES"
        "(300, 400, 51, 8, 0.9, 0, 1, 'Stated', 0, 77, 2), (100, 200, 50, 8, 0.5, 0, 0, NULL, 0, 7,"
        " 1), (90, 99, 50, 8, 1, 0, 0, NULL, 0, 7, 1), (150, 160, 52, 8, 0.4, 0, 0, NULL, 0, 7,"
        " NULL), (401, 500, 50, 8, 1, 0, 0, NULL, 0, 7, 1)");
    const auto found = visits({.interval = {{200}, {300}}});
    ASSERT_TRUE(found);
    const RoutineVisit home{.entry = KSDate{100},
                            .exit = KSDate{200},
                            .date = {7},
                            .type = kVisitWhole,
                            .location = GeoPoint{50, 8},
                            .placeInference = PlaceInference{"Mine", MapItem{"Map"}, 1,
                                                             KSUUID::parse("00000000-0000-0000-"
                                                                           "0000-000000000007")}};
    ASSERT_EQ(found->size(), 2u);
    EXPECT_EQ(found->at(0), home);
    EXPECT_EQ(found->at(1).placeInference->mapItem->name, "Stated");
    EXPECT_EQ(visits({.minimumConfidence = 0.95, .interval = {{200}, {300}}})->size(), 0u);
    const auto newest = visits({.ascending = false,
                                .interval = {{0}, {1000}},
                                .labelVisitsWithPlaceInferences = false,
                                .limit = 1});
    ASSERT_EQ(newest->size(), 1u);
    EXPECT_EQ(newest->at(0).entry, KSDate{401});
    EXPECT_EQ(newest->at(0).placeInference, std::nullopt);

    const auto locations = answerOf<RoutineService::Locations>([](auto& service, auto handler) {
        service.fetchLocationsOfInterestVisitedBetween(KSDate::distantPast(), {400}, handler);
    });
    ASSERT_EQ(locations->size(), 2u);
    EXPECT_THAT(locations->at(0).visits,
                ElementsAre(LocationOfInterestVisit{GeoPoint{50, 8}, KSDate{90}, KSDate{99}},
                            LocationOfInterestVisit{GeoPoint{50, 8}, KSDate{100}, KSDate{200}}));
}

TEST_F(IndexedRoutine, AVisitIsOpenUntilNothingCanBelongToIt) {
    const double limit = 100000 - kVisitGivenUpAfter;
    makeIndex(fmt::format(
        "INSERT INTO visits(start, end, latitude, longitude, confidence, isOpen, isStated, use,"
        " recorded) VALUES(100, {}, 50, 8, 1, 1, 0, 0, 7), (101, {}, 50, 8, 1, 1, 0, 0, 7)",
        limit - 1, limit));
    const auto found = visits({.interval = {{0}, {1e6}}});
    ASSERT_EQ(found->size(), 2u);
    EXPECT_EQ(found->at(0).type, kVisitWhole);
    EXPECT_EQ(found->at(0).exit, KSDate{limit - 1});
    EXPECT_EQ(found->at(1).type, kVisitArrival);
    EXPECT_EQ(found->at(1).exit, std::nullopt);
}

TEST_F(IndexedRoutine, TheModeIsTheDistanceFromTheNearestHome) {
    makeIndex("");
    EXPECT_EQ(modeAt(50), 0u) << "no home is known";
    SQLite::Database(path_.string(), SQLite::OPEN_READWRITE)
        .exec(
            "INSERT INTO places VALUES(1, 'a', 50, 8, NULL, NULL, 1), (2, 'b', 60, 8, NULL, NULL,"
            " 2); INSERT INTO namedPlaces VALUES(1, 55, 8, 'Home', 1, 0), (1, 40, 8, 'Her home', 1,"
            " 1)");
    EXPECT_EQ(modeAt(50.44), 1u);
    EXPECT_EQ(modeAt(50.46), 2u);
    EXPECT_EQ(modeAt(55.1), 1u) << "marked, though never visited";
    EXPECT_EQ(modeAt(60), 2u);
    EXPECT_EQ(modeAt(40), 2u) << "a contact's home is not the owner's";
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
