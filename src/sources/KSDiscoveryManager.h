// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <map>
#include <memory>
#include <span>
#include <string>

#include "core/KSValue.h"
#include "core/WorkQueue.h"
#include "platform/ContactStore.h"

namespace keepsakes {

class AnalyticsService;
class NearbyDevices;
struct PlatformServices;

/// Counts the devices that are near, in total and by the relationship of the people whose names
/// they carry, for the owner's statistics: numbers leave it, never a name. No service of the
/// registry: the event manager owns it and has it count with each collection. Any thread may call
/// it; the work is done on its queue.
class KSDiscoveryManager final {
  public:
    /// Nothing where the owner does not want devices counted.
    static std::shared_ptr<KSDiscoveryManager> initWithPlatform(const PlatformServices& platform);

    /// Counts and submits "com.brindle.Keepsakes.ProximityDectection", later. When nothing can be
    /// learnt of the devices, nothing is submitted; the first failure of a row is logged.
    void submitProximity();

    /// "total", and for each relationship how many of the devices' names hold the given name of
    /// somebody related so: a word of the device's name that is the name's first, or that with an
    /// "s" ("Anna's phone", "Annas Handy"). Given names of less than three letters hold nowhere.
    static KSDictionary proximityOf(std::span<const std::string> deviceNames,
                                    std::span<const RelatedPerson> related);

  private:
    explicit KSDiscoveryManager(const PlatformServices& platform);

    void count();

    NearbyDevices& nearbyDevices_;
    ContactStore& contactStore_;
    AnalyticsService& analytics_;
    bool wasFailing_ = false;  // only on the queue
    WorkQueue queue_;
};

}  // namespace keepsakes
