// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string_view>

#include "core/KSError.h"
#include "core/KSValue.h"

namespace keepsakes {

/// The user defaults store: settings by domain and key that programs other than the daemon may
/// write. Any thread may call it; every read sees what was written last, by whomever.
class UserDefaults {
  public:
    virtual ~UserDefaults() = default;

    /// Null when there is none, or when the domain cannot be read (which is logged once).
    virtual KSValue object(std::string_view domain, std::string_view key) const = 0;

    /// A null value removes the key.
    virtual OptionalError setObject(std::string_view domain, std::string_view key,
                                    const KSValue& value) = 0;
};

}  // namespace keepsakes
