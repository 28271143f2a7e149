// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <optional>
#include <string>

#include "model/KeyedCoding.h"

namespace keepsakes {

/// What a caller wants of the stored bundles, sorted by start date. A plain value.
struct KSEventBundleFetchOptions {
    std::optional<KSDateInterval> dateInterval;  ///< Bundles that overlap it; absent: any.
    bool ascending = false;
    std::optional<double> limit;  ///< At most this many; absent: all.
    bool filterBundle = false;    ///< Only bundles that a rule made.

    bool isEqualToFetchOptions(const KSEventBundleFetchOptions& other) const {
        return *this == other;
    }
    std::size_t hash() const;
    std::string description() const;
    void encodeWithCoder(KeyedEncoder& encoder) const;
    static bool initWithCoder(KeyedDecoder& decoder, KSEventBundleFetchOptions& options);

    friend bool operator==(const KSEventBundleFetchOptions&,
                           const KSEventBundleFetchOptions&) = default;
};

}  // namespace keepsakes
