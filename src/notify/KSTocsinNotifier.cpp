// SPDX-License-Identifier: Apache-2.0
#include "notify/KSTocsinNotifier.h"

#include <tuple>

#include "platform/DeviceState.h"
#include "platform/PowerSources.h"
#include "platform/SystemNotifications.h"

namespace keepsakes {

namespace {

constexpr double kMaxCapacityOfZero = 100;

std::string chargerTypeOf(const std::optional<std::string>& description) {
    if (!description) return "Unknown";
    if (description->starts_with("batt")) return "None";
    if (description->starts_with("usb")) return "USB";
    if (description->starts_with("external")) return "External";
    if (description->ends_with("merrow")) return "Merrow";
    return "Unknown";
}

}  // namespace

KSTocsinNotifier::KSTocsinNotifier(std::string_view name, const PlatformServices& platform)
    : KSNotifier(name), platform_(platform) {}

void KSTocsinNotifier::onEnable() { toggle(true); }
void KSTocsinNotifier::onDisable() { toggle(false); }

void KSTocsinNotifier::toggle(bool on) {
    registrations_.clear();
    if (!on) return;
    auto& named = *platform_.systemNotifications;
    registrations_.push_back(named.observe(SystemNotifications::kEffectiveSettingsChanged, queue(),
                                           [this] { checkDevicePolicy(); }));
    registrations_.push_back(named.observe(SystemNotifications::kDiagnosticReportStarted, queue(),
                                           [this] { notify(kDiagnosticReportStarted, {}); }));
    registrations_.push_back(platform_.lockState->observe(queue(), [this] { checkLockedState(); }));
    registrations_.push_back(platform_.powerSources->observeSources(
        queue(), [this](const auto& source) { onMatchedBattery(source); }));
    checkDevicePolicy();
    checkLockedState();
}

void KSTocsinNotifier::checkDevicePolicy() {
    const auto& policy = *platform_.devicePolicy;
    devicePolicyState_ = {policy.diagnosticSubmissionAllowed(),
                          policy.healthDataSubmissionAllowed()};
    notifyAndPersist(kDevicePolicy, KSDictionary{{"optInDNU", devicePolicyState_.optInDNU},
                                                 {"optInIHA", devicePolicyState_.optInIHA}});
}

KSTocsinNotifier::LockedState KSTocsinNotifier::readLockedState() const {
    const auto& lock = *platform_.lockState;
    if (!lock.formattedForContentProtection()) return {true, true};
    LockedState state{lock.unlockedSinceBoot(), lockedState_.isUnlocked};
    const int current = lock.currentState();
    if (current == 0) state.isUnlocked = true;
    if (current == 1 || current == 2 || current < 0) state.isUnlocked = false;
    return state;
}

void KSTocsinNotifier::checkLockedState() {
    const auto state = readLockedState();
    if (state.wasUnlockedSinceBoot != lockedState_.wasUnlockedSinceBoot) {
        lockedState_.wasUnlockedSinceBoot = state.wasUnlockedSinceBoot;
        notifyAndPersist(kWasUnlockedSinceBoot,
                         KSDictionary{{"wasUnlocked", state.wasUnlockedSinceBoot}});
    }
    if (state.isUnlocked != lockedState_.isUnlocked) {
        lockedState_.isUnlocked = state.isUnlocked;
        notifyAndPersist(kIsUnlocked, KSDictionary{{"isUnlocked", state.isUnlocked}});
    }
}

void KSTocsinNotifier::onMatchedBattery(const std::shared_ptr<PowerSource>& source) {
    registrations_.push_back(source->observe(queue(), [this, source](std::uint32_t messageType) {
        onBatteryStatusChanged(*source, messageType);
    }));
    handleBatteryNotification(*source);
}

void KSTocsinNotifier::onBatteryStatusChanged(const PowerSource& source,
                                              std::uint32_t messageType) {
    if (messageType == PowerSource::kBatteryStatusHasChanged) handleBatteryNotification(source);
}

KSTocsinNotifier::BatteryState KSTocsinNotifier::batteryStateOf(
    const PowerSourceProperties& properties) {
    BatteryState state;
    const auto& current = properties.currentCapacity;
    const auto& max = properties.maxCapacity;
    if (current && max) {
        state.level = static_cast<float>(*current * 100 / (*max == 0 ? kMaxCapacityOfZero : *max));
    }
    state.connected = properties.externalConnected.value_or(false);
    state.charged = properties.fullyCharged.value_or(false);
    const auto& adapter = properties.adapterDetails;
    const auto description = adapter ? adapter->description : std::nullopt;
    state.chargerType = chargerTypeOf(description);
    state.adapterDescription = description.value_or("None");
    return state;
}

void KSTocsinNotifier::handleBatteryNotification(const PowerSource& source) {
    auto state = batteryStateOf(source.properties());
    const auto compared = [](const BatteryState& of) {
        return std::tie(of.level, of.connected, of.charged, of.chargerType, of.adapterDescription);
    };
    if (compared(state) == compared(batteryState_)) return;
    state.wasConnected = batteryState_.connected;
    batteryState_ = std::move(state);
    notifyAndPersist(kBattery,
                     KSDictionary{{"batteryLevel", static_cast<double>(batteryState_.level)},
                                  {"batteryWasConnected", batteryState_.wasConnected},
                                  {"stateOnCharger", batteryState_.connected},
                                  {"batteryCharged", batteryState_.charged},
                                  {"chargerType", batteryState_.chargerType},
                                  {"adapterDescription", batteryState_.adapterDescription}});
}

}  // namespace keepsakes
