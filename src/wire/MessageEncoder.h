// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "model/KeyedCoding.h"

struct sd_bus_message;

namespace keepsakes {

/// Keyed coding straight into the body of a D-Bus message: a record is an a{sv} whose keys are its
/// coding keys. Text that is not UTF-8 is sent with U+FFFD in place of what is wrong; dates and
/// locations that are not finite, and null, are left out; values nested deeper than
/// `bus::kDeepestValue` are sent as their JSON text.
///
/// Lives on the thread of the message's connection; the message outlives it. After a failure it
/// writes nothing more: ask `ok` at the end. `tooLarge` tells that the body would exceed what the
/// bus carries (D-Bus Specification, "Message Protocol": 64 MiB an array).
class MessageEncoder final : public KeyedEncoder {
  public:
    explicit MessageEncoder(sd_bus_message* message) : message_(message) {}

    /// Appends one a{sv}.
    void appendRecord(const WriteRecord& write);
    void appendDictionary(const KSDictionary& value) { dictionary(value, 1); }

    /// Append an aa{sv} record by record, so that long replies can be made in slices.
    void beginRecords();
    void endRecords();

    bool ok() const { return status_ >= 0; }
    bool tooLarge() const;
    /// A negative errno after a failure, else 0.
    int status() const { return status_; }
    /// Bytes of the body so far.
    std::size_t size() const { return size_; }

    void writeBool(std::string_view key, bool value) override;
    void writeUnsigned(std::string_view key, std::uint64_t value) override;
    void writeNumber(std::string_view key, double value) override;
    void writeString(std::string_view key, std::string_view value) override;
    void writeStrings(std::string_view key, const std::vector<std::string>& value) override;
    void writeUUID(std::string_view key, const KSUUID& value) override;
    void writeDate(std::string_view key, KSDate value) override;
    void writeInterval(std::string_view key, const KSDateInterval& value) override;
    void writeLocation(std::string_view key, double latitude, double longitude) override;
    void writeJson(std::string_view key, const KSDictionary& value) override;
    void writeDictionary(std::string_view key, const KSDictionary& value) override;
    void writeDictionaries(std::string_view key, const std::vector<KSDictionary>& value) override;
    void writeRecord(std::string_view key, const WriteRecord& write) override;
    void writeRecords(std::string_view key, std::size_t count,
                      const std::function<void(std::size_t, KeyedEncoder&)>& write) override;

  private:
    friend struct ValueWriter;

    void check(int result);
    void account(std::size_t alignment, std::size_t bytes);
    void open(char type, const char* contents);
    void close();
    void fixed(char type, const void* value, std::size_t width);
    void number(double value) { fixed('d', &value, sizeof value); }
    void text(std::string_view value);
    void bytes(const void* data, std::size_t size);
    void pair(double first, double second);
    void dictionary(const KSDictionary& value, std::size_t depth);
    template <class Write>
    void entry(std::string_view key, const char* type, const Write& write);

    sd_bus_message* message_;
    std::size_t size_ = 0;  ///< Of the body so far, padding included.
    int status_ = 0;
};

}  // namespace keepsakes
