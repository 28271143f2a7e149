// SPDX-License-Identifier: Apache-2.0
#include "client/RecordJson.h"

#include <fmt/format.h>

#include <cmath>

#include "core/Json.h"
#include "model/ValueCoding.h"

namespace keepsakes {

namespace {

std::unexpected<KSError> failure(std::string_view text) {
    return std::unexpected(KSError::make(KSErrorCode::invalidParameter, text));
}

template <class Record>
KSDictionary archived(const Record& record) {
    ValueEncoder encoder;
    record.encodeWithCoder(encoder);
    return *jsonForm(KSValue(encoder.take())).asDictionary();
}

KSDictionary formOf(const KSDictionary& record) { return record; }
template <class Record>
KSDictionary formOf(const std::shared_ptr<const Record>& record) {
    return jsonForm(*record);
}

template <class Array>
std::string recordLines(const Array& records) {
    std::string text = "[";
    for (const auto& record : records) {
        text += text.size() > 1 ? ",\n" : "\n";
        text += jsonText(formOf(record)).value_or("null");
    }
    return text + (records.empty() ? "]\n" : "\n]\n");
}

template <class Record>
std::expected<std::shared_ptr<const Record>, KSError> recordFrom(const KSValue& value) {
    ValueDecoder decoder(value);
    auto record = Record::initWithCoder(decoder);
    if (!record) return failure(decoder.error());
    return record;
}

}  // namespace

KSValue jsonForm(const KSValue& value) {
    if (const auto* array = value.asArray()) {
        KSArray items;
        for (const auto& item : *array) items.push_back(jsonForm(item));
        return items;
    }
    if (const auto* dictionary = value.asDictionary()) {
        KSDictionary entries;
        for (const auto& [key, item] : *dictionary) {
            if (const auto date = item.asDate(); date && std::isfinite(date->seconds)) {
                entries.insert_or_assign(key + "ISO", formatISO8601(*date));
            }
            entries.insert_or_assign(key, jsonForm(item));
        }
        return entries;
    }
    if (const auto date = value.asDate()) return jsonForm(KSValue(date->seconds));
    const auto number = value.asNumber();
    return number && !std::isfinite(*number) ? KSValue() : value;
}

KSDictionary jsonForm(const KSEvent& event) { return archived(event); }
KSDictionary jsonForm(const KSEventBundle& bundle) { return archived(bundle); }
std::string jsonRecords(const KSEventArray& events) { return recordLines(events); }
std::string jsonRecords(const KSEventBundleArray& bundles) { return recordLines(bundles); }
std::string jsonRecords(const std::vector<KSDictionary>& records) { return recordLines(records); }

std::expected<KSEventPointer, KSError> eventFromJson(const KSValue& record) {
    return recordFrom<KSEvent>(record);
}

std::expected<KSEventBundlePointer, KSError> bundleFromJson(const KSValue& record) {
    return recordFrom<KSEventBundle>(record);
}

std::expected<KSEventArray, KSError> eventsFromJson(std::string_view text) {
    const auto parsed = parseJson(text);
    if (!parsed) return failure("not JSON");
    const auto* array = parsed->asArray();
    if (!array) return failure("not an array of records");
    KSEventArray events;
    for (const auto& item : *array) {
        auto event = eventFromJson(item);
        if (!event) {
            return failure(fmt::format("event {}: {}", events.size(), event.error().description()));
        }
        events.push_back(std::move(*event));
    }
    return events;
}

}  // namespace keepsakes
