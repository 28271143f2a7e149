// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "platform/BackgroundActivities.h"

namespace keepsakes {

class Clock;
class PowerSources;

/// When an activity runs.
struct ActivityCriteria {
    std::string identifier;
    double periodSeconds = 0;  ///< From one start to the next; 0 or less turns the activity off.
    bool requireExternalPower = false;
};

/// Starts each activity once a period, by one timer that is armed for the next one due and nothing
/// between. Any thread may call it; blocks run on its queue. Owned by the composition root;
/// outlives the services, and the clock and the power sources outlive it.
///
/// A period is elapsed time, the time asleep included: "24h" is 24 hours on days of 23 and of 25 as
/// well, and setting the clock moves nothing while the daemon runs. What came due during sleep
/// starts on waking, once, however many periods went by. A period that ends while the activity
/// still runs is passed over.
///
/// Across restarts, the starts of finished runs are kept as dates in a property list, so that here
/// a set clock matters; a date in the future counts as none, and no activity waits for longer than
/// its period. What is overdue begins a minute after the start; and no two activities start within
/// half a minute of each other, after waking or when the charger comes as well. Where a period is
/// so short that these waits would stretch it, they shrink.
///
/// What requires external power and lacks it when its time comes begins when the charger is there.
/// A run that is given up is not kept: it is due again a period later, or soon after a restart.
class ActivityTimers final : public BackgroundActivities {
  public:
    static constexpr double kSettleSeconds = 60;
    static constexpr double kSecondsBetweenStarts = 30;

    ActivityTimers(Clock& clock, PowerSources& power, std::vector<ActivityCriteria> criteria,
                   std::filesystem::path stateFile);
    ~ActivityTimers() override;
    ActivityTimers(const ActivityTimers&) = delete;
    ActivityTimers& operator=(const ActivityTimers&) = delete;

    ActivityRegistration schedulePreregistered(std::string_view identifier,
                                               ActivityBlock block) override;
    std::string describe(std::string_view identifier) const override;
    void stop() override;

  private:
    static constexpr std::string_view kUnit = "ActivityTimers";

    class State;
    const std::shared_ptr<State> state_;
};

}  // namespace keepsakes
