// SPDX-License-Identifier: Apache-2.0
#include "metrics/MetricValues.h"

#include <algorithm>

#include "analytics/KSMetric.h"

namespace keepsakes::metric {

namespace {

using Keys = std::set<std::string, std::less<>>;

template <class Kinds>
Keys keysOf(std::string_view stem, const Kinds& kinds) {
    Keys keys = {key(stem, kOther)};
    for (const auto kind : kinds) keys.insert(key(stem, kind));
    return keys;
}

}  // namespace

std::string key(std::string_view stem, std::string_view kind) {
    std::string text(stem);
    std::ranges::copy_if(kind, std::back_inserter(text), [](char c) { return c != ' '; });
    return text;
}

std::string key(std::string_view stem, KSEventProvider provider) {
    const bool known = std::ranges::find(kProviders, provider) != kProviders.end();
    return key(stem, known ? KSEvent::describeProvider(provider) : std::string(kOther));
}

std::string key(std::string_view stem, KSEventCategory category) {
    const bool known = std::ranges::find(kCategories, category) != kCategories.end();
    return key(stem, known ? KSEvent::describeCategory(category) : std::string(kOther));
}

Keys providerKeys(std::string_view stem) { return keysOf(stem, kProviders); }
Keys categoryKeys(std::string_view stem) { return keysOf(stem, kCategories); }

std::int64_t medianBin(std::vector<double> values, const std::vector<double>& bins) {
    if (values.empty()) return kNoBin;
    const auto middle = values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2);
    std::ranges::nth_element(values, middle);
    return static_cast<std::int64_t>(KSMetric::binForNumber(*middle, bins));
}

}  // namespace keepsakes::metric
