// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string_view>

#include "wire/Answer.h"
#include "wire/KSKeepsakesConduitProtocol.h"

namespace keepsakes {

/// One of the ten methods: how its arguments are read and its reply is written. Private to the
/// folder.
struct ConduitMethod {
    std::string_view name;
    std::string_view signature;
    /// Reads the arguments, whole, and only then calls the protocol.
    Admission (*call)(sd_bus_message*, KSKeepsakesConduitProtocol&, Respond);
};

/// The method of that name, or a null pointer.
const ConduitMethod* findConduitMethod(std::string_view name);

}  // namespace keepsakes
