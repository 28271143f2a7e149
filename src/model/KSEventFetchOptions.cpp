// SPDX-License-Identifier: Apache-2.0
#include "model/KSEventFetchOptions.h"

#include <array>

#include "model/FetchOptionParts.h"

namespace keepsakes {

namespace {

constexpr auto kEventOptionFields = std::to_array<KeyedField<KSEventFetchOptions>>({
    coding::field<&KSEventFetchOptions::ascending>("ascending"),
    coding::field<&KSEventFetchOptions::dateInterval>("dateInterval"),
    {"limit",
     [](KeyedEncoder& out, std::string_view key, const KSEventFetchOptions& options) {
         coding::write(out, key, options.limit);
     },
     [](KeyedDecoder& in, KSEventFetchOptions& options) { return readLimit(in, options.limit); }},
    {"category",
     [](KeyedEncoder& out, std::string_view key, const KSEventFetchOptions& options) {
         out.writeUnsigned(key, static_cast<std::uint64_t>(options.category));
     },
     [](KeyedDecoder& in, KSEventFetchOptions& options) {
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
    encodeFields<KSEventFetchOptions>(encoder, *this, kEventOptionFields);
}

bool KSEventFetchOptions::initWithCoder(KeyedDecoder& decoder, KSEventFetchOptions& options) {
    static const KeyedFieldIndex<KSEventFetchOptions> index{
        std::span<const KeyedField<KSEventFetchOptions>>(kEventOptionFields)};
    return decoder.readRecord([&options](std::string_view key, KeyedDecoder& in) {
        return index.read(key, in, options);
    });
}

}  // namespace keepsakes
