// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <utility>

namespace keepsakes {

/// One run of an activity, shared by those who work on it. `finish` reports it as finished; when
/// the last holder lets go without that, the run counts as given up. Any thread may call it.
class ActivityRun {
  public:
    virtual ~ActivityRun() = default;
    virtual void finish() = 0;
};

using ActivityBlock = std::function<void(const std::shared_ptr<ActivityRun>&)>;

/// Keeps an activity registered while it lives. Once it is gone the block is not running and does
/// not begin again, unless it goes inside the block itself.
class ActivityRegistration {
  public:
    ActivityRegistration() = default;
    explicit ActivityRegistration(std::function<void()> end) : end_(std::move(end)) {}
    ActivityRegistration(ActivityRegistration&& other) noexcept
        : end_(std::exchange(other.end_, nullptr)) {}
    ActivityRegistration& operator=(ActivityRegistration&&) = delete;
    ~ActivityRegistration() {
        if (end_) end_();
    }

  private:
    std::function<void()> end_;
};

/// Starts work in the background when the time has come and the device's state allows it. When that
/// is, is declared outside the daemon's services, which only name the activity.
class BackgroundActivities {
  public:
    virtual ~BackgroundActivities() = default;

    /// Runs `block` on a thread of the port's own each time the activity's criteria hold, never
    /// while an earlier run of it is unfinished. The block starts the work and returns. An
    /// identifier that nothing is declared for is logged and never runs.
    [[nodiscard]] virtual ActivityRegistration schedulePreregistered(std::string_view identifier,
                                                                     ActivityBlock block) = 0;

    /// One line on an activity: when it is due, whether it runs or waits for power, when it ran
    /// last. Waits for nothing.
    virtual std::string describe(std::string_view identifier) const = 0;

    /// Begins no activity from now on. For shutdown.
    virtual void stop() = 0;
};

}  // namespace keepsakes
