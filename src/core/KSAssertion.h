// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <string>
#include <string_view>

namespace keepsakes {

/// A broken promise inside the daemon's own code (never bad input from outside): logged with its
/// source unit and line, after which the operation yields nothing.
struct KSAssertionFailure {
    std::string description;
    std::string unit;
    int line = 0;
};

using KSAssertionHandler = std::function<void(const KSAssertionFailure&)>;

/// Replaces what a failure does beyond being logged; answers the handler that stood before.
/// Tests record; `--abort-on-assertion` aborts. Set it before the first queue works.
KSAssertionHandler setAssertionHandler(KSAssertionHandler handler);

/// Logs "<description> (in <unit>:<line>)" and calls the handler.
void assertionFailed(std::string_view description, std::string_view unit, int line);

/// "Invalid parameter not satisfying: <condition>".
std::string invalidParameterText(std::string_view condition);

/// Whether `satisfied`; when not, fails the assertion that names `condition`.
bool assertParameter(bool satisfied, std::string_view condition, std::string_view unit, int line);

}  // namespace keepsakes
