// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>

#include "core/Clock.h"
#include "devicedata/IndexedHealthStore.h"
#include "linux/IndexerProcess.h"
#include "support/TemporaryFolder.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::UnorderedElementsAre;

// The sanitizers want what the sandbox takes away, so that the indexer then runs without one.
#ifdef KEEPSAKES_SANITIZED
constexpr bool kIsConfined = false;
#else
constexpr bool kIsConfined = true;
#endif

class IndexerCrash : public testing::Test {
  protected:
    IndexerOptions options(int mostStarts = 16) const {
        return {.program = KEEPSAKES_PLANTED_INDEXER,
                .index = folder_ / "cache/deviceData.sqlite",
                .tracks = {folder_ / "Tracks"},
                .photos = {},
                .mostStarts = mostStarts};
    }

    std::size_t workoutCount() {
        std::size_t count = 0;
        {
            IndexedHealthStore store(folder_ / "cache/deviceData.sqlite", {});
            store.queryWorkouts({{0}, {1e9}}, [&count](HealthStore::Workouts found) {
                if (found) count = found->size();
            });
        }
        return count;
    }

    TemporaryFolder folder_;
    SystemClock clock_;
};

TEST_F(IndexerCrash, AFileThatEndsTheIndexerIsPassedOverAndNamedAndTheOthersAreRead) {
    for (int i = 0; i < 20; ++i) {
        folder_.write("Tracks/good" + std::to_string(i) + ".gpx",
                      "workout " + std::to_string(100 + i) + " 200 24");
    }
    folder_.write("Tracks/crash.gpx", "crash");
    folder_.write("Tracks/abort.gpx", "abort");
    folder_.write("Tracks/hang.gpx", "hang");
    IndexerProcess index(clock_, options());
    const auto report = index.refresh({});
    EXPECT_TRUE(report.complete);
    EXPECT_EQ(report.filesIndexed, 23u);
    EXPECT_EQ(report.filesRefused, 3u);
    EXPECT_THAT(report.problems,
                UnorderedElementsAre(HasSubstr("crash.gpx: it ended the indexer"),
                                     HasSubstr("abort.gpx: it ended the indexer"),
                                     HasSubstr("hang.gpx: reading it took too long")));
    EXPECT_EQ(workoutCount(), 20u);
    // With a single start, a file read again would leave the scan incomplete.
    EXPECT_TRUE(IndexerProcess(clock_, options(1)).refresh({}).complete);
    folder_.write("Tracks/crash.gpx", "workout 500 600 24");
    EXPECT_EQ(index.refresh({}).filesRefused, 2u);
    EXPECT_EQ(workoutCount(), 21u);
}

TEST_F(IndexerCrash, AScanGoesOnWhereTooManyCrashesEndedTheLast) {
    for (int i = 0; i < 5; ++i) {
        folder_.write("Tracks/crash" + std::to_string(i) + ".gpx",
                      "crash" + std::string(static_cast<std::size_t>(i), ' '));
    }
    folder_.write("Tracks/good.gpx", "workout 100 200 24");
    IndexerProcess index(clock_, options(3));
    const auto first = index.refresh({});
    EXPECT_FALSE(first.complete);
    EXPECT_THAT(first.problems, ElementsAre(HasSubstr("crashed 3 times")));
    const auto second = index.refresh({});
    EXPECT_TRUE(second.complete);
    EXPECT_EQ(second.filesRefused, 5u);
    EXPECT_EQ(workoutCount(), 1u);
}

TEST_F(IndexerCrash, AFileThatEatsMemoryIsRefused) {
    if (!kIsConfined) GTEST_SKIP() << "no limit of memory under a sanitizer";
    folder_.write("Tracks/eat.gpx", "eat");
    folder_.write("Tracks/good.gpx", "workout 100 200 24");
    const auto report = IndexerProcess(clock_, options()).refresh({});
    EXPECT_TRUE(report.complete);
    EXPECT_THAT(report.problems, ElementsAre(HasSubstr("eat.gpx: reading it takes too much")));
    EXPECT_EQ(workoutCount(), 1u);
}

TEST_F(IndexerCrash, AReaderCannotLeaveTheSandbox) {
    if (!kIsConfined) GTEST_SKIP() << "no sandbox under a sanitizer";
    std::string modules;
    std::getline(std::ifstream("/sys/kernel/security/lsm"), modules);
    const auto outside = folder_.write("secret.txt", "secret");
    folder_.write("Tracks/evil.gpx", "escape " + outside.string());
    const auto report = IndexerProcess(clock_, options()).refresh({});
    ASSERT_EQ(report.problems.size(), 1u);
    if (modules.find("landlock") == std::string::npos) {
        // Files are landlock's part; this kernel has none.
        for (const char* deed : {"socket", "fork", "signal"}) {
            EXPECT_THAT(report.problems.front(), testing::Not(HasSubstr(deed)));
        }
    } else {
        EXPECT_THAT(report.problems, ElementsAre(HasSubstr("evil.gpx: confined")));
    }
}

}  // namespace
}  // namespace keepsakes
