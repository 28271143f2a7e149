// SPDX-License-Identifier: Apache-2.0
#include "linux/LogindLockState.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <memory>

#include "core/Problems.h"
#include "support/MockService.h"
#include "support/TemporaryFolder.h"

namespace keepsakes {
namespace {

constexpr double kDeadlineSeconds = 30;
constexpr int kUnlocked = 0;
constexpr int kLocked = 1;
constexpr int kLocking = 2;
constexpr int kUnknown = -1;

class Logind : public testing::Test {
  protected:
    Logind() { MockService::useSessionBusAsSystemBus(); }
    ~Logind() override {
        if (bus) bus->stop();
    }

    void follow(std::optional<std::string> ownSession = std::nullopt) {
        if (bus) bus->stop();
        lock.reset();
        bus = std::make_unique<BusThread>(BusThread::Bus::system, clock);
        lock = std::make_unique<LogindLockState>(
            *bus, LogindLockState::Owner{::getuid(), std::move(ownSession)},
            folder / "state/unlocked", problems);
        changes = Semaphore();
        observation = lock->observe(queue, [this] { changes.signal(); });
        bus->start();
    }
    /// The state after the next change.
    int next() { return clock.wait(changes, kDeadlineSeconds) ? lock->currentState() : -100; }

    SystemClock clock;
    TemporaryFolder folder;
    Problems problems;
    MockLogind logind;
    std::unique_ptr<BusThread> bus;
    std::unique_ptr<LogindLockState> lock;
    Semaphore changes;
    Observation observation;
    WorkQueue queue{"test"};
};

TEST_F(Logind, FollowsTheLockOfTheOwnersSession) {
    logind.startWithUser();
    logind.addSession("c1", true, true);
    follow();
    EXPECT_EQ(next(), kLocked);
    EXPECT_FALSE(lock->unlockedSinceBoot());
    logind.setLocked("c1", false);
    EXPECT_EQ(next(), kUnlocked);
    EXPECT_TRUE(lock->unlockedSinceBoot());

    logind.requestLock("c1");
    EXPECT_EQ(next(), kLocking);
    logind.requestUnlock("c1");
    EXPECT_EQ(next(), kUnlocked) << "the request was taken back";
    logind.requestLock("c1");
    EXPECT_EQ(next(), kLocking);
    logind.setLocked("c1", true);
    EXPECT_EQ(next(), kLocked);
    logind.setLocked("c1", false);
    EXPECT_EQ(next(), kUnlocked) << "the request was done with";

    logind.removeSession("c1");
    EXPECT_EQ(next(), kLocked) << "nobody is logged in";
    EXPECT_TRUE(lock->unlockedSinceBoot());
}

TEST_F(Logind, KnowsTheOwnersSessionAmongOthers) {
    logind.startWithUser();
    logind.addSession("remote", false, false);
    logind.addSession("tty", true, false);
    logind.addSession("phone", false, true);
    follow("phone");
    EXPECT_EQ(next(), kLocked) << "the daemon's own";
    logind.setLocked("tty", true);
    follow();
    EXPECT_EQ(next(), kLocked) << "the active one";
    logind.setLocked("phone", false);
    logind.setDisplay("phone");
    EXPECT_EQ(next(), kUnlocked) << "the display";
}

TEST_F(Logind, WithoutItTheDeviceCountsAsLockedUntilItComes) {
    follow();
    logind.startWithUser();
    EXPECT_THAT(lock->currentState(), testing::AnyOf(kUnknown, kLocked));
    logind.addSession("c1", true, false);
    int state = next();
    if (state == kLocked) state = next();  // it was seen before it had a session
    EXPECT_EQ(state, kUnlocked);
    EXPECT_THAT(problems.list(), testing::ElementsAre(testing::HasSubstr("no logind")));
}

TEST_F(Logind, TheLastStateOutlivesTheServiceAndItsNonsense) {
    logind.startWithUser();
    logind.addSession("c1", true, false);
    follow();
    EXPECT_EQ(next(), kUnlocked);
    logind.update(logind.sessionPath("c1"), "org.freedesktop.login1.Session",
                  "{'LockedHint': <'perhaps'>}");
    logind.requestLock("c1");
    EXPECT_EQ(next(), kLocking) << "nothing between the two";
    logind.requestUnlock("c1");
    EXPECT_EQ(next(), kUnlocked);

    logind.end();
    logind.startWithUser();
    EXPECT_EQ(next(), kLocked) << "back, and nobody is logged in";
    logind.addSession("c2", true, false);
    EXPECT_EQ(next(), kUnlocked);
}

TEST_F(Logind, RemembersTheFirstUnlockUntilTheMachineStartsAgain) {
    logind.startWithUser();
    logind.addSession("c1", true, false);
    follow();
    EXPECT_EQ(next(), kUnlocked);
    logind.setLocked("c1", true);
    EXPECT_EQ(next(), kLocked);
    follow();
    EXPECT_TRUE(lock->unlockedSinceBoot()) << "before logind has answered";
    folder.write("state/unlocked", "the boot before");
    follow();
    EXPECT_FALSE(lock->unlockedSinceBoot());
    EXPECT_EQ(next(), kLocked);
    EXPECT_FALSE(lock->unlockedSinceBoot());
}

}  // namespace
}  // namespace keepsakes
