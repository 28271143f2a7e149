// SPDX-License-Identifier: Apache-2.0
#include "devicedata/IndexedHealthStore.h"

#include <SQLiteCpp/SQLiteCpp.h>

#include "platform/ActivityCatalogue.h"

namespace keepsakes {

IndexedHealthStore::IndexedHealthStore(std::filesystem::path index, OwnerFacts owner)
    : index_(std::move(index)), owner_(owner) {}

void IndexedHealthStore::queryWorkouts(KSDateInterval window,
                                       std::function<void(Workouts)> handler) {
    queue_.async([this, window, handler = std::move(handler)] { handler(workouts(window)); });
}

HealthStore::Workouts IndexedHealthStore::workouts(KSDateInterval window) const {
    std::vector<WorkoutSample> samples;
    const auto answered = index_.ask([&samples, window](SQLite::Database& index) {
        SQLite::Statement query(index,
                                "SELECT DISTINCT start, end, type FROM workouts"
                                " WHERE end BETWEEN ? AND ? ORDER BY end DESC, start DESC, type");
        query.bind(1, window.start.seconds);
        query.bind(2, window.end.seconds);
        while (query.executeStep()) {
            samples.push_back({.start = {query.getColumn(0).getDouble()},
                               .end = {query.getColumn(1).getDouble()},
                               .activityType = query.getColumn(2).getInt()});
        }
    });
    if (!answered) return std::unexpected(answered.error());
    return samples;
}

std::string IndexedHealthStore::displayName(int activityType) const {
    return std::string(activityName(activityType).value_or("Other"));
}

std::expected<std::optional<DateComponents>, KSError> IndexedHealthStore::dateOfBirth() const {
    return owner_.dateOfBirth;
}

std::expected<std::optional<int>, KSError> IndexedHealthStore::biologicalSex() const {
    return owner_.biologicalSex;
}

}  // namespace keepsakes
