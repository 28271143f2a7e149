// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "core/Clock.h"
#include "core/ServiceLookup.h"
#include "core/WorkQueue.h"

namespace keepsakes {

struct PlatformServices;

/// The service registry: makes every long-lived service in a fixed order and owns it under its
/// name until the end. Made by `main`; filled in its constructor and only read afterwards, from
/// any queue. Its destruction ends the services in the reverse order.
class KSDaemonUniverse final : public ServiceLookup {
  public:
    /// The switches are the platform's.
    explicit KSDaemonUniverse(const PlatformServices& platform);
    ~KSDaemonUniverse() override;
    KSDaemonUniverse(const KSDaemonUniverse&) = delete;
    KSDaemonUniverse& operator=(const KSDaemonUniverse&) = delete;

    std::shared_ptr<KSService> getService(std::string_view name) const override;
    const PlatformServices& platform() const override { return platform_; }

    /// The names in the order of creation.
    const std::vector<std::string>& serviceNames() const { return order_; }

    /// Without any feature enabled, ends the process in order ten seconds from now, by
    /// `exitInOrder`. Returns at once; the caller parks the main thread.
    void run(bool anyEnabled, std::function<void()> exitInOrder);

  private:
    void add(std::string_view name, std::shared_ptr<KSService> service);

    const PlatformServices& platform_;
    std::map<std::string, std::shared_ptr<KSService>, std::less<>> universe_;
    std::vector<std::string> order_;
    WorkQueue exitQueue_;
    Timer exitTimer_;
};

}  // namespace keepsakes
