// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <array>
#include <atomic>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <string_view>
#include <vector>

#include "core/KSValue.h"
#include "core/ServiceLookup.h"
#include "core/WorkQueue.h"

namespace keepsakes {

class KSDispatcher;
class KSNotifier;
struct PlatformServices;

/// Reports how the daemon's work is triggered and how it fares: hears of every finished unit of
/// work (notifications 0 to 5 of the client's and the schedulers' notifiers, by which the reason is
/// known), keeps the time of the last one of each kind in the trigger-history file, and sends one
/// analytics event a unit with its outcome and how long ago the one before was, in hours. Owned by
/// the registry as "DaemonAnalytics"; all its work runs on its queue.
///
/// A history that cannot be read is deleted and begun anew; one that cannot be written is logged.
class KSDaemonAnalyticsManager final : public KSService {
  public:
    /// The last known states of the device, as the system notifications tell them.
    struct DeviceStates {
        bool stateOnCharger = false;
        bool stateUnlocked = false;
        bool optInDNU = false;  ///< Diagnostic submission allowed.
        bool optInIHA = false;  ///< Health-data submission allowed.
    };

    /// Needs "TocsinNotifier", the three schedulers' notifiers and "DaemonClientNotifier".
    static std::shared_ptr<KSDaemonAnalyticsManager> initWithUniverse(
        const ServiceLookup& universe);
    ~KSDaemonAnalyticsManager() override;
    KSDaemonAnalyticsManager(const KSDaemonAnalyticsManager&) = delete;
    KSDaemonAnalyticsManager& operator=(const KSDaemonAnalyticsManager&) = delete;

    DeviceStates deviceStates() const;

    /// What the payload says of itself, or else whether all nine sources and the database did well.
    static bool checkTriggerSuccess(const KSDictionary& payload);
    /// The bin of the seconds between the two times; a missing one fails the assertion that names
    /// it.
    static std::uint64_t calculateDeltaTime(std::optional<double> currentTime,
                                            std::optional<double> lastTime,
                                            const std::vector<double>& bins);

    /// "daemonTriggerPersistence.plist": seconds since 2001-01-01 UTC by the kind of trigger.
    std::filesystem::path getDaemonPlistFileURL() const;
    KSDictionary readPersistenceTable(const std::filesystem::path& file) const;
    void persistDaemonMetrics(const std::filesystem::path& file, const KSDictionary& data) const;

    void sendDataToAnalyticsService(const KSDictionary& payload) const;

  private:
    static constexpr std::string_view kUnit = "KSDaemonAnalyticsManager";

    using Notifiers = std::array<std::shared_ptr<KSNotifier>, 5>;

    explicit KSDaemonAnalyticsManager(const PlatformServices& platform);

    void registerHandlers(const Notifiers& notifiers);
    void listenTo(std::shared_ptr<KSNotifier> notifier,
                  std::initializer_list<std::int32_t> identifiers,
                  void (KSDaemonAnalyticsManager::*handler)(std::int32_t, const KSDictionary&));
    void recordLaunch() const;
    void onDeviceState(std::int32_t identifier, const KSDictionary& payload);
    void onWorkFinished(std::int32_t reasonIndex, const KSDictionary& payload);
    void addTriggerTimes(KSDictionary& payload, KSDictionary& history,
                         std::int32_t reasonIndex) const;

    const PlatformServices& platform_;
    const std::vector<double> shortBins_;  // hours, up to four days
    std::vector<std::shared_ptr<KSDispatcher>> dispatchers_;
    std::atomic<bool> stateOnCharger_ = false;
    std::atomic<bool> stateUnlocked_ = false;
    std::atomic<bool> optInDNU_ = false;
    std::atomic<bool> optInIHA_ = false;
    WorkQueue queue_;  // last: its end waits for tasks that use the members above
};

}  // namespace keepsakes
