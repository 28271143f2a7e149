// SPDX-License-Identifier: Apache-2.0
#include "devicedata/TopicScores.h"

#include <algorithm>
#include <cmath>

namespace keepsakes {

void TopicScores::add(const EvidenceKind& kind, KSDate date,
                      const std::set<std::string_view>& topics) {
    if (date < query_.fromDate || query_.toDate < date) return;
    for (const auto topic : topics) {
        auto& pieces = pieces_[{std::string(topic), std::string(kind.name)}];
        pieces.weight = kind.weight;
        pieces.dates.push_back(date.seconds);
    }
}

std::map<std::string, double> TopicScores::scores() const {
    std::map<std::string, double> scores;
    for (const auto& [key, pieces] : pieces_) {
        auto dates = pieces.dates;
        std::ranges::sort(dates);
        double missed = 1;  // how likely none of it tells of the topic
        double counted = -HUGE_VAL;
        for (const double date : dates) {
            if (date - counted < kRepetitionSeconds) continue;
            counted = date;
            const double age = std::max(0.0, query_.scoringDate.seconds - date);
            missed *= 1 - pieces.weight * std::exp(-query_.decayRate * age);
        }
        auto& score = scores[key.first];
        score = 1 - (1 - score) * missed;
    }
    return scores;
}

}  // namespace keepsakes
