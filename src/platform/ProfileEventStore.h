// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "core/KSDate.h"
#include "core/KSError.h"

namespace keepsakes {

/// What a suggested event is of. The numbers are those that events carry, are kept in the index and
/// never change.
enum class SuggestionCategory : int {
    none = 0,
    flight = 1,
    food = 2,
    train = 3,
    bus = 4,
    boat = 5,
    carRentalPickup = 6,
    carRentalDropoff = 7,
    ticket = 8,
    movie = 9,
    lodging = 10,
    social = 11,
    naturalLanguage = 12,  ///< An occasion among people that plain words alone tell of.
};

/// A reservation or occasion that the owner's calendar holds.
struct SuggestedEvent {
    std::optional<std::string> eventIdentifier;  ///< The same as long as the entry is there.
    KSDate startDate;
    KSDate endDate;
    SuggestionCategory category = SuggestionCategory::none;
    std::optional<std::string> title;

    friend bool operator==(const SuggestedEvent&, const SuggestedEvent&) = default;
};

/// A leg of a journey, or a stay.
struct TripPart {
    std::vector<std::string> eventIdentifiers;  ///< Of suggested events, in order.
    std::optional<std::string> placemark;       ///< Where it leads or is, such as "Lisbon".

    friend bool operator==(const TripPart&, const TripPart&) = default;
};

/// A journey put together from suggested events, from leaving to coming back.
struct Trip {
    KSDate startDate;
    KSDate endDate;
    std::optional<std::string> title;
    std::vector<TripPart> tripParts;  ///< In the order in which they begin.

    friend bool operator==(const Trip&, const Trip&) = default;
};

/// Asks for what overlaps the dates, both included.
struct TripEventQuery {
    KSDate fromDate;
    KSDate toDate;
};
struct SuggestedEventQuery {
    KSDate fromDate;
    KSDate toDate;
};

/// The event store of the personal profile service. Any thread may call it; it blocks the caller
/// and changes nothing.
class ProfileEventStore {
  public:
    /// Takes one item; false stops the iteration.
    template <class Item>
    using Each = std::function<bool(const Item&)>;

    virtual ~ProfileEventStore() = default;

    /// Calls `each` for the matching items, ascending by start. After an error the items that came
    /// before it are not all there are.
    virtual OptionalError iterateScoredEvents(const TripEventQuery& query,
                                              const Each<Trip>& each) = 0;
    virtual OptionalError iterateScoredEvents(const SuggestedEventQuery& query,
                                              const Each<SuggestedEvent>& each) = 0;
};

}  // namespace keepsakes
