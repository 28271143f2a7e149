// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <concepts>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

#include "core/KSDate.h"
#include "core/KSUUID.h"

namespace keepsakes {

/// One dynamic value: result dictionaries, notifier payloads, analytics fields, property lists and
/// keyed archives are made of it. A plain value, copied deep. The readers are strict about kinds
/// and answer nothing for another kind; only `asNumber` takes integers and doubles alike.
class KSValue {
  public:
    using Bytes = std::vector<std::uint8_t>;
    using Array = std::vector<KSValue>;
    using Dictionary = std::map<std::string, KSValue, std::less<>>;

    KSValue() = default;
    // Implicit: literals and records become values where they stand.
    KSValue(bool value) : data_(value) {}
    template <std::integral T>
    requires(!std::same_as<T, bool>) KSValue(T value) : data_(static_cast<std::int64_t>(value)) {}
    KSValue(double value) : data_(value) {}
    KSValue(const char* value) : data_(std::string(value)) {}
    KSValue(std::string_view value) : data_(std::string(value)) {}
    KSValue(std::string value) : data_(std::move(value)) {}
    KSValue(Bytes value) : data_(std::move(value)) {}
    KSValue(KSDate value) : data_(value) {}
    KSValue(KSUUID value) : data_(value) {}
    KSValue(Array value) : data_(std::move(value)) {}
    KSValue(Dictionary value) : data_(std::move(value)) {}

    bool isNull() const { return std::holds_alternative<std::monostate>(data_); }
    std::optional<bool> asBool() const { return read<bool>(); }
    std::optional<std::int64_t> asInteger() const { return read<std::int64_t>(); }
    std::optional<double> asNumber() const;
    std::optional<KSDate> asDate() const { return read<KSDate>(); }
    std::optional<KSUUID> asUUID() const { return read<KSUUID>(); }
    const std::string* asString() const { return std::get_if<std::string>(&data_); }
    const Bytes* asBytes() const { return std::get_if<Bytes>(&data_); }
    const Array* asArray() const { return std::get_if<Array>(&data_); }
    const Dictionary* asDictionary() const { return std::get_if<Dictionary>(&data_); }

    /// For logs: JSON-like, dates as ISO 8601, bytes as their count.
    std::string description() const;

    template <class Visitor>
    decltype(auto) visit(Visitor&& visitor) const {
        return std::visit(std::forward<Visitor>(visitor), data_);
    }

    friend bool operator==(const KSValue&, const KSValue&) = default;

  private:
    template <class T>
    std::optional<T> read() const {
        const T* value = std::get_if<T>(&data_);
        return value ? std::optional<T>(*value) : std::nullopt;
    }

    std::variant<std::monostate, bool, std::int64_t, double, std::string, Bytes, KSDate, KSUUID,
                 Array, Dictionary>
        data_;
};

using KSDictionary = KSValue::Dictionary;
using KSArray = KSValue::Array;

/// The value under `key`, or null when there is none.
const KSValue& valueForKey(const KSDictionary& dictionary, std::string_view key);

}  // namespace keepsakes
