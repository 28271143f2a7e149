// SPDX-License-Identifier: Apache-2.0
#include "linux/ActivityTimers.h"

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>

#include "core/Clock.h"
#include "support/FakeDeviceState.h"
#include "support/TemporaryFolder.h"
#include "support/VirtualClock.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr double kHour = 3600;
constexpr double kDay = 24 * kHour;

class Activities : public testing::Test {
  protected:
    /// Begins anew on the same file, as after a restart.
    void start(std::vector<ActivityCriteria> criteria) {
        end();
        begun = clock.elapsed();
        timers = std::make_unique<ActivityTimers>(clock, power, criteria, file);
        for (const auto& one : criteria) {
            registrations.push_back(timers->schedulePreregistered(
                one.identifier, [this, name = one.identifier](const auto& run) {
                    starts.push_back(fmt::format("{} {:.0f}", name, clock.elapsed() - begun));
                    if (holds) {
                        held[name] = run;
                    } else {
                        run->finish();
                    }
                }));
        }
        WorkerThreads::shared().settle();
    }

    void end() {
        held.clear();
        registrations.clear();
        timers.reset();
    }
    ~Activities() override { end(); }

    /// "<name> <seconds since the last start of the timers>" of each.
    std::vector<std::string> startsDuring(double seconds) {
        starts.clear();
        clock.advance(seconds);
        return starts;
    }

    TemporaryFolder folder;
    const std::filesystem::path file = folder / "state/activities.plist";
    VirtualClock clock;
    FakePowerSources power;
    bool holds = false;
    double begun = 0;
    std::map<std::string, std::shared_ptr<ActivityRun>> held;
    std::vector<std::string> starts;
    std::unique_ptr<ActivityTimers> timers;
    std::vector<ActivityRegistration> registrations;
};

TEST_F(Activities, StartOnceAPeriodAndNothingWakesBetween) {
    start({{"hourly", kHour}, {"daily", kDay}, {"never", 0}});
    EXPECT_THAT(startsDuring(2 * kHour), ElementsAre("hourly 60", "daily 90", "hourly 3660"));
    EXPECT_EQ(clock.pendingCount(), 1u);
    EXPECT_THAT(startsDuring(kHour - 100), ElementsAre("hourly 7260"));
    starts.clear();
    clock.advance(23 * kHour);
    EXPECT_EQ(std::ranges::count(starts, "daily 86490"), 1);
    timers->stop();
    EXPECT_THAT(startsDuring(kDay), IsEmpty());
    EXPECT_EQ(clock.pendingCount(), 0u);
}

TEST_F(Activities, AreRememberedAcrossRestartsAndOverdueOnesAreSpacedOut) {
    const std::vector<ActivityCriteria> criteria = {{"a", kHour}, {"b", kDay}, {"c", kDay}};
    start(criteria);
    clock.advance(130);
    EXPECT_THAT(starts, ElementsAre("a 60", "b 90", "c 120"));
    end();
    clock.advance(kHour - 70 - 900);  // a quarter of an hour before a's next start
    start(criteria);
    EXPECT_THAT(startsDuring(kHour), ElementsAre("a 900"));
    end();
    clock.advance(3 * kDay);
    start(criteria);
    EXPECT_THAT(startsDuring(kHour), ElementsAre("a 60", "b 90", "c 120"));
}

TEST_F(Activities, WhatCameDueDuringSleepStartsOnceOnWaking) {
    start({{"a", kHour}, {"b", kDay}});
    clock.advance(kHour);
    starts.clear();
    clock.suspend(5 * kHour);
    EXPECT_THAT(starts, ElementsAre("a 21600"));
    EXPECT_THAT(startsDuring(kHour), ElementsAre("a 25200"));
    clock.suspend(kDay);
    EXPECT_THAT(startsDuring(100), ElementsAre("b 111630")) << "a at once, b half a minute later";
}

/// How the clock is set, while the daemon runs and while it does not.
TEST_F(Activities, RecoverWithinAPeriodFromAClockThatIsSet) {
    for (const double step : {-365 * kDay, -kHour, kHour, 365 * kDay}) {
        SCOPED_TRACE(step);
        std::filesystem::remove(file);
        start({{"a", 6 * kHour}});
        clock.advance(kHour);
        clock.step(step);
        EXPECT_THAT(startsDuring(6 * kHour), ElementsAre("a 21660")) << "while it runs: no change";
        end();
        clock.step(step);
        start({{"a", 6 * kHour}});
        EXPECT_EQ(startsDuring(6 * kHour).size(), 1u);
    }
}

TEST_F(Activities, ARunThatOutlastsItsPeriodIsNotStartedTwice) {
    holds = true;
    start({{"a", kHour}, {"b", kHour}});
    EXPECT_THAT(startsDuring(2.5 * kHour), ElementsAre("a 60", "b 90"));
    EXPECT_THAT(timers->describe("a"), HasSubstr("a: running for 2 h 29 min"));
    held["a"]->finish();
    held["a"]->finish();
    EXPECT_THAT(startsDuring(kHour), ElementsAre("a 10860")) << "the periods passed over are lost";
    held["a"]->finish();
    end();
    start({{"a", kHour}, {"b", kHour}});
    EXPECT_THAT(startsDuring(100), ElementsAre("b 60"));
    end();
    start({{"a", kHour}, {"b", kHour}});
    EXPECT_THAT(startsDuring(100), ElementsAre("b 60")) << "the last one was given up";
}

TEST_F(Activities, WaitForTheChargerAndBeginWhenItComes) {
    start({{"a", kHour, true}, {"b", kHour, true}, {"c", kHour}});
    power.setExternalPower(false);
    EXPECT_THAT(startsDuring(kHour), ElementsAre("c 60"));
    EXPECT_THAT(timers->describe("a"),
                testing::StartsWith("a: due for 59 min, waiting for external power; every 1 h on "
                                    "external power; no run yet"));
    EXPECT_THAT(startsDuring(1), IsEmpty());
    starts.clear();
    power.setExternalPower(true);
    clock.advance(60);
    EXPECT_THAT(starts, ElementsAre("a 3601", "b 3631", "c 3661"));
    EXPECT_THAT(timers->describe("b"), HasSubstr("b: due in 59 min"));
    EXPECT_THAT(timers->describe("c"),
                testing::MatchesRegex("c: due in 1 h; every 1 h; last run 20.*Z"));
}

TEST_F(Activities, ShortPeriodsAreKept) {
    start({{"a", 6}, {"b", 6}, {"c", 6}});
    EXPECT_THAT(startsDuring(13), ElementsAre("a 6", "b 7", "c 8", "a 12", "b 13"));
}

TEST_F(Activities, AStateFileThatIsNoneIsRebuilt) {
    for (const char* content : {"", "<plist",
                                "<plist version=\"1.0\"><dict><key>a</key><true/>"
                                "</dict></plist>"}) {
        folder.write("state/activities.plist", content);
        start({{"a", kHour}});
        EXPECT_THAT(startsDuring(100), ElementsAre("a 60")) << content;
        start({{"a", kHour}});
        EXPECT_THAT(startsDuring(100), IsEmpty());
    }
    // A folder in its place: nothing is kept, and nothing stops.
    end();
    std::filesystem::remove(file);
    std::filesystem::create_directories(file);
    start({{"a", kHour}});
    EXPECT_THAT(startsDuring(kHour + 100), ElementsAre("a 60", "a 3660"));
}

TEST_F(Activities, ABlockDoesNotRunOnceItsRegistrationEnded) {
    start({{"a", kHour}, {"b", kHour}});
    registrations.pop_back();
    EXPECT_THAT(startsDuring(100), ElementsAre("a 60"));
    EXPECT_THAT(timers->describe("b"), HasSubstr("b: not registered"));
    const auto unknown = timers->schedulePreregistered("x", [](const auto&) { FAIL(); });
    clock.advance(kDay);
}

}  // namespace
}  // namespace keepsakes
