// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string_view>

#include "core/KSError.h"
#include "core/KSValue.h"

namespace keepsakes {

/// What kind of value it is: "String", "Integer", "Dictionary" and so on.
std::string_view className(const KSValue& value);

/// Of the domain, code 3: the archive of a record holds a value of another class under the key.
KSError unexpectedClass(std::string_view domain, std::string_view record, std::string_view key,
                        std::string_view expected, const KSValue& decoded);

}  // namespace keepsakes
