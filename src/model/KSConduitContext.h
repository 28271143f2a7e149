// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "core/KSValue.h"
#include "model/KeyedCoding.h"

namespace keepsakes {

/// Who is calling: made in the calling process, sent with every request. A plain value.
class KSConduitContext final {
  public:
    /// For the current process, under its name.
    static KSConduitContext init();

    /// The caller's process name, when the context holds one.
    std::optional<std::string> conduitProcessName() const;

    void encodeWithCoder(KeyedEncoder& encoder) const;
    /// Holds what the archive holds, and nothing of the decoding process.
    static bool initWithCoder(KeyedDecoder& decoder, KSConduitContext& context);

    /// JSON text of a dictionary; another kind or nothing fails an assertion and yields nothing.
    static std::optional<KSValue::Bytes> encodeDictionary(const KSValue& value);
    /// The reverse; nothing yields nothing, a value that is not bytes fails an assertion.
    static KSValue decodeToDictionary(const KSValue& data);

  private:
    static constexpr std::string_view kUnit = "KSConduitContext";

    KSDictionary configuration_;
};

}  // namespace keepsakes
