// SPDX-License-Identifier: Apache-2.0
#include "core/WorkQueue.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "core/Clock.h"
#include "support/RecordedAssertions.h"
#include "support/VirtualClock.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;

TEST(WorkQueue, KeepsOrderAndExclusionWithMoreCallersThanQueues) {
    // Plain ints: a queue that let two tasks overlap would lose counts, and the thread sanitizer
    // would say so.
    constexpr int kCallers = 8;
    constexpr int kTasks = 2000;
    WorkQueue a("a");
    WorkQueue b("b");
    std::vector<int> lastSeen(kCallers, -1);
    int total = 0;
    bool ordered = true;
    std::vector<std::thread> callers;
    for (int caller = 0; caller < kCallers; ++caller) {
        callers.emplace_back([&a, &b, &lastSeen, &total, &ordered, caller] {
            for (int i = 0; i < kTasks; ++i) {
                a.async([&lastSeen, &total, &ordered, caller, i] {
                    auto& last = lastSeen[static_cast<std::size_t>(caller)];
                    ordered = ordered && last == i - 1;
                    last = i;
                    ++total;
                });
                if (i % 100 == 0) b.sync([&a, &total] { a.sync([&total] { ++total; }); });
            }
        });
    }
    for (auto& caller : callers) caller.join();
    a.sync([] {});
    EXPECT_TRUE(ordered);
    EXPECT_EQ(total, kCallers * kTasks + kCallers * kTasks / 100);
}

TEST(WorkQueue, ABlockedQueueStarvesNoOther) {
    SystemClock clock;
    constexpr int kQueues = 40;
    std::vector<std::unique_ptr<WorkQueue>> blocked;
    std::vector<Semaphore> gates(kQueues);
    for (int i = 0; i < kQueues; ++i) {
        blocked.push_back(std::make_unique<WorkQueue>("blocked"));
        blocked.back()->async([&clock, gate = gates[static_cast<std::size_t>(i)]]() mutable {
            clock.wait(gate, 600);
        });
    }
    WorkQueue free("free");
    bool ran = false;
    free.sync([&ran] { ran = true; });
    EXPECT_TRUE(ran);
    Semaphore answered;
    free.async([answered]() mutable { answered.signal(); });
    EXPECT_TRUE(clock.wait(answered, 60));
    for (auto& gate : gates) gate.signal();
}

TEST(WorkQueue, WaitingForItselfFailsTheAssertionAndStillRuns) {
    RecordedAssertions assertions;
    WorkQueue queue("q");
    bool ran = false;
    queue.sync([&queue, &ran] { queue.sync([&ran] { ran = true; }); });
    EXPECT_TRUE(ran);
    EXPECT_THAT(assertions.takeDescriptions(), ElementsAre("a queue cannot wait for itself"));
}

TEST(WorkQueue, AThrowingTaskLeavesTheQueueWorking) {
    WorkQueue queue("q");
    queue.async([] { throw std::runtime_error("broken on purpose"); });
    bool ran = false;
    queue.sync([&ran] { ran = true; });
    EXPECT_TRUE(ran);
}

TEST(WorkQueue, ItsEndWaitsForWhatItHolds) {
    bool ran = false;
    {
        WorkQueue queue("q");
        queue.async([&ran] { ran = true; });
    }
    EXPECT_TRUE(ran);
}

TEST(Clock, FiresInOrderAndDropsWhatIsCancelled) {
    VirtualClock clock;
    WorkQueue queue("q");
    std::vector<std::string> seen;
    auto late = clock.after(queue, 20, [&seen] { seen.push_back("late"); });
    auto early = clock.after(queue, 10, [&seen] { seen.push_back("early"); });
    auto never = clock.after(queue, 15, [&seen] { seen.push_back("never"); });
    clock.advance(9.5);
    EXPECT_THAT(seen, ElementsAre());
    never.cancel();
    clock.advance(0.5);
    EXPECT_THAT(seen, ElementsAre("early"));
    clock.advance(100);
    EXPECT_THAT(seen, ElementsAre("early", "late"));
}

TEST(Clock, TimeAsleepCountsOnlyWhereItIsAskedFor) {
    VirtualClock clock;
    WorkQueue queue("q");
    std::vector<std::string> seen;
    const auto awake = clock.after(queue, 20, [&seen] { seen.push_back("awake"); });
    const auto elapsed = clock.afterElapsed(queue, 30, [&seen] { seen.push_back("elapsed"); });
    clock.advance(10);
    clock.step(1000);
    clock.suspend(15);
    EXPECT_THAT(seen, ElementsAre());
    EXPECT_EQ(clock.elapsed(), 25);
    clock.suspend(1000);
    EXPECT_THAT(seen, ElementsAre("elapsed"));
    clock.advance(9.9);
    EXPECT_THAT(seen, ElementsAre("elapsed"));
    clock.advance(0.2);
    EXPECT_THAT(seen, ElementsAre("elapsed", "awake"));
}

TEST(WorkQueue, TellsWhatEachQueueIsDoing) {
    const auto reportOf = [](std::string_view label) {
        auto reports = WorkQueue::reports();
        std::erase_if(reports, [label](const auto& report) { return report.label != label; });
        return reports;
    };
    {
        WorkQueue queue("a queue of the report");
        Semaphore gate;
        Semaphore begun;
        queue.async([gate, begun]() mutable {
            begun.signal();
            gate.wait();
        });
        queue.async([] {});
        begun.wait();
        const auto busy = reportOf(queue.label());
        gate.signal();
        ASSERT_EQ(busy.size(), 1u);
        EXPECT_TRUE(busy[0].isRunning);
        EXPECT_EQ(busy[0].waiting, 1u);
    }
    WorkerThreads::shared().settle();
    EXPECT_TRUE(reportOf("a queue of the report").empty());
}

TEST(Clock, AWaitEndsWithTheSignalOrTheTime) {
    VirtualClock clock;
    WorkQueue queue("q");
    std::vector<bool> answers;
    Semaphore signalled;
    Semaphore forgotten;
    queue.async([&clock, &answers, signalled, forgotten]() mutable {
        answers.push_back(clock.wait(signalled, 120));
        answers.push_back(clock.wait(forgotten, 120));
    });
    clock.advance(119);
    EXPECT_THAT(answers, ElementsAre());
    signalled.signal();
    clock.advance(119);
    EXPECT_THAT(answers, ElementsAre(true));
    clock.advance(2);
    EXPECT_THAT(answers, ElementsAre(true, false));
    EXPECT_EQ(clock.pendingCount(), 0u);
}

TEST(Clock, TheSystemClockFiresAndStartsWhereItIsTold) {
    SystemClock clock(KSDate{1000});
    EXPECT_NEAR(clock.now().seconds, 1000, 60);
    WorkQueue queue("q");
    Semaphore fired;
    const auto timer = clock.after(queue, 0.001, [fired]() mutable { fired.signal(); });
    EXPECT_TRUE(clock.wait(fired, 60));
    // One that is further off is pending already, and one is dropped.
    const auto later = clock.afterElapsed(queue, 1000, [] { FAIL(); });
    {
        const auto dropped = clock.afterElapsed(queue, 0.0005, [] { FAIL(); });
    }
    const double before = clock.elapsed();
    const auto sooner = clock.afterElapsed(queue, 0.001, [fired]() mutable { fired.signal(); });
    EXPECT_TRUE(clock.wait(fired, 60));
    EXPECT_GE(clock.elapsed(), before + 0.001);
    Semaphore never;
    EXPECT_FALSE(clock.wait(never, 0.001));
}

}  // namespace
}  // namespace keepsakes
