// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <fmt/format.h>

#include <cmath>
#include <functional>
#include <optional>
#include <string>

#include "core/KSDate.h"
#include "model/KSExtensions.h"
#include "model/KeyedCoding.h"

namespace keepsakes {

/// What the two kinds of fetch options do alike. Private to the folder.

inline std::size_t hashOf(const std::optional<KSDateInterval>& interval) {
    if (!interval) return 0;
    const std::hash<double> hash;
    return hash(interval->start.seconds) ^ (hash(interval->end.seconds) << 1);
}

inline std::size_t hashOf(const std::optional<double>& limit) {
    return limit ? std::hash<double>{}(*limit) : 0;
}

inline std::string describeBounds(const std::optional<KSDateInterval>& interval) {
    if (!interval) return "startDate, (null), endDate, (null)";
    return fmt::format("startDate, {}, endDate, {}", KSExtensions::stringFromDate(interval->start),
                       KSExtensions::stringFromDate(interval->end));
}

inline std::string describeLimit(const std::optional<double>& limit) {
    return limit ? fmt::format("{}", *limit) : "(null)";
}

/// A limit is a count: what is negative or not finite is refused, a fraction is dropped.
inline bool readLimit(KeyedDecoder& in, std::optional<double>& limit) {
    double value = 0;
    if (!in.readNumber(value)) return false;
    if (!std::isfinite(value) || value < 0) return in.fail("not a count");
    limit = std::floor(value);
    return true;
}

}  // namespace keepsakes
