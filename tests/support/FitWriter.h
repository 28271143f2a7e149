// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "core/KSDate.h"

namespace keepsakes {

/// Writes FIT files (developer.garmin.com/fit/protocol), message by message.
class FitWriter {
  public:
    enum class Type : std::uint8_t {
        enumeration = 0x00,
        uint8 = 0x02,
        uint16 = 0x84,
        sint32 = 0x85,
        uint32 = 0x86,
    };
    struct Field {
        std::uint8_t number;
        Type type;
    };
    using Value = std::optional<std::int64_t>;  ///< Nothing is written as the type's invalid value.

    explicit FitWriter(bool bigEndian = false) : bigEndian_(bigEndian) {}

    FitWriter& define(unsigned local, std::uint16_t message, std::vector<Field> fields,
                      std::uint8_t developerBytes = 0);
    FitWriter& data(unsigned local, const std::vector<Value>& values);
    /// With the lowest five bits of the time in the record's first byte.
    FitWriter& compressed(unsigned local, KSDate time, const std::vector<Value>& values);

    /// A file_id message of that type (4 is an activity), on local message 0.
    FitWriter& fileId(std::int64_t type = 4);
    /// A record message (time, latitude, longitude in degrees), on local message 1.
    FitWriter& record(KSDate time, double latitude, double longitude);
    /// A session message, on local message 2.
    FitWriter& session(KSDate start, KSDate end, std::int64_t sport, std::int64_t subSport = 0);
    /// The activity message that ends a recording, on local message 3.
    FitWriter& activity(KSDate time, int offsetSeconds = 0);

    const std::string& messages() const { return messages_; }

    /// Header, messages and checksum.
    std::string file(std::size_t headerSize = 14) const;

    /// A FIT file of these messages.
    static std::string fileOf(const std::string& messages, std::size_t headerSize = 14);

    static std::int64_t timestamp(KSDate date);
    static std::int64_t semicircles(double degrees);

  private:
    struct Definition {
        std::vector<Field> fields;
        std::uint8_t developerBytes = 0;
    };

    void put(std::uint64_t value, std::size_t bytes);
    void putValues(const Definition& definition, const std::vector<Value>& values);

    bool bigEndian_;
    std::string messages_;
    std::vector<Definition> definitions_{16};
};

}  // namespace keepsakes
