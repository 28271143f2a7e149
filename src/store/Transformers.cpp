// SPDX-License-Identifier: Apache-2.0
#include "store/Transformers.h"

#include <string_view>

#include "core/Json.h"
#include "core/KSAssertion.h"
#include "model/KSEventExtendedAttributes.h"

namespace keepsakes {

namespace {

constexpr std::string_view kStringArrayUnit = "KSStringArrayTransformer";
constexpr std::string_view kDictionaryUnit = "KSDictionaryTransformer";
constexpr char kSeparator = '\0';

std::string_view textOf(const KSValue::Bytes& bytes) {
    return {reinterpret_cast<const char*>(bytes.data()), bytes.size()};
}

}  // namespace

std::optional<KSValue::Bytes> KSStringArrayTransformer::transformedValue(const KSValue& array) {
    if (array.isNull()) return std::nullopt;
    if (!array.asArray()) {
        assertionFailed("Object is not of array type", kStringArrayUnit, 31);
        return std::nullopt;
    }
    KSValue::Bytes joined;
    bool first = true;
    for (const auto& text : stringsOf(*array.asArray())) {
        if (!first) joined.push_back(kSeparator);
        joined.insert(joined.end(), text.begin(), text.end());
        first = false;
    }
    return joined;
}

std::optional<std::vector<std::string>> KSStringArrayTransformer::reverseTransformedValue(
    const KSValue& bytes) {
    if (bytes.isNull()) return std::nullopt;
    if (!bytes.asBytes()) {
        assertionFailed("Object is not of data type", kStringArrayUnit, 48);
        return std::nullopt;
    }
    std::vector<std::string> strings;
    auto rest = textOf(*bytes.asBytes());
    if (rest.empty()) return strings;
    for (auto end = rest.find(kSeparator); end != std::string_view::npos;
         end = rest.find(kSeparator)) {
        strings.emplace_back(rest.substr(0, end));
        rest.remove_prefix(end + 1);
    }
    strings.emplace_back(rest);
    return strings;
}

std::optional<KSValue::Bytes> KSDictionaryTransformer::transformedValue(const KSValue& dictionary) {
    if (dictionary.isNull()) return std::nullopt;
    if (!dictionary.asDictionary()) {
        assertionFailed("Object is not of dictionary type", kDictionaryUnit, 31);
        return std::nullopt;
    }
    const auto text = jsonText(dictionary);
    return text ? std::optional(KSValue::Bytes(text->begin(), text->end())) : std::nullopt;
}

std::optional<KSDictionary> KSDictionaryTransformer::reverseTransformedValue(const KSValue& bytes) {
    if (bytes.isNull()) return std::nullopt;
    if (!bytes.asBytes()) {
        assertionFailed("Object is not of data type", kDictionaryUnit, 54);
        return std::nullopt;
    }
    const auto parsed = parseJson(textOf(*bytes.asBytes()));
    if (!parsed || !parsed->asDictionary()) return std::nullopt;
    return *parsed->asDictionary();
}

}  // namespace keepsakes
