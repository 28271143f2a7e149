// SPDX-License-Identifier: Apache-2.0
#include "model/KSEventFetchOptions.h"

#include <array>

#include "model/FetchOptionParts.h"

namespace keepsakes {

namespace {

using Options = KSEventFetchOptions;

constexpr auto kFields = std::to_array<KeyedField<Options>>({
    coding::field<&Options::ascending>("ascending"),
    coding::field<&Options::dateInterval>("dateInterval"),
    {"limit",
     [](KeyedEncoder& out, std::string_view key, const Options& options) {
         coding::write(out, key, options.limit);
     },
     [](KeyedDecoder& in, Options& options) { return readLimit(in, options.limit); }},
    {"category",
     [](KeyedEncoder& out, std::string_view key, const Options& options) {
         out.writeUnsigned(key, static_cast<std::uint64_t>(options.category));
     },
     [](KeyedDecoder& in, Options& options) {
         std::uint64_t category = 0;
         if (!in.readUnsigned(category)) return false;
         options.category = static_cast<KSEventCategory>(category);
         return true;
     }},
});

}  // namespace

std::size_t KSEventFetchOptions::hash() const {
    return std::hash<bool>{}(ascending) ^ hashOf(dateInterval) ^ hashOf(limit) ^
           std::hash<std::uint64_t>{}(static_cast<std::uint64_t>(category));
}

std::string KSEventFetchOptions::description() const {
    return fmt::format("ascending, {},  {}, category, {}, limit, {}", ascending ? "YES" : "NO",
                       describeBounds(dateInterval), static_cast<std::uint64_t>(category),
                       describeLimit(limit));
}

void KSEventFetchOptions::encodeWithCoder(KeyedEncoder& encoder) const {
    encodeFields<Options>(encoder, *this, kFields);
}

bool KSEventFetchOptions::initWithCoder(KeyedDecoder& decoder, KSEventFetchOptions& options) {
    static const KeyedFieldIndex<Options> index{std::span<const KeyedField<Options>>(kFields)};
    return decoder.readRecord([&options](std::string_view key, KeyedDecoder& in) {
        return index.read(key, in, options);
    });
}

}  // namespace keepsakes
