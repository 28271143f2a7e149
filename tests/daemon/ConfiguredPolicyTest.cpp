// SPDX-License-Identifier: Apache-2.0
#include "daemon/ConfiguredPolicy.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "core/Problems.h"
#include "platform/SystemNotifications.h"
#include "support/TemporaryFolder.h"
#include "support/VirtualClock.h"

namespace keepsakes {
namespace {

TEST(ConfiguredPolicy, FollowsTheFileAndOutlivesItsMistakes) {
    const TemporaryFolder folder;
    VirtualClock clock;
    SystemNotifications notifications;
    Problems problems;
    const auto file = folder / "config.toml";
    ConfiguredPolicy policy(
        {}, [&file] { return loadConfigurationIfAny(file); }, clock, notifications, problems);
    int announced = 0;
    WorkQueue queue("test");
    const auto observation = notifications.observe(SystemNotifications::kEffectiveSettingsChanged,
                                                   queue, [&announced] { ++announced; });
    const struct {
        std::string content;
        bool diagnostics;
        bool healthData;
        int announced;
    } rows[] = {
        {"[policy]\nhealth_data = false\n", true, false, 1},
        {"[policy]\nhealth_data = false\n[activities]\npurge = \"0\"\n", true, false, 1},
        {"[policy]\ndiagnostics = \"no\"\n", true, false, 1},
        {"[policy", true, false, 1},
        {"[policy]\ndiagnostics = false\n", false, true, 2},
        {"", true, true, 3},
    };
    for (const auto& row : rows) {
        folder.write("config.toml", row.content);
        policy.fileChanged();
        clock.advance(60);
        EXPECT_EQ(policy.diagnosticSubmissionAllowed(), row.diagnostics) << row.content;
        EXPECT_EQ(policy.healthDataSubmissionAllowed(), row.healthData) << row.content;
        EXPECT_EQ(announced, row.announced) << row.content;
    }
    EXPECT_THAT(problems.list(),
                testing::ElementsAre(testing::HasSubstr("config.toml:1: "),
                                     testing::HasSubstr("config.toml:2: policy.diagnostics: ")));
}

TEST(ConfiguredPolicy, ReadsTheFileWhenItIsAtRest) {
    VirtualClock clock;
    SystemNotifications notifications;
    Problems problems;
    int loads = 0;
    ConfiguredPolicy policy(
        {},
        [&loads]() -> std::expected<Configuration, KSError> {
            ++loads;
            return Configuration{};
        },
        clock, notifications, problems);
    for (int step = 0; step < 3; ++step) {
        policy.fileChanged();
        clock.advance(ConfiguredPolicy::kQuietSeconds / 2);
    }
    EXPECT_EQ(loads, 0);
    clock.advance(ConfiguredPolicy::kQuietSeconds);
    EXPECT_EQ(loads, 1);
}

}  // namespace
}  // namespace keepsakes
