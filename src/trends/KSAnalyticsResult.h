// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "core/KSDate.h"

namespace keepsakes {

/// The outcome of testing one point against a fitted model.
struct KSAnalyticsResult {
    bool outlier = false;  ///< Whether it lies outside the fences.
    KSDate date;
    double predict = 0;  ///< For models that predict; the outlier detector leaves it.
    double actual = 0;
    double score = 0;  ///< The actual value less the median of the training.

    friend bool operator==(const KSAnalyticsResult&, const KSAnalyticsResult&) = default;
};

}  // namespace keepsakes
