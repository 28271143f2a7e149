// SPDX-License-Identifier: Apache-2.0
#include "model/KSEventBundleFetchOptions.h"

#include <array>

#include "model/FetchOptionParts.h"

namespace keepsakes {

namespace {

using Options = KSEventBundleFetchOptions;

constexpr auto kFields = std::to_array<KeyedField<Options>>({
    coding::field<&Options::ascending>("ascending"),
    coding::field<&Options::dateInterval>("dateInterval"),
    {"limit",
     [](KeyedEncoder& out, std::string_view key, const Options& options) {
         coding::write(out, key, options.limit);
     },
     [](KeyedDecoder& in, Options& options) { return readLimit(in, options.limit); }},
    coding::field<&Options::filterBundle>("filterBundle"),
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
    encodeFields<Options>(encoder, *this, kFields);
}

bool KSEventBundleFetchOptions::initWithCoder(KeyedDecoder& decoder,
                                              KSEventBundleFetchOptions& options) {
    static const KeyedFieldIndex<Options> index{std::span<const KeyedField<Options>>(kFields)};
    return decoder.readRecord([&options](std::string_view key, KeyedDecoder& in) {
        return index.read(key, in, options);
    });
}

}  // namespace keepsakes
