// SPDX-License-Identifier: Apache-2.0
#include "core/KSError.h"

#include <fmt/format.h>

#include "core/KSAssertion.h"

namespace keepsakes {

KSError KSError::make(KSErrorCode code, std::string_view description) {
    return make(KSErrorDomain, static_cast<int>(code), description);
}

KSError KSError::make(std::string_view domain, int code, std::string_view description) {
    KSError error{std::string(domain), code, {}};
    error.userInfo.emplace(kLocalizedDescriptionKey, description);
    return error;
}

std::string KSError::description() const {
    if (const auto* text = valueForKey(userInfo, kLocalizedDescriptionKey).asString()) return *text;
    return fmt::format("{} {}", domain, code);
}

KSError KSErrorInvalidParameterCreate(std::string_view condition) {
    return KSError::make(KSErrorCode::invalidParameter, invalidParameterText(condition));
}

}  // namespace keepsakes
