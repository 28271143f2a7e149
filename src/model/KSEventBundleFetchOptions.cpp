// SPDX-License-Identifier: Apache-2.0
#include "model/KSEventBundleFetchOptions.h"

#include <array>

#include "model/FetchOptionParts.h"

namespace keepsakes {

namespace {

constexpr auto kBundleOptionFields = std::to_array<KeyedField<KSEventBundleFetchOptions>>({
    coding::field<&KSEventBundleFetchOptions::ascending>("ascending"),
    coding::field<&KSEventBundleFetchOptions::dateInterval>("dateInterval"),
    {"limit",
     [](KeyedEncoder& out, std::string_view key, const KSEventBundleFetchOptions& options) {
         coding::write(out, key, options.limit);
     },
     [](KeyedDecoder& in, KSEventBundleFetchOptions& options) {
         return readLimit(in, options.limit);
     }},
    coding::field<&KSEventBundleFetchOptions::filterBundle>("filterBundle"),
});

}  // namespace

std::size_t KSEventBundleFetchOptions::hash() const {
    return std::hash<bool>{}(ascending) ^ hashOf(dateInterval) ^ hashOf(limit) ^
           (std::hash<bool>{}(filterBundle) << 1);
}

std::string KSEventBundleFetchOptions::description() const {
    return fmt::format("ascending, {},  {}, limit, {}, filterBundle, {},", ascending ? "YES" : "NO",
                       describeBounds(dateInterval), describeLimit(limit),
                       filterBundle ? "YES" : "NO");
}

void KSEventBundleFetchOptions::encodeWithCoder(KeyedEncoder& encoder) const {
    encodeFields<KSEventBundleFetchOptions>(encoder, *this, kBundleOptionFields);
}

bool KSEventBundleFetchOptions::initWithCoder(KeyedDecoder& decoder,
                                              KSEventBundleFetchOptions& options) {
    static const KeyedFieldIndex<KSEventBundleFetchOptions> index{
        std::span<const KeyedField<KSEventBundleFetchOptions>>(kBundleOptionFields)};
    return decoder.readRecord([&options](std::string_view key, KeyedDecoder& in) {
        return index.read(key, in, options);
    });
}

}  // namespace keepsakes
