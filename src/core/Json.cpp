// SPDX-License-Identifier: Apache-2.0
#include "core/Json.h"

#include <cmath>
#include <nlohmann/json.hpp>

namespace keepsakes {

namespace {

using nlohmann::json;

constexpr int kDeepestJson = 64;

struct NotWritable {};

struct ToJson {
    json operator()(std::monostate) const { return nullptr; }
    json operator()(bool value) const { return value; }
    json operator()(std::int64_t value) const { return value; }
    json operator()(double value) const {
        if (!std::isfinite(value)) throw NotWritable{};
        return value;
    }
    json operator()(const std::string& value) const { return value; }
    json operator()(const KSValue::Bytes& value) const { return json(value); }
    json operator()(KSDate value) const { return (*this)(value.seconds); }
    json operator()(const KSUUID& value) const { return value.string(); }
    json operator()(const KSArray& value) const {
        json array = json::array();
        for (const auto& item : value) array.push_back(item.visit(*this));
        return array;
    }
    json operator()(const KSDictionary& value) const {
        json object = json::object();
        for (const auto& [key, item] : value) object[key] = item.visit(*this);
        return object;
    }
};

KSValue fromJson(const json& value) {
    switch (value.type()) {
        case json::value_t::boolean:
            return value.get<bool>();
        case json::value_t::number_integer:
            return value.get<std::int64_t>();
        case json::value_t::number_unsigned: {
            const auto number = value.get<std::uint64_t>();
            if (number > INT64_MAX) return static_cast<double>(number);
            return static_cast<std::int64_t>(number);
        }
        case json::value_t::number_float:
            return value.get<double>();
        case json::value_t::string:
            return value.get<std::string>();
        case json::value_t::array: {
            KSArray array;
            array.reserve(value.size());
            for (const auto& item : value) array.push_back(fromJson(item));
            return array;
        }
        case json::value_t::object: {
            KSDictionary dictionary;
            for (const auto& [key, item] : value.items()) dictionary.emplace(key, fromJson(item));
            return dictionary;
        }
        default:
            return {};
    }
}

}  // namespace

std::optional<std::string> jsonText(const KSValue& value) {
    try {
        return value.visit(ToJson{}).dump();
    } catch (const NotWritable&) {
        return std::nullopt;
    } catch (const json::exception&) {
        return std::nullopt;
    }
}

std::optional<KSValue> parseJson(std::string_view text) {
    bool tooDeep = false;
    const auto limitDepth = [&tooDeep](int depth, json::parse_event_t event, json&) {
        const bool opens =
            event == json::parse_event_t::array_start || event == json::parse_event_t::object_start;
        tooDeep |= opens && depth >= kDeepestJson;
        return !tooDeep;
    };
    try {
        const json parsed = json::parse(text, limitDepth);
        if (tooDeep) return std::nullopt;
        return fromJson(parsed);
    } catch (const json::exception&) {
        return std::nullopt;
    }
}

}  // namespace keepsakes
