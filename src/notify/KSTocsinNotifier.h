// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "notify/KSNotifier.h"

namespace keepsakes {

class LockState;

/// Turns the device's state into notifications, remembered for late listeners: 2 {"isUnlocked"}
/// and 3 {"wasUnlocked"} (since boot), each when it changes. It looks at the device while somebody
/// listens. Owned by the registry as "TocsinNotifier"; all its work runs on its queue.
class KSTocsinNotifier final : public KSNotifier {
  public:
    static constexpr std::int32_t kIsUnlocked = 2;
    static constexpr std::int32_t kWasUnlockedSinceBoot = 3;

    KSTocsinNotifier(std::string_view name, const LockState& lockState);

  protected:
    void onEnable() override;

  private:
    struct LockedState {
        bool wasUnlockedSinceBoot = false;
        bool isUnlocked = false;
    };

    void checkLockedState();
    LockedState readLockedState() const;

    const LockState& lockState_;
    LockedState lockedState_;  // only on the queue
};

}  // namespace keepsakes
