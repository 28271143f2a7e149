// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <string_view>

#include "core/ServiceLookup.h"

namespace keepsakes {

class KSDaemonClient;
class KSDaemonSPINotifier;
class StatusReporter;
struct PlatformServices;

/// Puts the daemon's one client object behind the listener; no caller is refused. Owned by the
/// registry as "Server". When it goes, the listener takes no more calls.
class KSManageServer final : public KSService {
  public:
    /// Needs "EventManager" and "EventBundleManager".
    static std::shared_ptr<KSManageServer> initWithUniverse(const ServiceLookup& universe);
    ~KSManageServer() override;

    /// The client's notifier, for the registry to publish.
    std::shared_ptr<KSDaemonSPINotifier> getNotifier() const;

    KSDaemonClient& client() { return *client_; }

  private:
    static constexpr std::string_view kUnit = "KSManageServer";

    KSManageServer(const PlatformServices& platform, std::unique_ptr<KSDaemonClient> client,
                   std::unique_ptr<StatusReporter> status);

    const PlatformServices& platform_;
    const std::unique_ptr<KSDaemonClient> client_;
    const std::unique_ptr<StatusReporter> status_;
};

}  // namespace keepsakes
