// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <algorithm>
#include <cstdint>
#include <functional>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "core/KSDate.h"
#include "core/KSUUID.h"
#include "core/KSValue.h"

namespace keepsakes {

/// Keyed coding: a record writes its fields under their names and reads them back in any order.
/// The formats (a D-Bus message, a dictionary) implement these two interfaces; records know no
/// format. Used by one thread at a time. Neither side owns the record.
class KeyedEncoder {
  public:
    virtual ~KeyedEncoder() = default;

    virtual void writeBool(std::string_view key, bool value) = 0;
    virtual void writeUnsigned(std::string_view key, std::uint64_t value) = 0;
    virtual void writeNumber(std::string_view key, double value) = 0;
    virtual void writeString(std::string_view key, std::string_view value) = 0;
    virtual void writeStrings(std::string_view key, const std::vector<std::string>& value) = 0;
    virtual void writeUUID(std::string_view key, const KSUUID& value) = 0;
    virtual void writeDate(std::string_view key, KSDate value) = 0;
    virtual void writeInterval(std::string_view key, const KSDateInterval& value) = 0;
    /// Latitude and longitude in degrees.
    virtual void writeLocation(std::string_view key, double latitude, double longitude) = 0;
    /// A dictionary that travels as JSON text.
    virtual void writeJson(std::string_view key, const KSDictionary& value) = 0;
    /// A record whose fields the system does not name.
    virtual void writeDictionary(std::string_view key, const KSDictionary& value) = 0;
    virtual void writeDictionaries(std::string_view key,
                                   const std::vector<KSDictionary>& value) = 0;

    using WriteRecord = std::function<void(KeyedEncoder&)>;
    virtual void writeRecord(std::string_view key, const WriteRecord& write) = 0;
    /// An array of `count` records; `write` is called with each index in turn.
    virtual void writeRecords(
        std::string_view key, std::size_t count,
        const std::function<void(std::size_t index, KeyedEncoder&)>& write) = 0;
};

/// Stands on one value of an archive. Each reader takes the value and answers whether it was of
/// the kind asked for; when not, `error` says what stood where, and the archive is given up.
/// Strict about kinds, lenient about widths: any integer is an integer, any number a number.
/// Dates that are not finite are refused.
class KeyedDecoder {
  public:
    virtual ~KeyedDecoder() = default;

    virtual bool readBool(bool& value) = 0;
    virtual bool readUnsigned(std::uint64_t& value) = 0;
    virtual bool readNumber(double& value) = 0;
    virtual bool readString(std::string& value) = 0;
    virtual bool readStrings(std::vector<std::string>& value) = 0;
    virtual bool readUUID(KSUUID& value) = 0;
    virtual bool readDate(KSDate& value) = 0;
    virtual bool readInterval(KSDateInterval& value) = 0;
    virtual bool readLocation(double& latitude, double& longitude) = 0;
    virtual bool readJson(KSDictionary& value) = 0;
    virtual bool readDictionary(KSDictionary& value) = 0;
    virtual bool readDictionaries(std::vector<KSDictionary>& value) = 0;

    /// Calls `field` for each entry of the record that this stands on, in its own order; `field`
    /// reads the value or calls `skip`, and its false ends the reading.
    using ReadField = std::function<bool(std::string_view key, KeyedDecoder&)>;
    virtual bool readRecord(const ReadField& field) = 0;
    /// Calls `element` for each record of the array that this stands on.
    virtual bool readRecords(const std::function<bool(KeyedDecoder&)>& element) = 0;

    virtual bool skip() = 0;

    /// Gives the archive up with this reason; answers false.
    virtual bool fail(std::string_view reason) = 0;

    /// "<where>: <reason>" of the first failure; empty when there is none.
    virtual const std::string& error() const = 0;
};

/// One coded field of a record: its key, and how it is written (when present) and read.
template <class Record>
struct KeyedField {
    std::string_view key;
    void (*write)(KeyedEncoder&, std::string_view key, const Record&);
    bool (*read)(KeyedDecoder&, Record&);
};

/// Writes the fields in the table's order.
template <class Record>
void encodeFields(KeyedEncoder& encoder, const Record& record,
                  std::span<const KeyedField<Record>> fields) {
    for (const auto& field : fields) field.write(encoder, field.key, record);
}

/// The fields of a table, found by key.
template <class Record>
class KeyedFieldIndex {
  public:
    explicit KeyedFieldIndex(std::span<const KeyedField<Record>> fields)
        : sorted_(fields.begin(), fields.end()) {
        std::ranges::sort(sorted_, {}, &KeyedField<Record>::key);
    }

    bool holds(std::string_view key) const { return find(key) != nullptr; }

    /// Reads one entry into the record; a key that the record does not know is passed over.
    bool read(std::string_view key, KeyedDecoder& decoder, Record& record) const {
        const auto* found = find(key);
        return found ? found->read(decoder, record) : decoder.skip();
    }

  private:
    const KeyedField<Record>* find(std::string_view key) const {
        const auto found = std::ranges::lower_bound(sorted_, key, {}, &KeyedField<Record>::key);
        return found == sorted_.end() || found->key != key ? nullptr : &*found;
    }

    std::vector<KeyedField<Record>> sorted_;
};

/// How values of a type are written and read; the tables of records are made of these.
namespace coding {

inline void write(KeyedEncoder& out, std::string_view key, bool value) {
    out.writeBool(key, value);
}
inline void write(KeyedEncoder& out, std::string_view key, std::uint64_t value) {
    out.writeUnsigned(key, value);
}
inline void write(KeyedEncoder& out, std::string_view key, double value) {
    out.writeNumber(key, value);
}
inline void write(KeyedEncoder& out, std::string_view key, const std::string& value) {
    out.writeString(key, value);
}
inline void write(KeyedEncoder& out, std::string_view key, const std::vector<std::string>& value) {
    out.writeStrings(key, value);
}
inline void write(KeyedEncoder& out, std::string_view key, const KSUUID& value) {
    out.writeUUID(key, value);
}
inline void write(KeyedEncoder& out, std::string_view key, KSDate value) {
    out.writeDate(key, value);
}
inline void write(KeyedEncoder& out, std::string_view key, const KSDateInterval& value) {
    out.writeInterval(key, value);
}
template <class T>
void write(KeyedEncoder& out, std::string_view key, const std::optional<T>& value) {
    if (value) write(out, key, *value);
}

inline bool read(KeyedDecoder& in, bool& value) { return in.readBool(value); }
inline bool read(KeyedDecoder& in, std::uint64_t& value) { return in.readUnsigned(value); }
inline bool read(KeyedDecoder& in, double& value) { return in.readNumber(value); }
inline bool read(KeyedDecoder& in, std::string& value) { return in.readString(value); }
inline bool read(KeyedDecoder& in, std::vector<std::string>& value) {
    return in.readStrings(value);
}
inline bool read(KeyedDecoder& in, KSUUID& value) { return in.readUUID(value); }
inline bool read(KeyedDecoder& in, KSDate& value) { return in.readDate(value); }
inline bool read(KeyedDecoder& in, KSDateInterval& value) { return in.readInterval(value); }
template <class T>
bool read(KeyedDecoder& in, std::optional<T>& value) {
    return read(in, value.emplace());
}

template <auto Member>
struct MemberOf;
template <class R, class V, V R::*Member>
struct MemberOf<Member> {
    using Record = R;
};

/// A field that is a data member of the record.
template <auto Member>
constexpr auto field(std::string_view key) {
    using Record = typename MemberOf<Member>::Record;
    return KeyedField<Record>{
        key,
        [](KeyedEncoder& out, std::string_view name, const Record& record) {
            write(out, name, record.*Member);
        },
        [](KeyedDecoder& in, Record& record) { return read(in, record.*Member); }};
}

}  // namespace coding

}  // namespace keepsakes
