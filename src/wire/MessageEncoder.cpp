// SPDX-License-Identifier: Apache-2.0
#include "wire/MessageEncoder.h"

#include <systemd/sd-bus.h>

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstring>

#include "core/Json.h"
#include "core/Text.h"
#include "wire/BusNames.h"

namespace keepsakes {

namespace {

std::size_t alignmentOf(char type) {
    switch (type) {
        case 'x':
        case 't':
        case 'd':
        case '(':
        case '{':
            return 8;
        case 'y':
        case 'g':
        case 'v':
            return 1;
        default:
            return 4;
    }
}

bool allOf(const KSArray& array, bool (*holds)(const KSValue&)) {
    return !array.empty() && std::ranges::all_of(array, holds);
}

/// The type by which a value is sent; nothing for null.
struct TypeOf {
    const char* operator()(std::monostate) const { return nullptr; }
    const char* operator()(bool) const { return "b"; }
    const char* operator()(std::int64_t) const { return "x"; }
    const char* operator()(double) const { return "d"; }
    const char* operator()(const std::string&) const { return "s"; }
    const char* operator()(const KSValue::Bytes&) const { return "ay"; }
    const char* operator()(KSDate date) const {
        return std::isfinite(date.seconds) ? "d" : nullptr;
    }
    const char* operator()(const KSUUID&) const { return "s"; }
    const char* operator()(const KSArray& array) const {
        if (allOf(array, [](const KSValue& item) { return item.asString() != nullptr; })) {
            return "as";
        }
        if (allOf(array, [](const KSValue& item) { return item.asDictionary() != nullptr; })) {
            return "aa{sv}";
        }
        return "av";
    }
    const char* operator()(const KSDictionary&) const { return "a{sv}"; }
};

const char* typeOf(const KSValue& value, std::size_t depth) {
    const bool container = value.asArray() || value.asDictionary();
    return container && depth >= bus::kDeepestValue ? "s" : value.visit(TypeOf{});
}

}  // namespace

/// Writes the inside of a variant whose type is the value's own.
struct ValueWriter {
    MessageEncoder& out;
    std::size_t depth;  ///< Of the containers around the value.

    void operator()(std::monostate) const {}
    void operator()(bool value) const {
        const int wide = value;
        out.fixed('b', &wide, sizeof wide);
    }
    void operator()(std::int64_t value) const { out.fixed('x', &value, sizeof value); }
    void operator()(double value) const { out.number(value); }
    void operator()(const std::string& value) const { out.text(value); }
    void operator()(const KSValue::Bytes& value) const { out.bytes(value.data(), value.size()); }
    void operator()(KSDate value) const { out.number(value.seconds); }
    void operator()(const KSUUID& value) const { out.text(value.string()); }
    void operator()(const KSDictionary& value) const {
        if (depth >= bus::kDeepestValue) return out.text(jsonText(value).value_or("{}"));
        out.dictionary(value, depth + 1);
    }
    void operator()(const KSArray& value) const {
        if (depth >= bus::kDeepestValue) return out.text(jsonText(value).value_or("[]"));
        const char* const elementType = TypeOf{}(value) + 1;
        const std::string_view element = elementType;
        out.open('a', elementType);
        for (const auto& item : value) {
            if (element != "v") {
                item.visit(ValueWriter{out, depth + 1});
            } else if (const char* own = typeOf(item, depth + 1)) {
                out.open('v', own);
                item.visit(ValueWriter{out, depth + 1});
                out.close();
            }
        }
        out.close();
    }
};

void MessageEncoder::check(int result) {
    if (result < 0 && status_ >= 0) status_ = result;
}

bool MessageEncoder::tooLarge() const {
    return status_ == -E2BIG || status_ == -EMSGSIZE || status_ == -ENOBUFS;
}

// The library sends whatever fits its own bounds, and the bus then ends the connection of who sent
// too much: the body is measured here, by the marshalling rules, before anything is appended.
void MessageEncoder::account(std::size_t alignment, std::size_t bytes) {
    size_ = ((size_ + alignment - 1) & ~(alignment - 1)) + bytes;
    if (size_ > bus::kLargestArray) check(-E2BIG);
}

void MessageEncoder::open(char type, const char* contents) {
    switch (type) {
        case 'v':
            account(1, std::strlen(contents) + 2);
            break;
        case 'a':
            account(4, 4);
            account(alignmentOf(*contents), 0);
            break;
        default:
            account(8, 0);
    }
    if (ok()) check(sd_bus_message_open_container(message_, type, contents));
}

void MessageEncoder::close() {
    if (ok()) check(sd_bus_message_close_container(message_));
}

void MessageEncoder::fixed(char type, const void* value, std::size_t width) {
    account(width, width);
    if (ok()) check(sd_bus_message_append_basic(message_, type, value));
}

void MessageEncoder::text(std::string_view value) {
    if (!isPlainUtf8(value)) return text(plainUtf8(value));
    account(4, 4 + value.size() + 1);
    if (!ok()) return;
    char* space = nullptr;
    check(sd_bus_message_append_string_space(message_, value.size(), &space));
    if (ok()) std::ranges::copy(value, space);
}

void MessageEncoder::bytes(const void* data, std::size_t size) {
    account(4, 4 + size);
    if (ok()) check(sd_bus_message_append_array(message_, 'y', data, size));
}

void MessageEncoder::pair(double first, double second) {
    open('r', "dd");
    number(first);
    number(second);
    close();
}

template <class Write>
void MessageEncoder::entry(std::string_view key, const char* type, const Write& write) {
    open('e', "sv");
    text(key);
    open('v', type);
    write();
    close();
    close();
}

void MessageEncoder::dictionary(const KSDictionary& value, std::size_t depth) {
    open('a', "{sv}");
    for (const auto& [key, item] : value) {
        if (const char* type = typeOf(item, depth)) {
            entry(key, type, [this, depth, &present = item] {
                present.visit(ValueWriter{*this, depth});
            });
        }
    }
    close();
}

void MessageEncoder::appendRecord(const WriteRecord& write) {
    open('a', "{sv}");
    write(*this);
    close();
}

void MessageEncoder::beginRecords() { open('a', "a{sv}"); }
void MessageEncoder::endRecords() { close(); }

void MessageEncoder::writeBool(std::string_view key, bool value) {
    entry(key, "b", [&] { ValueWriter{*this, 0}(value); });
}
void MessageEncoder::writeUnsigned(std::string_view key, std::uint64_t value) {
    entry(key, "t", [&] { fixed('t', &value, sizeof value); });
}
void MessageEncoder::writeNumber(std::string_view key, double value) {
    entry(key, "d", [&] { number(value); });
}
void MessageEncoder::writeString(std::string_view key, std::string_view value) {
    entry(key, "s", [&] { text(value); });
}
void MessageEncoder::writeStrings(std::string_view key, const std::vector<std::string>& value) {
    entry(key, "as", [&] {
        open('a', "s");
        for (const auto& item : value) text(item);
        close();
    });
}
void MessageEncoder::writeUUID(std::string_view key, const KSUUID& value) {
    entry(key, "s", [&] { text(value.string()); });
}
void MessageEncoder::writeDate(std::string_view key, KSDate value) {
    if (std::isfinite(value.seconds)) writeNumber(key, value.seconds);
}
void MessageEncoder::writeInterval(std::string_view key, const KSDateInterval& value) {
    if (!std::isfinite(value.start.seconds) || !std::isfinite(value.end.seconds)) return;
    entry(key, "(dd)", [&] { pair(value.start.seconds, value.end.seconds); });
}
void MessageEncoder::writeLocation(std::string_view key, double latitude, double longitude) {
    if (!std::isfinite(latitude) || !std::isfinite(longitude)) return;
    entry(key, "(dd)", [&] { pair(latitude, longitude); });
}
void MessageEncoder::writeJson(std::string_view key, const KSDictionary& value) {
    if (const auto json = jsonText(value)) {
        entry(key, "ay", [&] { bytes(json->data(), json->size()); });
    }
}
void MessageEncoder::writeDictionary(std::string_view key, const KSDictionary& value) {
    entry(key, "a{sv}", [&] { dictionary(value, 1); });
}
void MessageEncoder::writeDictionaries(std::string_view key,
                                       const std::vector<KSDictionary>& value) {
    entry(key, "aa{sv}", [&] {
        open('a', "a{sv}");
        for (const auto& item : value) dictionary(item, 2);
        close();
    });
}
void MessageEncoder::writeRecord(std::string_view key, const WriteRecord& write) {
    entry(key, "a{sv}", [&] { appendRecord(write); });
}
void MessageEncoder::writeRecords(std::string_view key, std::size_t count,
                                  const std::function<void(std::size_t, KeyedEncoder&)>& write) {
    entry(key, "aa{sv}", [&] {
        open('a', "a{sv}");
        for (std::size_t index = 0; index < count && ok(); ++index) {
            open('a', "{sv}");
            write(index, *this);
            close();
        }
        close();
    });
}

}  // namespace keepsakes
