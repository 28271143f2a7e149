// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>
#include <expected>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "core/KSDate.h"
#include "readers/XmlStream.h"

namespace keepsakes {

// The container of FIT files (FIT protocol 2.0, developer.garmin.com/fit/protocol): messages of
// fields whose lengths and types the file itself defines. What messages mean is not known here.

/// Whether a FIT file begins with these bytes.
bool isFitHeader(std::string_view head);

struct FitFieldDefinition {
    std::uint8_t number = 0;
    std::uint8_t size = 0;  ///< Bytes.
    std::uint8_t type = 0;  ///< The protocol's base type.
};

struct FitDefinition {
    std::uint16_t message = 0;  ///< The global number of the message.
    bool bigEndian = false;
    std::vector<FitFieldDefinition> fields;
    std::size_t fieldBytes = 0;
    std::size_t developerBytes = 0;  ///< Behind the fields; they mean what their developer says.
};

/// One message; valid during the call that passes it.
class FitMessage {
  public:
    FitMessage(const FitDefinition& definition, std::span<const std::uint8_t> bytes,
               std::optional<std::uint32_t> compressedTime)
        : definition_(definition), bytes_(bytes), compressedTime_(compressedTime) {}

    std::uint16_t number() const { return definition_.message; }

    /// A field that is one integer; nothing when it is absent, marked as invalid, text, a fraction
    /// or several values.
    std::optional<std::int64_t> integer(std::uint8_t field) const;

    /// A field of seconds since 1989-12-31; nothing for seconds since the device was turned on,
    /// which smaller numbers are.
    std::optional<KSDate> date(std::uint8_t field) const;

    /// When the message was written: its timestamp, full or compressed.
    std::optional<KSDate> time() const;

    /// The timestamp as it stands, which later compressed ones count from.
    std::optional<std::uint32_t> rawTime() const;

  private:
    const FitDefinition& definition_;
    std::span<const std::uint8_t> bytes_;
    std::optional<std::uint32_t> compressedTime_;
};

/// Is told what a file holds. Several FIT files may stand behind one another in one.
class FitHandler {
  public:
    virtual ~FitHandler() = default;
    virtual void startFile() = 0;
    virtual void message(const FitMessage& message) = 0;
    virtual void endFile() = 0;
    /// Whether the messages so far end the recording, so that its checksum must be right.
    virtual bool isClosed() const = 0;
};

/// Reads a file in flat memory. A recording that ends early (at the end of the bytes, within a
/// message, or without what closes it) is read up to there: devices leave such files when their
/// power goes. Answers an error, with the byte, for what is no FIT file, for data of an undefined
/// message and for a closed recording whose checksum is wrong; the handler has then seen a part.
std::expected<void, std::string> readFitMessages(const ReadBlock& read, FitHandler& handler);

}  // namespace keepsakes
