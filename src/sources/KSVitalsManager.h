// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <functional>
#include <memory>
#include <optional>
#include <string_view>
#include <vector>

#include "core/KSError.h"
#include "core/ServiceLookup.h"
#include "core/WorkQueue.h"
#include "model/KSEvent.h"
#include "platform/HealthStore.h"

namespace keepsakes {

class Clock;
class KSEventStore;

/// Turns the health store's workouts into events, and answers for the owner's age and sex. Owned
/// by the registry as "VitalsManager"; questions start on its queue, answers come on the health
/// store's thread.
class KSVitalsManager final : public KSService {
  public:
    using WorkoutsHandler = std::function<void(HealthStore::Workouts)>;
    using AgeHandler = std::function<void(std::optional<int> years, OptionalError)>;
    using SexHandler = std::function<void(std::optional<int> code, OptionalError)>;

    /// Needs "EventStore".
    static std::shared_ptr<KSVitalsManager> initWithUniverse(const ServiceLookup& universe);

    void fetchWorkoutsBetweenStartDate(KSDate start, KSDate end, WorkoutsHandler handler);
    /// Stores an event for each workout that started after the newest stored one.
    void saveWorkouts(const std::vector<WorkoutSample>& workouts, const ResultHandler& handler);
    void fetchAndSaveWorkoutsBetweenStartDate(KSDate start, KSDate end, ResultHandler handler);
    std::shared_ptr<KSEvent> createEventFromWorkout(const WorkoutSample& workout) const;

    /// Whole years; neither years nor error for an owner who states no date of birth.
    void fetchUserAgeWithHandler(AgeHandler handler);
    void fetchUserBiologicalSexWithHandler(SexHandler handler);
    /// The word for a code of the health store; nothing for another code.
    static std::optional<std::string_view> convertBiologicalSexObjToString(std::optional<int> code);

  private:
    KSVitalsManager(HealthStore& healthStore, Clock& clock,
                    std::shared_ptr<KSEventStore> eventStore);

    HealthStore& healthStore_;
    Clock& clock_;
    const std::shared_ptr<KSEventStore> eventStore_;
    WorkQueue queue_;
};

}  // namespace keepsakes
