// SPDX-License-Identifier: Apache-2.0
#include "model/KSConduitContext.h"

#include <cerrno>

#include "core/Json.h"
#include "core/KSAssertion.h"

namespace keepsakes {

namespace {

constexpr std::string_view kProcessName = "ProcessName";

}  // namespace

KSConduitContext KSConduitContext::init() {
    KSConduitContext context;
    context.configuration_.emplace(kProcessName, program_invocation_short_name);
    return context;
}

std::optional<std::string> KSConduitContext::conduitProcessName() const {
    const auto* name = valueForKey(configuration_, kProcessName).asString();
    return name ? std::optional(*name) : std::nullopt;
}

void KSConduitContext::encodeWithCoder(KeyedEncoder& encoder) const {
    coding::write(encoder, kProcessName, conduitProcessName());
}

bool KSConduitContext::initWithCoder(KeyedDecoder& decoder, KSConduitContext& context) {
    context.configuration_.clear();
    return decoder.readRecord([&context](std::string_view key, KeyedDecoder& in) {
        if (key != kProcessName) return in.skip();
        std::string name;
        if (!in.readString(name)) return false;
        context.configuration_.insert_or_assign(std::string(kProcessName), std::move(name));
        return true;
    });
}

std::optional<KSValue::Bytes> KSConduitContext::encodeDictionary(const KSValue& value) {
    const bool good =
        assertParameter(!value.isNull(), "value", kUnit, __LINE__) &&
        assertParameter(value.asDictionary() != nullptr, "value is a dictionary", kUnit, __LINE__);
    if (!good) return std::nullopt;
    const auto text = jsonText(value);
    return text ? std::optional(KSValue::Bytes(text->begin(), text->end())) : std::nullopt;
}

KSValue KSConduitContext::decodeToDictionary(const KSValue& data) {
    if (data.isNull()) return {};
    const auto* bytes = data.asBytes();
    if (!bytes) {
        assertionFailed("Object is not of data type", kUnit, __LINE__);
        return {};
    }
    return parseJson({reinterpret_cast<const char*>(bytes->data()), bytes->size()})
        .value_or(KSValue());
}

}  // namespace keepsakes
