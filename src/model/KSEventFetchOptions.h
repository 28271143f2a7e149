// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <optional>
#include <string>

#include "model/KSEvent.h"

namespace keepsakes {

/// What a caller wants of the stored events, sorted by start date. A plain value.
struct KSEventFetchOptions {
    std::optional<KSDateInterval> dateInterval;  ///< Events whose span overlaps it; absent: any.
    bool ascending = false;
    KSEventCategory category = KSEventCategory::unknown;  ///< `unknown`: any.
    std::optional<double> limit;                          ///< At most this many; absent: all.

    bool isEqualToFetchOptions(const KSEventFetchOptions& other) const { return *this == other; }
    std::size_t hash() const;
    std::string description() const;
    void encodeWithCoder(KeyedEncoder& encoder) const;
    static bool initWithCoder(KeyedDecoder& decoder, KSEventFetchOptions& options);

    friend bool operator==(const KSEventFetchOptions&, const KSEventFetchOptions&) = default;
};

}  // namespace keepsakes
