// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string_view>

#include "model/KSEvent.h"
#include "model/KSEventBundle.h"

namespace keepsakes {

/// Turns the events of one window into bundles, in two stages: clusters of events whose times
/// overlap, then a bundle for each rule that a cluster satisfies. Made for one bundling pass and
/// used by one thread at a time.
class KSEventBundler final {
  public:
    using Clusters = std::map<int, KSEventArray>;                   ///< By component label.
    using Bundles = std::map<int, std::shared_ptr<KSEventBundle>>;  ///< By running number, from 1.

    /// A missing date fails the assertion that names it and yields nothing. Bundles are made as
    /// of `now`.
    static std::unique_ptr<KSEventBundler> initWithStartDate(std::optional<KSDate> startDate,
                                                             std::optional<KSDate> endDate,
                                                             KSDate now);

    /// Groups events that overlap for more than 0 seconds, directly or through others; topics,
    /// social events, links, contacts, trends and visits at home or work stay alone. Removes
    /// events of unknown category from the array. n log n in the number of events.
    Clusters calculateEventBundlesFromEvents(KSEventArray& events) const;

    /// Adds a filtered bundle for each cluster and rule that it satisfies: the events that matched.
    const Bundles& pruneEventBundles(const Clusters& clusters);
    const Bundles& returnCurrentEventBundles() const { return eventBundleDict_; }

    /// Keeps events of a known category.
    static std::function<bool(const KSEvent&)> predicateForBasicFilteringOfEvents();

  private:
    static constexpr std::string_view kUnit = "KSEventBundler";

    KSEventBundler(KSDate startDate, KSDate endDate, KSDate now);

    const KSDate startDate_;
    const KSDate endDate_;
    const KSDate now_;
    int counter_ = 0;
    Bundles eventBundleDict_;
};

}  // namespace keepsakes
