// SPDX-License-Identifier: Apache-2.0
#include "sources/ArchiveErrors.h"

#include <fmt/format.h>

namespace keepsakes {

std::string_view className(const KSValue& value) {
    struct Namer {
        std::string_view operator()(std::monostate) const { return "Null"; }
        std::string_view operator()(bool) const { return "Boolean"; }
        std::string_view operator()(std::int64_t) const { return "Integer"; }
        std::string_view operator()(double) const { return "Number"; }
        std::string_view operator()(const std::string&) const { return "String"; }
        std::string_view operator()(const KSValue::Bytes&) const { return "Bytes"; }
        std::string_view operator()(KSDate) const { return "Date"; }
        std::string_view operator()(const KSUUID&) const { return "UUID"; }
        std::string_view operator()(const KSArray&) const { return "Array"; }
        std::string_view operator()(const KSDictionary&) const { return "Dictionary"; }
    };
    return value.visit(Namer());
}

KSError unexpectedClass(std::string_view domain, std::string_view record, std::string_view key,
                        std::string_view expected, const KSValue& decoded) {
    return KSError::make(
        domain, 3,
        fmt::format("Unarchived unexpected class for {} key \"{}\" (expected {}, decoded {})",
                    record, key, expected, className(decoded)));
}

}  // namespace keepsakes
