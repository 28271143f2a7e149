// SPDX-License-Identifier: Apache-2.0
#include "core/KSAssertion.h"

#include <fmt/format.h>

#include <utility>

#include "core/Log.h"

namespace keepsakes {

namespace {

KSAssertionHandler& currentHandler() {
    static KSAssertionHandler handler;
    return handler;
}

}  // namespace

KSAssertionHandler setAssertionHandler(KSAssertionHandler handler) {
    return std::exchange(currentHandler(), std::move(handler));
}

void assertionFailed(std::string_view description, std::string_view unit, int line) {
    logError(fmt::format("{} (in {}:{})", description, unit, line));
    if (currentHandler()) {
        currentHandler()({std::string(description), std::string(unit), line});
    }
}

std::string invalidParameterText(std::string_view condition) {
    return fmt::format("Invalid parameter not satisfying: {}", condition);
}

bool assertParameter(bool satisfied, std::string_view condition, std::string_view unit, int line) {
    if (!satisfied) assertionFailed(invalidParameterText(condition), unit, line);
    return satisfied;
}

}  // namespace keepsakes
