// SPDX-License-Identifier: Apache-2.0
#include "linux/IndexerProcess.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <optional>

#include "support/TemporaryFolder.h"
#include "support/VirtualClock.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr const char* kReport = R"(echo '{"report": {"indexed": 7, "refused": 2}}')";

/// Runs shell scripts in place of the indexer. Time is virtual, the children are real.
class IndexerProcessTest : public testing::Test {
  protected:
    void SetUp() override { ASSERT_EQ(::mkfifo((folder_ / "gate").c_str(), 0600), 0); }

    void TearDown() override {
        // Every child was taken leave of.
        EXPECT_EQ(::waitpid(-1, nullptr, WNOHANG), -1);
        EXPECT_EQ(errno, ECHILD);
    }

    /// The script's `$folder` is the test's folder, in which "starts" counts its starts.
    IndexerOptions script(const std::string& body) {
        const auto path = folder_.write("indexer", "#!/bin/sh\nfolder=" + folder_.path().string() +
                                                       "\necho >> $folder/starts\n" + body + "\n");
        std::filesystem::permissions(path, std::filesystem::perms::owner_all);
        return {.program = path,
                .index = folder_ / "index.sqlite",
                .tracks = {folder_ / "Tracks"},
                .photos = {}};
    }

    std::size_t starts() {
        std::ifstream in(folder_ / "starts");
        return static_cast<std::size_t>(std::count(std::istreambuf_iterator<char>(in), {}, '\n'));
    }

    /// Calls `refresh` on a queue of its own and waits until it has told the progress 1 of 2.
    struct Call {
        Call(IndexerProcess& index, SystemClock& real) : queue("caller") {
            Semaphore told;
            queue.async([this, &index, told]() mutable {
                answer = index.refresh([&told](std::uint64_t done, std::uint64_t total) {
                    if (done == 1 && total == 2) told.signal();
                });
                answered.signal();
            });
            EXPECT_TRUE(real.wait(told, 30));
        }
        ScanReport report(SystemClock& real) {
            EXPECT_TRUE(real.wait(answered, 30));
            return answer;
        }
        ScanReport answer;
        Semaphore answered;
        WorkQueue queue;
    };

    TemporaryFolder folder_;
    VirtualClock clock_;
    SystemClock real_;
};

constexpr const char* kProgress = R"(echo '{"progress": {"done": 1, "total": 2}}')";

TEST_F(IndexerProcessTest, HandsOnWhatTheChildSays) {
    IndexerProcess index(clock_, script(R"(echo 'no json'; head -c 200000 /dev/zero; echo; echo '[]'
                  echo '{"problem": "old"}'; echo '{"problem": "new"}'
                  echo "$@" > $folder/words; printf '%s' '{"problem": )" +
                                        std::string(100000, 'x') + "'; echo '\"}'; " + kReport));
    const auto report = index.refresh({});
    EXPECT_TRUE(report.complete);
    EXPECT_EQ(report.filesIndexed, 7u);
    EXPECT_EQ(report.filesRefused, 2u);
    EXPECT_THAT(report.problems, ElementsAre("new", "old"));
    EXPECT_EQ(index.lastReport().problems, report.problems);
    std::string words;
    std::getline(std::ifstream(folder_ / "words"), words);
    EXPECT_EQ(words, "--json --index " + (folder_ / "index.sqlite").string() +
                         " --now 700000000 --tracks " + (folder_ / "Tracks").string());
}

TEST_F(IndexerProcessTest, ACallerIsNotHeldLongerThanItsLimitAndTheNextJoinsTheScan) {
    IndexerProcess index(clock_, script(std::string(kProgress) + "; cat $folder/gate; " + kReport));
    Call first(index, real_);
    clock_.advance(99);
    EXPECT_EQ(first.answer.filesIndexed, 0u);
    clock_.advance(2);
    EXPECT_FALSE(first.report(real_).complete);
    Call second(index, real_);
    Call third(index, real_);
    std::ofstream(folder_ / "gate") << "\n";
    EXPECT_TRUE(second.report(real_).complete);
    EXPECT_EQ(third.report(real_).filesIndexed, 7u);
    EXPECT_EQ(starts(), 1u);
}

TEST_F(IndexerProcessTest, AChildThatHangsIsKilledAndStartedAgain) {
    IndexerProcess index(
        clock_, script("if [ ! -e $folder/second ]; then touch $folder/second; trap '' TERM; " +
                       std::string(kProgress) + "; sleep 1000; fi; " + kReport));
    Call call(index, real_);
    clock_.advance(99);
    clock_.advance(50);
    EXPECT_FALSE(call.report(real_).complete);
    EXPECT_TRUE(index.refresh({}).complete);
    // The scan may have ended before the second call, which then began another.
    EXPECT_GE(starts(), 2u);
}

TEST_F(IndexerProcessTest, AChildThatAlwaysCrashesIsGivenUpOn) {
    auto options = script("kill -SEGV $$");
    options.mostStarts = 4;
    IndexerProcess index(clock_, options);
    EXPECT_THAT(index.refresh({}).problems, ElementsAre(HasSubstr("crashed 4 times")));
    EXPECT_EQ(starts(), 4u);
}

TEST_F(IndexerProcessTest, AFailureIsAProblemAndWhatWasKnownStays) {
    auto options = script("[ -e $folder/fail ] && exit 1; " + std::string(kReport));
    IndexerProcess index(clock_, options);
    EXPECT_TRUE(index.refresh({}).complete);
    folder_.write("fail", "");
    const auto failed = index.refresh({});
    EXPECT_FALSE(failed.complete);
    EXPECT_EQ(failed.filesIndexed, 7u);
    EXPECT_THAT(failed.problems, ElementsAre(HasSubstr("failed with status 1")));
    EXPECT_EQ(index.refresh({}).problems.size(), 1u) << "told once";
    options.program = folder_ / "nowhere";
    EXPECT_THAT(IndexerProcess(clock_, options).refresh({}).problems,
                ElementsAre(HasSubstr("start " + options.program.string())));
}

TEST_F(IndexerProcessTest, StoppingEndsTheScanAndLaterOnesReturnAtOnce) {
    IndexerProcess index(clock_, script(std::string(kProgress) + "; exec sleep 1000"));
    Call call(index, real_);
    index.stop();
    EXPECT_FALSE(call.report(real_).complete);
    EXPECT_FALSE(index.refresh({}).complete);
    EXPECT_EQ(starts(), 1u);
}

TEST_F(IndexerProcessTest, AScanWithoutAnEndIsEndedInOrder) {
    auto options = script(std::string("trap 'touch $folder/ended; exit 4' TERM; ") + kProgress +
                          "; while :; do sleep 0.01; " + kProgress + "; done");
    options.replyLimit = 5000;
    options.silenceLimit = 10000;
    IndexerProcess index(clock_, options);
    Call call(index, real_);
    clock_.advance(1801);
    EXPECT_THAT(call.report(real_).problems, ElementsAre(HasSubstr("took too long")));
    EXPECT_TRUE(std::filesystem::exists(folder_ / "ended"));
}

}  // namespace
}  // namespace keepsakes
