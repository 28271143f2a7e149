// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "core/KSValue.h"

namespace keepsakes {

/// JSON (RFC 8259) as a codec of `KSValue`. Dates become numbers, identifiers strings, bytes an
/// array of numbers; reading yields null, booleans, integers, doubles, strings, arrays and
/// dictionaries only. What cannot be written (a number that is not finite, a string that is not
/// UTF-8) yields nothing. Reading refuses more than 64 levels of nesting.
std::optional<std::string> jsonText(const KSValue& value);
std::optional<KSValue> parseJson(std::string_view text);

}  // namespace keepsakes
