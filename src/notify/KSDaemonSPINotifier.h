// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "notify/KSNotifier.h"

namespace keepsakes {

/// The notifier of the client service and of the schedulers: what nobody listens to is dropped.
class KSDaemonSPINotifier final : public KSNotifier {
  public:
    using KSNotifier::KSNotifier;

    void sendNotification(std::int32_t identifier, KSValue payload);
};

}  // namespace keepsakes
