// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <fmt/format.h>

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "core/KSValue.h"

namespace keepsakes {

/// How values stand in the descriptions of records: what is absent as "(null)", arrays as
/// "(a, b)", nested records by their own description.
inline std::string describe(const std::string& value) { return value; }
inline std::string describe(double value) { return fmt::format("{}", value); }
inline std::string describe(const KSDictionary& value) { return KSValue(value).description(); }

template <class Record>
requires requires(const Record& record) { record.description(); }
std::string describe(const Record& record) { return record.description(); }
template <class T>
std::string describe(const std::vector<T>& values) {
    std::string text = "(";
    for (const auto& value : values) {
        if (text.size() > 1) text += ", ";
        text += describe(value);
    }
    return text + ")";
}
template <class T>
std::string describe(const std::optional<T>& value) {
    return value ? describe(*value) : "(null)";
}
template <class T>
std::string describe(const std::shared_ptr<T>& value) {
    return value ? describe(*value) : "(null)";
}

}  // namespace keepsakes
