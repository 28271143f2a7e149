// SPDX-License-Identifier: Apache-2.0
#include "core/KSValue.h"

#include <fmt/format.h>

namespace keepsakes {

std::optional<double> KSValue::asNumber() const {
    if (auto integer = asInteger()) return static_cast<double>(*integer);
    return read<double>();
}

namespace {

struct Describe {
    std::string operator()(std::monostate) const { return "null"; }
    std::string operator()(bool value) const { return value ? "true" : "false"; }
    std::string operator()(std::int64_t value) const { return fmt::format("{}", value); }
    std::string operator()(double value) const { return fmt::format("{}", value); }
    std::string operator()(const std::string& value) const { return fmt::format("\"{}\"", value); }
    std::string operator()(const KSValue::Bytes& value) const {
        return fmt::format("<{} bytes>", value.size());
    }
    std::string operator()(KSDate value) const { return formatISO8601(value); }
    std::string operator()(const KSUUID& value) const { return value.string(); }
    std::string operator()(const KSValue::Array& value) const {
        std::string text = "[";
        for (const auto& item : value) {
            if (text.size() > 1) text += ", ";
            text += item.description();
        }
        return text + "]";
    }
    std::string operator()(const KSValue::Dictionary& value) const {
        std::string text = "{";
        for (const auto& [key, item] : value) {
            if (text.size() > 1) text += ", ";
            text += fmt::format("\"{}\": {}", key, item.description());
        }
        return text + "}";
    }
};

}  // namespace

std::string KSValue::description() const { return visit(Describe{}); }

const KSValue& valueForKey(const KSDictionary& dictionary, std::string_view key) {
    static const KSValue null;
    const auto found = dictionary.find(key);
    return found == dictionary.end() ? null : found->second;
}

}  // namespace keepsakes
