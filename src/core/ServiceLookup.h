// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace keepsakes {

struct PlatformServices;

/// The base of everything that the registry holds.
class KSService {
  public:
    virtual ~KSService() = default;

    /// What a diagnostic report says of it, a line each: its state and counts, nothing of the
    /// owner's life. Any thread may ask; it waits for no queue.
    virtual std::vector<std::string> diagnosticLines() const { return {}; }
};

/// How one service finds another, by name, in its own initialiser and only what was made before
/// it. The registry implements it; services never see the registry itself.
class ServiceLookup {
  public:
    virtual ~ServiceLookup() = default;

    /// The service of that name; a name without a service fails the assertion
    /// "No service named [<name>]" and answers a null pointer.
    virtual std::shared_ptr<KSService> getService(std::string_view name) const = 0;

    /// The device's services. Outlives every service.
    virtual const PlatformServices& platform() const = 0;

    /// The service of that name as a `T`, or a null pointer.
    template <class T>
    std::shared_ptr<T> service(std::string_view name) const {
        return std::dynamic_pointer_cast<T>(getService(name));
    }
};

}  // namespace keepsakes
