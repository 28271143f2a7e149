// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "analytics/KSMetric.h"
#include "model/KSEvent.h"

namespace keepsakes {

/// What was collected of a window, in numbers: how many events each provider and each category has,
/// how long it took from the source's own record to the event, and how long the events last.
///
/// | key | value |
/// |---|---|
/// | "numberOfEvents", "numberOfEvents<Category>", "eventsFrom<Provider>" | counts |
/// | "latency<Category>" | bin of the median, by the hour up to four days |
/// | "duration<Category>" | bin of the median, by the quarter of an hour up to twelve hours |
/// | "windowStart", "windowEnd" | whole hours before the submission |
///
/// A bin is the number of edges (0, one step, two steps, …) that the value reaches; -1 where a
/// category has no events.
class KSEventData final : public KSMetric {
  public:
    using KSMetric::KSMetric;

    const char* event() const override { return "EventData"; }
    Keys supportedMetricKeys() const override;

    /// Fills in all keys.
    OptionalError setEvents(const KSEventArray& events, KSDateInterval window,
                            KSDate submissionDate);
};

}  // namespace keepsakes
