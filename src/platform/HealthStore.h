// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "core/KSDate.h"
#include "core/KSError.h"

namespace keepsakes {

struct WorkoutSample {
    KSDate start;
    KSDate end;
    int activityType = 0;  ///< A code of the activity catalogue.

    friend bool operator==(const WorkoutSample&, const WorkoutSample&) = default;
};

struct DateComponents {
    int year = 0;
    int month = 0;
    int day = 0;

    friend bool operator==(const DateComponents&, const DateComponents&) = default;
};

/// The health store: recorded workouts, and what the owner says of himself or herself.
/// Any thread may call it. A failed call changes nothing and may be tried again.
class HealthStore {
  public:
    using Workouts = std::expected<std::vector<WorkoutSample>, KSError>;

    virtual ~HealthStore() = default;

    /// Workouts whose end lies inside `window`, newest end first, all of them. The handler is
    /// called once, on a thread of the store's own.
    virtual void queryWorkouts(KSDateInterval window, std::function<void(Workouts)> handler) = 0;

    /// The catalogue's name of an activity type; the name of "Other" for a code it does not hold.
    virtual std::string displayName(int activityType) const = 0;

    virtual std::expected<std::optional<DateComponents>, KSError> dateOfBirth() const = 0;

    /// 0 not set, 1 female, 2 male, 3 other; nothing when the owner says nothing at all.
    virtual std::expected<std::optional<int>, KSError> biologicalSex() const = 0;
};

}  // namespace keepsakes
