// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "core/Observers.h"
#include "notify/KSNotifier.h"
#include "platform/PlatformServices.h"

namespace keepsakes {

class PowerSource;
struct PowerSourceProperties;

/// Turns what happens to the device into notifications. Those of a state are remembered for late
/// listeners and sent when the state changes; the device policy is sent whenever it may have.
/// It follows the device while somebody listens. Owned by the registry as "TocsinNotifier"; all
/// its work runs on its queue.
class KSTocsinNotifier final : public KSNotifier {
  public:
    static constexpr std::int32_t kDiagnosticReportStarted = 0;  ///< No payload, not remembered.
    static constexpr std::int32_t kDevicePolicy = 1;             ///< {"optInDNU", "optInIHA"}
    static constexpr std::int32_t kIsUnlocked = 2;               ///< {"isUnlocked"}
    static constexpr std::int32_t kWasUnlockedSinceBoot = 3;     ///< {"wasUnlocked"}
    /// {"batteryLevel" in percent, -1 when not known, "batteryWasConnected" before this change,
    /// "stateOnCharger", "batteryCharged", "chargerType", "adapterDescription"}
    static constexpr std::int32_t kBattery = 4;

    /// What `platform` names outlives the notifier.
    KSTocsinNotifier(std::string_view name, const PlatformServices& platform);

  protected:
    void onEnable() override;
    void onDisable() override;

  private:
    struct DevicePolicyState {
        bool optInDNU = false;
        bool optInIHA = false;
    };
    struct LockedState {
        bool wasUnlockedSinceBoot = false;
        bool isUnlocked = false;
    };
    struct BatteryState {
        float level = -1;
        bool wasConnected = false;
        bool connected = false;
        bool charged = false;
        std::string chargerType;
        std::string adapterDescription;
    };

    void toggle(bool on);
    void checkDevicePolicy();
    void checkLockedState();
    LockedState readLockedState() const;
    void onMatchedBattery(const std::shared_ptr<PowerSource>& source);
    void onBatteryStatusChanged(const PowerSource& source, std::uint32_t messageType);
    void handleBatteryNotification(const PowerSource& source);
    static BatteryState batteryStateOf(const PowerSourceProperties& properties);

    const PlatformServices& platform_;

    // Only on the queue.
    DevicePolicyState devicePolicyState_;
    LockedState lockedState_;
    BatteryState batteryState_;
    std::vector<Observation> registrations_;
};

}  // namespace keepsakes
