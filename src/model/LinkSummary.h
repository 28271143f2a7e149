// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

#include "model/KSEvent.h"

namespace keepsakes {

/// What a shared-link event is called: the link's title; without one, its host and path, cut to a
/// length for people. Empty for an event without a link.
std::string linkTitleOf(const KSEvent& event);

/// Whom or where the link came from, or went to: "from Anna Beispiel", "to Anna Beispiel". Empty
/// when nobody knows.
std::string linkOriginOf(const KSEvent& event);

}  // namespace keepsakes
