// SPDX-License-Identifier: Apache-2.0
#include "sources/KSVitalsManager.h"

#include <array>
#include <utility>

#include "core/Calendar.h"
#include "core/Clock.h"
#include "core/KSAssertion.h"
#include "platform/PlatformServices.h"
#include "sources/Lifetimes.h"
#include "store/KSEventStore.h"

namespace keepsakes {

KSVitalsManager::KSVitalsManager(HealthStore& healthStore, Clock& clock,
                                 std::shared_ptr<KSEventStore> eventStore)
    : healthStore_(healthStore),
      clock_(clock),
      eventStore_(std::move(eventStore)),
      queue_("KSVitalsManager") {}

std::shared_ptr<KSVitalsManager> KSVitalsManager::initWithUniverse(const ServiceLookup& universe) {
    auto eventStore = universe.service<KSEventStore>("EventStore");
    if (!assertParameter(eventStore != nullptr, "eventStore", "KSVitalsManager", 35)) {
        return nullptr;
    }
    const auto& platform = universe.platform();
    return std::shared_ptr<KSVitalsManager>(
        new KSVitalsManager(*platform.healthStore, *platform.clock, std::move(eventStore)));
}

void KSVitalsManager::fetchWorkoutsBetweenStartDate(KSDate start, KSDate end,
                                                    WorkoutsHandler handler) {
    queue_.async([this, start, end, handler = std::move(handler)] {
        healthStore_.queryWorkouts({start, end}, handler);
    });
}

std::shared_ptr<KSEvent> KSVitalsManager::createEventFromWorkout(
    const WorkoutSample& workout) const {
    const KSDate now = clock_.now();
    auto event =
        KSEvent::initWithEventIdentifier(KSUUID::random(), workout.start, workout.end, now,
                                         KSEventProvider::health, KSEventCategory::workout);
    event->workoutType = healthStore_.displayName(workout.activityType);
    event->expirationDate = now + lifetime::kFourWeeks;
    return event;
}

void KSVitalsManager::saveWorkouts(const std::vector<WorkoutSample>& workouts,
                                   const ResultHandler& handler) {
    KSEventPointer newest;
    eventStore_->fetchLastEventOfCategory(
        KSEventCategory::workout,
        [&newest](const KSEventPointer& event, const OptionalError&) { newest = event; });
    KSEventArray fresh;
    for (const auto& workout : workouts) {
        if (newest && workout.start <= newest->startDate()) continue;
        fresh.push_back(createEventFromWorkout(workout));
    }
    eventStore_->storeEvents(fresh, handler);
}

void KSVitalsManager::fetchAndSaveWorkoutsBetweenStartDate(KSDate start, KSDate end,
                                                           ResultHandler handler) {
    fetchWorkoutsBetweenStartDate(
        start, end, [this, handler = std::move(handler)](const HealthStore::Workouts& workouts) {
            if (workouts) {
                saveWorkouts(*workouts, handler);
            } else {
                handler(workouts.error(), {});
            }
        });
}

void KSVitalsManager::fetchUserAgeWithHandler(AgeHandler handler) {
    if (!handler) return;
    queue_.async([this, handler = std::move(handler)] {
        const auto birth = healthStore_.dateOfBirth();
        if (!birth) {
            handler(std::nullopt, birth.error());
            return;
        }
        const auto& day = *birth;
        const auto born = day ? calendar::dateOfDay(day->year, day->month, day->day) : std::nullopt;
        handler(born ? std::optional(calendar::yearsBetween(*born, clock_.now())) : std::nullopt,
                std::nullopt);
    });
}

void KSVitalsManager::fetchUserBiologicalSexWithHandler(SexHandler handler) {
    if (!handler) return;
    queue_.async([this, handler = std::move(handler)] {
        const auto sex = healthStore_.biologicalSex();
        if (sex) {
            handler(*sex, std::nullopt);
        } else {
            handler(std::nullopt, sex.error());
        }
    });
}

std::optional<std::string_view> KSVitalsManager::convertBiologicalSexObjToString(
    std::optional<int> code) {
    constexpr std::array<std::string_view, 4> kWords = {"not set", "female", "male", "other"};
    if (!code || *code < 0 || *code >= static_cast<int>(kWords.size())) return std::nullopt;
    return kWords[static_cast<std::size_t>(*code)];
}

}  // namespace keepsakes
