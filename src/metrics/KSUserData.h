// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>

#include "analytics/KSMetric.h"

namespace keepsakes {

/// The owner, as coarsely as it goes: "ageBucket", the number of the edges 18, 25, 35, 45, 55 and
/// 65 that the age in years reaches, or -1 where it is not known; and "biologicalSex", a word of
/// the health store's, "not set" where there is none. Made only with the owner's permission.
class KSUserData final : public KSMetric {
  public:
    using KSMetric::KSMetric;

    const char* event() const override { return "UserData"; }
    Keys supportedMetricKeys() const override;

    OptionalError setOwner(std::optional<int> years, std::optional<int> biologicalSexCode);
};

}  // namespace keepsakes
