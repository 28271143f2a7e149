// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <string>
#include <vector>

#include "core/KSValue.h"
#include "model/KeyedCoding.h"

namespace keepsakes {

/// Keyed coding into a dictionary. Locations and intervals are arrays of two numbers or dates;
/// dictionaries that travel as JSON text stay dictionaries.
class ValueEncoder final : public KeyedEncoder {
  public:
    KSDictionary take() { return std::move(dictionary_); }

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
    void put(std::string_view key, KSValue value);

    KSDictionary dictionary_;
};

/// Keyed coding out of a value made by `ValueEncoder` or read from JSON: identifiers may be
/// strings, dates numbers, and a JSON dictionary may also stand as its text or bytes.
class ValueDecoder final : public KeyedDecoder {
  public:
    explicit ValueDecoder(const KSValue& value);

    bool readBool(bool& value) override;
    bool readUnsigned(std::uint64_t& value) override;
    bool readNumber(double& value) override;
    bool readString(std::string& value) override;
    bool readStrings(std::vector<std::string>& value) override;
    bool readUUID(KSUUID& value) override;
    bool readDate(KSDate& value) override;
    bool readInterval(KSDateInterval& value) override;
    bool readLocation(double& latitude, double& longitude) override;
    bool readJson(KSDictionary& value) override;
    bool readDictionary(KSDictionary& value) override;
    bool readDictionaries(std::vector<KSDictionary>& value) override;
    bool readRecord(const ReadField& field) override;
    bool readRecords(const std::function<bool(KeyedDecoder&)>& element) override;
    bool skip() override { return true; }
    bool fail(std::string_view reason) override;
    const std::string& error() const override { return error_; }

  private:
    template <class Read>
    bool readNested(const KSValue& value, std::string_view step, const Read& read);

    const KSValue* value_;
    std::string path_;
    std::string error_;
};

}  // namespace keepsakes
