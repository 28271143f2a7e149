// SPDX-License-Identifier: Apache-2.0
#include "store/KSDefaultsManager.h"

#include <fmt/format.h>

#include "core/KSAssertion.h"
#include "core/Log.h"
#include "platform/UserDefaults.h"

namespace keepsakes {

namespace {

constexpr std::string_view kDomain = "com.brindle.keepsakesd";

bool assertKey(const std::optional<std::string>& key, std::string_view method, int line) {
    return assertParameter(key.has_value(), fmt::format("key (in {}:{})", method, line),
                           "KSDefaultsManager", line);
}

}  // namespace

KSValue KSDefaultsManager::objectForKey(const std::optional<std::string>& key) const {
    if (!assertKey(key, "-[KSDefaultsManager objectForKey:]", 25)) return {};
    return userDefaults_.object(kDomain, *key);
}

void KSDefaultsManager::setObjectForKey(const KSValue& object,
                                        const std::optional<std::string>& key) {
    if (!assertKey(key, "-[KSDefaultsManager setObject:forKey:]", 37)) return;
    if (const auto error = userDefaults_.setObject(kDomain, *key, object)) {
        logError(error->description());
    }
}

}  // namespace keepsakes
