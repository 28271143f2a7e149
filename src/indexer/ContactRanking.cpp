// SPDX-License-Identifier: Apache-2.0
#include "indexer/ContactRanking.h"

#include <algorithm>
#include <cmath>

namespace keepsakes {

double ContactTally::weigh(KSDate when, double others) {
    latest_ = std::max(latest_, when);
    return std::exp2(-std::max(0.0, now_ - when) / kWeightHalfLife) / std::max(1.0, others);
}

void ContactTally::addSent(KSDate when, double others) { sent_ += weigh(when, others); }

void ContactTally::addReceived(KSDate when, double others) { received_ += weigh(when, others); }

double ContactTally::score() const {
    const auto [smaller, larger] = std::minmax(sent_, received_);
    if (!(smaller > 0)) return 0;
    const double frequency = 1 - std::exp2(-(sent_ + received_) / kHalfFrequency);
    const double recency = std::exp2(-std::max(0.0, now_ - latest_) / kRecencyHalfLife);
    const double reciprocity = std::min(1.0, kFullReciprocity * smaller / larger);
    return std::cbrt(frequency * recency * reciprocity);
}

}  // namespace keepsakes
