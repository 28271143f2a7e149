// SPDX-License-Identifier: Apache-2.0
#include "schedulers/ScheduledRun.h"

#include <utility>

#include "core/ResultKeys.h"
#include "platform/BackgroundActivities.h"
#include "platform/PlatformServices.h"

namespace keepsakes {

namespace {

constexpr const char* kTriggeredByTheSystem = "bootd";

}  // namespace

ScheduledRun::ScheduledRun(std::string_view watchDogName, const PlatformServices& platformServices,
                           std::shared_ptr<ActivityRun> activityRun)
    : platform(platformServices),
      activity(std::move(activityRun)),
      watchDog(watchDogName, platformServices) {}

ScheduledRun::~ScheduledRun() { platform.requestEnded(); }

KSDictionary triggerPayload(KSDictionary result, const OptionalError& error) {
    if (error) result.insert_or_assign(std::string(kResultOverallSuccess), false);
    result.insert_or_assign(std::string(kTriggerSource), kTriggeredByTheSystem);
    return result;
}

std::vector<std::string> scheduleLines(const PlatformServices& platform, std::string_view activity,
                                       bool enabled) {
    auto line = platform.activities->describe(activity);
    if (!enabled) line += "; switched off with diagnostics";
    return {std::move(line)};
}

}  // namespace keepsakes
