// SPDX-License-Identifier: Apache-2.0
#include "notify/KSTocsinNotifier.h"

#include "platform/DeviceState.h"

namespace keepsakes {

KSTocsinNotifier::KSTocsinNotifier(std::string_view name, const LockState& lockState)
    : KSNotifier(name), lockState_(lockState) {}

void KSTocsinNotifier::onEnable() { checkLockedState(); }

KSTocsinNotifier::LockedState KSTocsinNotifier::readLockedState() const {
    if (!lockState_.formattedForContentProtection()) return {true, true};
    LockedState state{lockState_.unlockedSinceBoot(), lockedState_.isUnlocked};
    const int current = lockState_.currentState();
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

}  // namespace keepsakes
