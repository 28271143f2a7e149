// SPDX-License-Identifier: Apache-2.0
#include "indexer/FolderScan.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <fstream>

#include "ScanOnce.h"
#include "TextReader.h"
#include "devicedata/IndexedHealthStore.h"
#include "devicedata/IndexedPhotoAnalysis.h"
#include "indexer/OccasionRule.h"
#include "support/TemporaryFolder.h"

namespace keepsakes {
namespace {

namespace fs = std::filesystem;
using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::UnorderedElementsAre;

struct Occasion {
    std::string identifier;
    std::int64_t photos = 0;
    double start = 0;
    double end = 0;
    std::vector<std::string> inferences;
};

class FolderScan : public testing::Test {
  protected:
    void SetUp() override {
        fs::create_directories(tracks_);
        fs::create_directories(photos_);
    }

    /// The files read are then in `reader_.reads`.
    ScanOutcome scan() {
        reader_.reads.clear();
        return scanOnce(
            {.index = index_, .tracks = {tracks_}, .photos = {photos_}, .now = {now_++}}, reader_);
    }

    std::vector<double> workoutStarts() {
        std::vector<double> starts;
        {
            IndexedHealthStore store(index_, {});
            store.queryWorkouts({{-1e9}, {1e9}}, [&starts](HealthStore::Workouts found) {
                ASSERT_TRUE(found);
                for (const auto& workout : *found) starts.push_back(workout.start.seconds);
            });
        }
        return starts;
    }

    std::vector<Occasion> occasions() {
        std::vector<Occasion> found;
        const auto summary = IndexedPhotoAnalysis(index_).summary(KSDateInterval{{-1e9}, {1e9}});
        if (!summary) return found;
        for (const auto& event : *valueForKey(*summary, kKSKeyEvents).asArray()) {
            const auto& keepsake = *event.asDictionary();
            const auto& interval =
                *valueForKey(keepsake, kKSKeyEventUniversalDateInterval).asDictionary();
            auto& occasion = found.emplace_back();
            occasion = {.identifier = *valueForKey(keepsake, kKSKeyLocalIdentifier).asString(),
                        .photos = *valueForKey(keepsake, kKSKeyPhotoCount).asInteger(),
                        .start = valueForKey(interval, "start").asDate()->seconds,
                        .end = valueForKey(interval, "end").asDate()->seconds,
                        .inferences = {}};
            for (const auto& word : *valueForKey(keepsake, kKSKeyInferences).asArray()) {
                occasion.inferences.push_back(*word.asString());
            }
        }
        return found;
    }

    std::vector<std::string> identifiers() {
        std::vector<std::string> result;
        for (const auto& occasion : occasions()) result.push_back(occasion.identifier);
        return result;
    }

    TemporaryFolder folder_;
    const fs::path tracks_ = folder_ / "Tracks";
    const fs::path photos_ = folder_ / "Pictures";
    const fs::path index_ = folder_ / "deviceData.sqlite";
    TextReader reader_;
    double now_ = 1000;
};

TEST_F(FolderScan, ReadsWhatChangedAndForgetsWhatIsGone) {
    folder_.write("Tracks/a.gpx", "workout 100 200 24");
    folder_.write("Tracks/deep/er/b.gpx", "workout 300 400 24");
    folder_.write("Tracks/notes.txt", "nothing");
    EXPECT_EQ(scan().summary.read, 3u);
    EXPECT_THAT(workoutStarts(), ElementsAre(300, 100));
    const auto unchanged = scan();
    EXPECT_THAT(reader_.reads, IsEmpty());
    EXPECT_FALSE(unchanged.summary.changed);
    EXPECT_EQ(unchanged.summary.totals.files, 3u);

    folder_.write("Tracks/a.gpx", "workout 150 200 24\n");
    fs::remove_all(tracks_ / "deep");
    EXPECT_EQ(scan().summary.removed, 1u);
    EXPECT_THAT(reader_.reads, ElementsAre("workout 150 200 24\n"));
    EXPECT_THAT(workoutStarts(), ElementsAre(150));
}

TEST_F(FolderScan, DeletedRecordsAreNotFoundInTheFilesBytes) {
    folder_.write("Pictures/a.jpg",
                  "photo 100\nword beachball-word\nkeyword one\nkeyword beachball-word");
    scan();
    EXPECT_EQ(
        SQLite::Database(index_.string()).execAndGet("SELECT keywords FROM photos").getString(),
        "one\nbeachball-word");
    fs::remove(photos_ / "a.jpg");
    scan();
    for (const char* suffix : {"", "-wal"}) {
        std::ifstream in(index_.string() + suffix, std::ios::binary);
        const std::string bytes(std::istreambuf_iterator<char>(in), {});
        EXPECT_THAT(bytes, testing::Not(HasSubstr("beachball-word")));
    }
}

TEST_F(FolderScan, PassesOverWhatIsNoFileOfTheOwners) {
    folder_.write("Tracks/good.gpx", "workout 100 200 24");
    for (const char* name : {"x.gpx.part", ".trashed-17-x.gpx", ".stversions/x.gpx",
                             "x.gpx.crdownload", ".syncthing.x.gpx.tmp", ".thumbnails/x.gpx"}) {
        folder_.write(std::string("Tracks/") + name, "workout 1 2 24");
    }
    ASSERT_EQ(::mkfifo((tracks_ / "pipe.gpx").c_str(), 0600), 0);
    fs::create_directory_symlink(tracks_, tracks_ / "loop");
    fs::create_symlink("/dev/zero", tracks_ / "endless.gpx");
    folder_.write("Tracks/caf\xe9\n.gpx", "broken with \x01 bytes");
    std::string deep = "Tracks";
    for (std::size_t i = 0; i < kDeepestFolder + 2; ++i) deep += "/d";
    folder_.write(deep + "/deep.gpx", "workout 5 6 24");
    const auto reporter = scan();
    EXPECT_THAT(workoutStarts(), ElementsAre(100));
    EXPECT_EQ(reporter.summary.totals.files, 2u);
    EXPECT_THAT(reporter.problems, ElementsAre(HasSubstr("caf\\xe9\\x0a.gpx: with \\x01 bytes"),
                                               HasSubstr("too deep")));
}

TEST_F(FolderScan, AMovedFileKeepsItsRecordsUnread) {
    const auto original = folder_.write("Pictures/a.jpg", "photo 1000");
    scan();
    const auto before = identifiers();
    fs::create_directories(photos_ / "album");
    fs::rename(original, photos_ / "album" / "b.jpg");
    const auto reporter = scan();
    EXPECT_EQ(reporter.summary.renamed, 1u);
    EXPECT_THAT(reader_.reads, IsEmpty());
    EXPECT_EQ(identifiers(), before);
    // Same size, other content: no move.
    fs::remove(photos_ / "album" / "b.jpg");
    folder_.write("Pictures/c.jpg", "photo 2000");
    scan();
    EXPECT_THAT(reader_.reads, ElementsAre("photo 2000"));
    EXPECT_THAT(occasions(), ElementsAre(testing::Field(&Occasion::start, 2000 - kOccasionMargin)));
}

TEST_F(FolderScan, AMissingFolderIsADiskThatIsNotMountedAnEmptyOneIsEmptied) {
    folder_.write("Tracks/a.gpx", "workout 100 200 24");
    scan();
    fs::rename(tracks_, folder_ / "elsewhere");
    EXPECT_THAT(scan().problems, ElementsAre(AllOf(HasSubstr("Tracks"), HasSubstr("No such"))));
    EXPECT_THAT(workoutStarts(), ElementsAre(100));
    fs::create_directory(tracks_);
    EXPECT_THAT(scan().problems, IsEmpty());
    EXPECT_THAT(workoutStarts(), IsEmpty());
}

TEST_F(FolderScan, ARefusedFileIsNamedAndNotReadAgainUntilItChanges) {
    const auto broken = folder_.write("Tracks/bad.gpx", "broken line 3: no such tag");
    folder_.write("Tracks/odd.gpx", "holiday letter");
    const std::vector<std::string> problems = scan().problems;
    EXPECT_THAT(problems, UnorderedElementsAre(HasSubstr("bad.gpx: line 3: no such tag"),
                                               HasSubstr("odd.gpx: its content is not")));
    const auto again = scan();
    EXPECT_THAT(reader_.reads, IsEmpty());
    EXPECT_EQ(again.problems, problems);
    EXPECT_EQ(again.summary.totals.refused, 2u);
    folder_.write("Tracks/bad.gpx", "workout 100 200 24");
    EXPECT_EQ(scan().summary.totals.refused, 1u);
    EXPECT_THAT(workoutStarts(), ElementsAre(100));
}

TEST_F(FolderScan, BuildsADamagedOrForeignIndexAnew) {
    folder_.write("Tracks/a.gpx", "workout 100 200 24");
    folder_.write("Pictures/a.jpg", "photo 1000");
    scan();
    const auto before = identifiers();
    const auto size = fs::file_size(index_);
    const auto spoil = {
        std::function([this] { folder_.write("deviceData.sqlite", std::string(9000, 'x')); }),
        std::function([this, size] { fs::resize_file(index_, size / 2); }), std::function([this] {
            SQLite::Database(index_.string(), SQLite::OPEN_READWRITE)
                .exec("PRAGMA user_version = 7");
        })};
    for (const auto& damage : spoil) {
        damage();
        scan();
        EXPECT_THAT(workoutStarts(), ElementsAre(100));
        EXPECT_EQ(identifiers(), before) << "an index built anew knows the same occasions";
    }
}

TEST_F(FolderScan, OccasionsKeepTheirIdentityThroughLateAndDeletedPhotos) {
    folder_.write("Pictures/1.jpg", "photo 10000\nword beach");
    folder_.write("Pictures/2.jpg", "photo 11000\nword beach\nword nature");
    scan();
    const auto before = identifiers();
    ASSERT_EQ(before.size(), 1u);
    folder_.write("Pictures/0.jpg", "photo 9000");
    folder_.write("Pictures/copy.jpg", "photo 9000.4");
    scan();
    EXPECT_EQ(identifiers(), before);
    const auto grown = occasions().front();
    EXPECT_EQ(grown.photos, 3) << "a copy counts with its original";
    EXPECT_EQ(grown.start, 9000 - kOccasionMargin);
    EXPECT_EQ(grown.end, 11000 + kOccasionMargin);
    EXPECT_THAT(grown.inferences, ElementsAre("beach", "nature"));
    // Edited, the photo stays where it was; deleted, the rest goes on.
    folder_.write("Pictures/1.jpg", "photo 10000\nword mountain");
    fs::remove(photos_ / "0.jpg");
    fs::remove(photos_ / "copy.jpg");
    fs::remove(photos_ / "2.jpg");
    scan();
    EXPECT_EQ(identifiers(), before);
    EXPECT_THAT(occasions().front().inferences, ElementsAre("mountain"));
    fs::remove(photos_ / "1.jpg");
    scan();
    EXPECT_THAT(occasions(), IsEmpty());
}

TEST_F(FolderScan, APhotoOnATrackTakesTheTracksZone) {
    folder_.write("Pictures/1.jpg", "local 500 10000");
    scan();
    EXPECT_EQ(occasions().front().start, 500 - kOccasionMargin);
    folder_.write("Tracks/a.gpx", "zone 2000 4000 7200");
    scan();
    EXPECT_EQ(occasions().front().start, 10000 - 7200 - kOccasionMargin);
}

TEST_F(FolderScan, OnlyOneScanWorksOnAnIndex) {
    const auto first = ReadMark::take(index_.string() + ".scan");
    ASSERT_TRUE(first);
    EXPECT_FALSE(ReadMark::take(index_.string() + ".scan"));
}

}  // namespace
}  // namespace keepsakes
