// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "core/WorkQueue.h"
#include "devicedata/IndexFile.h"
#include "platform/HealthStore.h"

namespace keepsakes {

/// What the owner says of himself or herself in the configuration.
struct OwnerFacts {
    std::optional<DateComponents> dateOfBirth;
    std::optional<int> biologicalSex;  ///< As `HealthStore::biologicalSex`.
};

/// The health store answered from the index of the owner's files. A recording that several files
/// hold (same start, end and activity) is one workout. Before the first scan there are none. The
/// handler runs on the store's own queue; its owner's destruction waits for questions under way.
class IndexedHealthStore final : public HealthStore {
  public:
    IndexedHealthStore(std::filesystem::path index, OwnerFacts owner);

    void queryWorkouts(KSDateInterval window, std::function<void(Workouts)> handler) override;
    std::string displayName(int activityType) const override;
    std::expected<std::optional<DateComponents>, KSError> dateOfBirth() const override;
    std::expected<std::optional<int>, KSError> biologicalSex() const override;

  private:
    Workouts workouts(KSDateInterval window) const;

    const IndexFile index_;
    const OwnerFacts owner_;
    WorkQueue queue_{"IndexedHealthStore"};
};

}  // namespace keepsakes
