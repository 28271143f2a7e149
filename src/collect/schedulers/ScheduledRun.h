// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "core/KSError.h"
#include "notify/KSWatchDog.h"

namespace keepsakes {

class ActivityRun;
struct PlatformServices;

/// A scheduled run under way: the activity's, and the watchdog that guards it. Shared by the
/// handlers of the work that the run consists of, and gone with the last of them.
struct ScheduledRun {
    ScheduledRun(std::string_view watchDogName, const PlatformServices& platformServices,
                 std::shared_ptr<ActivityRun> activityRun);
    ~ScheduledRun();
    ScheduledRun(const ScheduledRun&) = delete;
    ScheduledRun& operator=(const ScheduledRun&) = delete;

    const PlatformServices& platform;
    const std::shared_ptr<ActivityRun> activity;
    KSWatchDog watchDog;
};

/// What a scheduler's notification tells: the result, its trigger "bootd", and the overall success
/// as false when there was an error.
KSDictionary triggerPayload(KSDictionary result, const OptionalError& error);

/// What a scheduler says of its schedule in a diagnostic report.
std::vector<std::string> scheduleLines(const PlatformServices& platform, std::string_view activity,
                                       bool enabled);

}  // namespace keepsakes
