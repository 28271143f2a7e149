// SPDX-License-Identifier: Apache-2.0
#include "model/ValueCoding.h"

#include <fmt/format.h>

#include <cmath>

#include "core/Json.h"

namespace keepsakes {

void ValueEncoder::put(std::string_view key, KSValue value) {
    dictionary_.insert_or_assign(std::string(key), std::move(value));
}

void ValueEncoder::writeBool(std::string_view key, bool value) { put(key, value); }
void ValueEncoder::writeUnsigned(std::string_view key, std::uint64_t value) { put(key, value); }
void ValueEncoder::writeNumber(std::string_view key, double value) { put(key, value); }
void ValueEncoder::writeString(std::string_view key, std::string_view value) { put(key, value); }
void ValueEncoder::writeStrings(std::string_view key, const std::vector<std::string>& value) {
    put(key, KSArray(value.begin(), value.end()));
}
void ValueEncoder::writeUUID(std::string_view key, const KSUUID& value) { put(key, value); }
void ValueEncoder::writeDate(std::string_view key, KSDate value) { put(key, value); }
void ValueEncoder::writeInterval(std::string_view key, const KSDateInterval& value) {
    put(key, KSArray{value.start, value.end});
}
void ValueEncoder::writeLocation(std::string_view key, double latitude, double longitude) {
    put(key, KSArray{latitude, longitude});
}
void ValueEncoder::writeJson(std::string_view key, const KSDictionary& value) { put(key, value); }
void ValueEncoder::writeDictionary(std::string_view key, const KSDictionary& value) {
    put(key, value);
}
void ValueEncoder::writeDictionaries(std::string_view key, const std::vector<KSDictionary>& value) {
    put(key, KSArray(value.begin(), value.end()));
}
void ValueEncoder::writeRecord(std::string_view key, const WriteRecord& write) {
    ValueEncoder nested;
    write(nested);
    put(key, nested.take());
}
void ValueEncoder::writeRecords(std::string_view key, std::size_t count,
                                const std::function<void(std::size_t, KeyedEncoder&)>& write) {
    KSArray array;
    for (std::size_t index = 0; index < count; ++index) {
        ValueEncoder nested;
        write(index, nested);
        array.emplace_back(nested.take());
    }
    put(key, std::move(array));
}

ValueDecoder::ValueDecoder(const KSValue& value) : value_(&value) {}

bool ValueDecoder::fail(std::string_view reason) {
    if (error_.empty()) error_ = path_.empty() ? reason : fmt::format("{}: {}", path_, reason);
    return false;
}

bool ValueDecoder::readBool(bool& value) {
    const auto read = value_->asBool();
    if (!read) return fail("not a boolean");
    value = *read;
    return true;
}

bool ValueDecoder::readUnsigned(std::uint64_t& value) {
    const auto read = value_->asInteger();
    if (!read) return fail("not an integer");
    value = static_cast<std::uint64_t>(*read);
    return true;
}

bool ValueDecoder::readNumber(double& value) {
    const auto read = value_->asNumber();
    if (!read) return fail("not a number");
    value = *read;
    return true;
}

bool ValueDecoder::readString(std::string& value) {
    const auto* read = value_->asString();
    if (!read) return fail("not a string");
    value = *read;
    return true;
}

bool ValueDecoder::readStrings(std::vector<std::string>& value) {
    const auto* read = value_->asArray();
    if (!read) return fail("not an array of strings");
    for (const auto& item : *read) {
        if (!item.asString()) return fail("not an array of strings");
        value.push_back(*item.asString());
    }
    return true;
}

bool ValueDecoder::readUUID(KSUUID& value) {
    auto read = value_->asUUID();
    if (!read && value_->asString()) read = KSUUID::parse(*value_->asString());
    if (!read) return fail("not a UUID");
    value = *read;
    return true;
}

bool ValueDecoder::readDate(KSDate& value) {
    if (const auto read = value_->asDate()) {
        value = *read;
    } else if (const auto number = value_->asNumber()) {
        value = {*number};
    } else {
        return fail("not a date");
    }
    return std::isfinite(value.seconds) || fail("not a finite date");
}

bool ValueDecoder::readInterval(KSDateInterval& value) {
    const auto* pair = value_->asArray();
    if (!pair || pair->size() != 2) return fail("not a date interval");
    return readNested((*pair)[0], "start",
                      [&](KeyedDecoder& in) { return in.readDate(value.start); }) &&
           readNested((*pair)[1], "end", [&](KeyedDecoder& in) { return in.readDate(value.end); });
}

bool ValueDecoder::readLocation(double& latitude, double& longitude) {
    const auto* pair = value_->asArray();
    if (!pair || pair->size() != 2 || !(*pair)[0].asNumber() || !(*pair)[1].asNumber()) {
        return fail("not a location");
    }
    latitude = *(*pair)[0].asNumber();
    longitude = *(*pair)[1].asNumber();
    return true;
}

bool ValueDecoder::readJson(KSDictionary& value) {
    if (const auto* dictionary = value_->asDictionary()) {
        value = *dictionary;
        return true;
    }
    std::string text;
    if (const auto* string = value_->asString()) text = *string;
    if (const auto* bytes = value_->asBytes()) text.assign(bytes->begin(), bytes->end());
    const auto parsed = parseJson(text);
    if (!parsed || !parsed->asDictionary()) return fail("not a JSON object");
    value = *parsed->asDictionary();
    return true;
}

bool ValueDecoder::readDictionary(KSDictionary& value) {
    const auto* dictionary = value_->asDictionary();
    if (!dictionary) return fail("not a record");
    value = *dictionary;
    return true;
}

bool ValueDecoder::readDictionaries(std::vector<KSDictionary>& value) {
    return readRecords(
        [&value](KeyedDecoder& in) { return in.readDictionary(value.emplace_back()); });
}

template <class Read>
bool ValueDecoder::readNested(const KSValue& value, std::string_view step, const Read& read) {
    const auto* const outerValue = value_;
    const auto outerPath = path_.size();
    value_ = &value;
    if (!path_.empty() && !step.starts_with('[')) path_ += '.';
    path_ += step;
    const bool good = read(*this);
    path_.resize(outerPath);
    value_ = outerValue;
    return good;
}

bool ValueDecoder::readRecord(const ReadField& field) {
    const auto* dictionary = value_->asDictionary();
    if (!dictionary) return fail("not a record");
    for (const auto& [key, value] : *dictionary) {
        const bool good = readNested(value, key, [&](KeyedDecoder& in) { return field(key, in); });
        if (!good) return false;
    }
    return true;
}

bool ValueDecoder::readRecords(const std::function<bool(KeyedDecoder&)>& element) {
    const auto* array = value_->asArray();
    if (!array) return fail("not an array of records");
    std::size_t index = 0;
    for (const auto& item : *array) {
        if (!readNested(item, fmt::format("[{}]", index++), element)) return false;
    }
    return true;
}

}  // namespace keepsakes
