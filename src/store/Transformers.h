// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "core/KSValue.h"

namespace keepsakes {

/// Arrays of strings in one column: UTF-8, joined by U+0000. An empty text is an empty array, so
/// an array of one empty string comes back empty, and strings that hold U+0000 come back split.
/// A value of another kind fails the assertion and is stored as nothing.
struct KSStringArrayTransformer {
    static std::optional<KSValue::Bytes> transformedValue(const KSValue& array);
    static std::optional<std::vector<std::string>> reverseTransformedValue(const KSValue& bytes);
};

/// Dictionaries in one column as JSON text. What JSON cannot hold is stored as nothing.
/// A value of another kind fails the assertion and is stored as nothing.
struct KSDictionaryTransformer {
    static std::optional<KSValue::Bytes> transformedValue(const KSValue& dictionary);
    static std::optional<KSDictionary> reverseTransformedValue(const KSValue& bytes);
};

}  // namespace keepsakes
