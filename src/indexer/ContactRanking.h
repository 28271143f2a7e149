// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "core/KSDate.h"

namespace keepsakes {

// Figures of the ranking.

/// Interactions that lie longer back do not count, in seconds.
inline constexpr double kRankingSpan = 365 * 86400.0;
/// After so many seconds an interaction weighs half.
inline constexpr double kWeightHalfLife = 30 * 86400.0;
/// After so many seconds of silence, recency is a half.
inline constexpr double kRecencyHalfLife = 30 * 86400.0;
/// So many recent interactions make frequency a half.
inline constexpr double kHalfFrequency = 4;
/// The quieter side need not say more than a part of this to be heard as a partner.
inline constexpr double kFullReciprocity = 3;

/// How the owner and one other person were in touch, as of a moment. A plain value.
class ContactTally {
  public:
    explicit ContactTally(KSDate now) : now_(now) {}

    /// A message among `others` people beside the owner; a call is one in both directions.
    void addSent(KSDate when, double others);
    void addReceived(KSDate when, double others);

    /// 0 to 1: the geometric mean of frequency, recency and reciprocity, so that who only ever
    /// writes or is only ever written to scores 0.
    ///   frequency   = 1 - 2^(-w / kHalfFrequency), w the sum of all weights
    ///   recency     = 2^(-age of the latest / kRecencyHalfLife)
    ///   reciprocity = min(1, kFullReciprocity * the smaller / the larger of the two sides'
    ///   weights)
    /// A weight is 2^(-age / kWeightHalfLife), divided by the number of others.
    double score() const;

  private:
    double weigh(KSDate when, double others);

    KSDate now_;
    double sent_ = 0;
    double received_ = 0;
    KSDate latest_ = KSDate::distantPast();
};

}  // namespace keepsakes
