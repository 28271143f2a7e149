// SPDX-License-Identifier: Apache-2.0
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

}  // namespace keepsakes
