// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <utility>
#include <vector>

#include "core/KSValue.h"

namespace keepsakes {

/// Scored topics by their display names, the strongest first, then by name.
std::vector<std::pair<std::string, double>> topicsByScore(const KSDictionary& scoredTopics);

}  // namespace keepsakes
