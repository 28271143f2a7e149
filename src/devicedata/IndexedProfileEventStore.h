// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "devicedata/IndexFile.h"
#include "platform/ProfileEventStore.h"

namespace keepsakes {

/// Trips and suggested events answered from the index of the owner's calendars, as the last scan
/// left it. An entry that several files hold is one. Before the first scan there are none.
class IndexedProfileEventStore final : public ProfileEventStore {
  public:
    explicit IndexedProfileEventStore(std::filesystem::path index) : index_(std::move(index)) {}

    OptionalError iterateScoredEvents(const TripEventQuery& query, const Each<Trip>& each) override;
    OptionalError iterateScoredEvents(const SuggestedEventQuery& query,
                                      const Each<SuggestedEvent>& each) override;

  private:
    const IndexFile index_;
};

}  // namespace keepsakes
