// SPDX-License-Identifier: Apache-2.0
#include "metrics/KSUserData.h"

#include <string>
#include <vector>

#include "metrics/MetricValues.h"
#include "sources/KSVitalsManager.h"

namespace keepsakes {

namespace {

constexpr const char* kAgeBucket = "ageBucket";
constexpr const char* kBiologicalSex = "biologicalSex";

}  // namespace

KSMetric::Keys KSUserData::supportedMetricKeys() const { return {kAgeBucket, kBiologicalSex}; }

OptionalError KSUserData::setOwner(std::optional<int> years, std::optional<int> biologicalSexCode) {
    static const std::vector<double> kAges = {18, 25, 35, 45, 55, 65};
    const auto word = KSVitalsManager::convertBiologicalSexObjToString(biologicalSexCode);
    return setAllMetrics(
        {{kAgeBucket, years ? static_cast<int>(binForNumber(*years, kAges)) : metric::kNoBin},
         {kBiologicalSex, word.value_or("not set")}});
}

}  // namespace keepsakes
