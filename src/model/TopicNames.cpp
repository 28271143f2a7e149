// SPDX-License-Identifier: Apache-2.0
#include "model/TopicNames.h"

#include <algorithm>

#include "model/KSEvent.h"
#include "platform/TopicCatalogue.h"

namespace keepsakes {

KSDictionary KSEvent::_displayNameOfScoredTopics(const KSDictionary& topics) {
    KSDictionary named;
    for (const auto& [identifier, score] : topics) {
        named.insert_or_assign(std::string(topicName(identifier).value_or(identifier)), score);
    }
    return named;
}

std::vector<std::pair<std::string, double>> topicsByScore(const KSDictionary& scoredTopics) {
    std::vector<std::pair<std::string, double>> topics;
    for (const auto& [name, score] : KSEvent::_displayNameOfScoredTopics(scoredTopics)) {
        topics.emplace_back(name, score.asNumber().value_or(0));
    }
    std::ranges::stable_sort(topics,
                             [](const auto& a, const auto& b) { return a.second > b.second; });
    return topics;
}

}  // namespace keepsakes
