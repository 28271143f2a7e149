// SPDX-License-Identifier: Apache-2.0
#include "notify/KSDaemonSPINotifier.h"

#include <utility>

namespace keepsakes {

void KSDaemonSPINotifier::sendNotification(std::int32_t identifier, KSValue payload) {
    if (isEnabled()) notify(identifier, std::move(payload));
}

}  // namespace keepsakes
