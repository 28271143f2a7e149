// SPDX-License-Identifier: Apache-2.0
#include "sources/KSDiscoveryManager.h"

#include <algorithm>
#include <cstdint>
#include <set>
#include <utility>
#include <vector>

#include "core/Log.h"
#include "folding/TextFolding.h"
#include "platform/AnalyticsService.h"
#include "platform/NearbyDevices.h"
#include "platform/PlatformServices.h"

namespace keepsakes {

namespace {

constexpr std::string_view kEvent = "com.brindle.Keepsakes.ProximityDectection";
constexpr const char* kTotal = "total";
constexpr std::size_t kShortestName = 3;
constexpr std::size_t kMostWords = 32;

}  // namespace

KSDiscoveryManager::KSDiscoveryManager(const PlatformServices& platform)
    : nearbyDevices_(*platform.nearbyDevices),
      contactStore_(*platform.contactStore),
      analytics_(*platform.analytics),
      queue_("KSDiscoveryManager") {}

std::shared_ptr<KSDiscoveryManager> KSDiscoveryManager::initWithPlatform(
    const PlatformServices& platform) {
    if (!platform.nearbyDevices) return nullptr;
    return std::shared_ptr<KSDiscoveryManager>(new KSDiscoveryManager(platform));
}

void KSDiscoveryManager::submitProximity() {
    queue_.async([this] { count(); });
}

void KSDiscoveryManager::count() {
    const auto devices = nearbyDevices_.devicesNear();
    if (!devices) {
        if (!std::exchange(wasFailing_, true)) logWarning(devices.error().description());
        return;
    }
    wasFailing_ = false;
    const auto related = contactStore_.relatedPeople();
    if (!related) logWarning(related.error().description());
    analytics_.send(kEvent, proximityOf(*devices, related.value_or(std::vector<RelatedPerson>())));
}

KSDictionary KSDiscoveryManager::proximityOf(std::span<const std::string> deviceNames,
                                             std::span<const RelatedPerson> related) {
    std::map<std::string, std::set<std::string>> wordsOf;  // by relationship
    for (const auto& person : related) {
        auto& words = wordsOf[person.relationship];
        const auto given = foldedTokens(person.name, 1);
        if (given.empty() || given.front().size() < kShortestName) continue;
        words.insert(given.front());
        words.insert(given.front() + "s");
    }
    KSDictionary counts{{kTotal, static_cast<std::int64_t>(deviceNames.size())}};
    std::vector<std::vector<std::string>> wordsOfDevices;
    for (const auto& name : deviceNames) wordsOfDevices.push_back(foldedTokens(name, kMostWords));
    for (const auto& [relationship, words] : wordsOf) {
        const auto count = std::ranges::count_if(wordsOfDevices, [&words](const auto& ofDevice) {
            return std::ranges::any_of(ofDevice,
                                       [&words](const auto& word) { return words.contains(word); });
        });
        counts.insert_or_assign(relationship, static_cast<std::int64_t>(count));
    }
    return counts;
}

}  // namespace keepsakes
