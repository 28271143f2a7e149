// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "core/KSValue.h"
#include "core/ServiceLookup.h"

namespace keepsakes {

class UserDefaults;

/// The daemon's own domain of the user defaults store. Owned by the registry as
/// "DefaultsManager"; any thread may call it.
class KSDefaultsManager final : public KSService {
  public:
    explicit KSDefaultsManager(UserDefaults& userDefaults) : userDefaults_(userDefaults) {}

    /// Null when there is none. A missing key fails the assertion and yields null.
    KSValue objectForKey(const std::optional<std::string>& key) const;
    /// A null value removes the key. A missing key fails the assertion; nothing is stored.
    void setObjectForKey(const KSValue& object, const std::optional<std::string>& key);

    UserDefaults& userDefaults() const { return userDefaults_; }

  private:
    UserDefaults& userDefaults_;
};

}  // namespace keepsakes
