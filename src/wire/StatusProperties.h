// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>

#include "wire/Answer.h"
#include "wire/KSKeepsakesConduitProtocol.h"

namespace keepsakes {

/// Answers org.freedesktop.DBus.Properties for the daemon's object (D-Bus Specification, "Standard
/// Interfaces"). Every answer asks the source anew, so that a caller who was told that events are
/// stored finds them counted; the bus library's own property table could not wait for that.
/// Private to the folder.
Admission callProperties(sd_bus_message* message, StatusSource& source, Respond respond);

}  // namespace keepsakes
