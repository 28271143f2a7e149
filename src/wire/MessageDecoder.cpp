// SPDX-License-Identifier: Apache-2.0
#include "wire/MessageDecoder.h"

#include <fmt/format.h>
#include <systemd/sd-bus.h>

#include <cerrno>
#include <cmath>
#include <cstring>
#include <system_error>

#include "core/Json.h"
#include "wire/BusNames.h"

namespace keepsakes {

namespace {

// What the pieces of an archive take in memory, roughly, beside their own bytes.
constexpr std::size_t kRecordCost = 1024;
constexpr std::size_t kValueCost = 64;

constexpr std::string_view kIntegers = "ynqiuxt";
constexpr std::string_view kTrivials = "ynqiuxtbd";

template <class T>
T as(const void* storage) {
    T value;
    std::memcpy(&value, storage, sizeof value);
    return value;
}

}  // namespace

std::string MessageDecoder::place() const {
    std::string text(what_);
    auto step = path_.begin();
    if (step != path_.end() && step->key.empty()) text += fmt::format(" {}", (step++)->index);
    for (std::string_view separator = ": "; step != path_.end(); ++step) {
        if (step->key.empty()) {
            text += fmt::format("[{}]", step->index);
        } else {
            // A key is the sender's text; an error is read by people.
            text += fmt::format("{}{:.100}", separator, step->key);
        }
        separator = ".";
    }
    return text;
}

bool MessageDecoder::fail(std::string_view reason) {
    if (error_.empty()) error_ = fmt::format("{}: {}", place(), reason);
    return false;
}

bool MessageDecoder::failMessage(int result) {
    return fail(
        fmt::format("the message is broken ({})", std::generic_category().message(-result)));
}

bool MessageDecoder::spend(std::size_t bytes) {
    cost_ += bytes;
    return cost_ <= kLargestCost || fail("the call holds too much; send it in parts");
}

bool MessageDecoder::enter(char type, const char* contents) {
    const int result = sd_bus_message_enter_container(message_, type, contents);
    return result > 0 || failMessage(result == 0 ? -ENXIO : result);
}

bool MessageDecoder::exit() {
    const int result = sd_bus_message_exit_container(message_);
    return result >= 0 || failMessage(result);
}

bool MessageDecoder::enterNext(char type, const char* contents, bool& any) {
    const int result = sd_bus_message_enter_container(message_, type, contents);
    any = result > 0;
    return result >= 0 || failMessage(result);
}

// Asking for the type first costs as much as opening, so the likely one is tried.
bool MessageDecoder::open(const char* likely) {
    if (!closed_) return true;
    int result = likely ? sd_bus_message_enter_container(message_, 'v', likely) : -ENXIO;
    if (result == -ENXIO) {
        char type = 0;
        result = sd_bus_message_peek_type(message_, &type, &likely);
        if (result > 0) result = sd_bus_message_enter_container(message_, 'v', likely);
    }
    if (result <= 0) return failMessage(result == 0 ? -ENXIO : result);
    type_ = likely;
    closed_ = false;
    return true;
}

bool MessageDecoder::basic(char type, void* value) {
    const int result = sd_bus_message_read_basic(message_, type, value);
    return result > 0 || failMessage(result == 0 ? -ENXIO : result);
}

bool MessageDecoder::text(const char*& value) {
    return basic(type_[0], static_cast<void*>(&value)) && spend(kValueCost + std::strlen(value));
}

bool MessageDecoder::isNumber(char type) const { return type == 'd' || kIntegers.contains(type); }

// The message stands before its first unread argument.
bool MessageDecoder::stand() {
    if (!type_.empty()) return true;
    char type = 0;
    const char* contents = nullptr;
    const int result = sd_bus_message_peek_type(message_, &type, &contents);
    if (result < 0) return failMessage(result);
    if (result == 0) return fail("is missing");
    const std::string_view inside = contents ? contents : "";
    type_ = type != 'a' ? "" : inside == "{sv}" ? "a{sv}" : inside == "a{sv}" ? "aa{sv}" : "";
    return !type_.empty() || fail("not a record");
}

template <class Read>
bool MessageDecoder::eachEntry(const Read& read) {
    const auto outer = type_;
    const bool variants = outer == "a{sv}";
    const std::string inside(variants ? "sv" : outer.substr(2, outer.size() - 3));
    if (!enter('a', outer.data() + 1)) return false;
    for (bool any = true;;) {
        if (!enterNext('e', inside.c_str(), any)) return false;
        if (!any) break;
        type_ = "s";
        const char* key = nullptr;
        if (!text(key)) return false;
        path_.push_back({key});
        type_ = std::string_view(inside).substr(1);
        closed_ = variants;
        if (!read(std::string_view(key))) return false;
        if (closed_ && !skip()) return false;
        if (variants && !exit()) return false;
        path_.pop_back();
        if (!exit()) return false;
    }
    type_ = outer;
    return exit();
}

template <class Read>
bool MessageDecoder::eachElement(const Read& read) {
    const auto outer = type_;
    if (!enter('a', outer.data() + 1)) return false;
    for (std::size_t index = 0;; ++index) {
        const int ended = sd_bus_message_at_end(message_, 0);
        if (ended < 0) return failMessage(ended);
        if (ended > 0) break;
        type_ = outer.substr(1);
        path_.push_back({{}, index});
        if (!read()) return false;
        path_.pop_back();
    }
    type_ = outer;
    return exit();
}

bool MessageDecoder::readBool(bool& value) {
    if (!open("b")) return false;
    if (!is("b")) return fail("not a boolean");
    int wide = 0;
    if (!basic('b', &wide)) return false;
    value = wide != 0;
    return true;
}

// An unsigned one beyond the signed range comes out wrapped.
bool MessageDecoder::integer(std::int64_t& value) {
    alignas(8) unsigned char storage[8] = {};
    const char type = type_[0];
    if (!basic(type, storage)) return false;
    switch (type) {
        case 'y':
            value = as<std::uint8_t>(storage);
            break;
        case 'n':
            value = as<std::int16_t>(storage);
            break;
        case 'q':
            value = as<std::uint16_t>(storage);
            break;
        case 'i':
            value = as<std::int32_t>(storage);
            break;
        case 'u':
            value = as<std::uint32_t>(storage);
            break;
        default:
            value = as<std::int64_t>(storage);
    }
    return true;
}

bool MessageDecoder::readUnsigned(std::uint64_t& value) {
    if (!open("t")) return false;
    if (type_.size() != 1 || !kIntegers.contains(type_[0])) return fail("not an integer");
    const bool isSigned = !is("t");
    std::int64_t read = 0;
    if (!integer(read)) return false;
    if (isSigned && read < 0) return fail("negative, where a count or code belongs");
    value = static_cast<std::uint64_t>(read);
    return true;
}

bool MessageDecoder::number(char type, double& value) {
    if (type == 'd') return basic('d', &value);
    const auto outer = type_;
    type_ = std::string_view(&kIntegers[kIntegers.find(type)], 1);
    std::int64_t whole = 0;
    if (!integer(whole)) return false;
    value = type == 't' ? static_cast<double>(static_cast<std::uint64_t>(whole))
                        : static_cast<double>(whole);
    type_ = outer;
    return true;
}

bool MessageDecoder::readNumber(double& value) {
    if (!open("d")) return false;
    if (type_.size() != 1 || !isNumber(type_[0])) return fail("not a number");
    return number(type_[0], value);
}

bool MessageDecoder::readString(std::string& value) {
    if (!open("s")) return false;
    if (!is("s")) return fail("not a string");
    const char* read = nullptr;
    if (!text(read)) return false;
    value = read;
    return true;
}

bool MessageDecoder::readStrings(std::vector<std::string>& value) {
    if (!open("as")) return false;
    if (!is("as")) return fail("not an array of strings");
    return eachElement([&] { return readString(value.emplace_back()); });
}

bool MessageDecoder::readUUID(KSUUID& value) {
    if (!open("s")) return false;
    if (!is("s")) return fail("not a UUID");
    const char* read = nullptr;
    if (!text(read)) return false;
    const auto parsed = KSUUID::parse(read);
    if (!parsed) return fail("not a UUID");
    value = *parsed;
    return true;
}

bool MessageDecoder::readDate(KSDate& value) {
    if (!open("d")) return false;
    if (type_.size() != 1 || !isNumber(type_[0])) return fail("not a date");
    if (!number(type_[0], value.seconds)) return false;
    return std::isfinite(value.seconds) || fail("not a finite date");
}

bool MessageDecoder::pair(double& first, double& second) {
    const std::string inside(type_.substr(1, 2));
    return enter('r', inside.c_str()) && number(inside[0], first) && number(inside[1], second) &&
           exit();
}

bool MessageDecoder::readInterval(KSDateInterval& value) {
    if (!open("(dd)")) return false;
    const bool isPair =
        type_.size() == 4 && type_[0] == '(' && isNumber(type_[1]) && isNumber(type_[2]);
    if (!isPair) return fail("not a date interval");
    if (!pair(value.start.seconds, value.end.seconds)) return false;
    return (std::isfinite(value.start.seconds) && std::isfinite(value.end.seconds)) ||
           fail("not a finite date interval");
}

bool MessageDecoder::readLocation(double& latitude, double& longitude) {
    if (!open("(dd)")) return false;
    const bool isPair =
        type_.size() == 4 && type_[0] == '(' && isNumber(type_[1]) && isNumber(type_[2]);
    if (!isPair) return fail("not a location");
    if (!pair(latitude, longitude)) return false;
    return (std::isfinite(latitude) && std::isfinite(longitude)) || fail("not a location");
}

bool MessageDecoder::readJson(KSDictionary& value) {
    if (!open("ay")) return false;
    if (!is("ay")) return fail("not JSON bytes");
    const void* bytes = nullptr;
    std::size_t size = 0;
    const int result = sd_bus_message_read_array(message_, 'y', &bytes, &size);
    if (result < 0) return failMessage(result);
    // The smallest JSON value, of two bytes, is held in about a hundred.
    if (!spend(kValueCost + 50 * size)) return false;
    const auto parsed = parseJson({static_cast<const char*>(bytes), size});
    if (!parsed || !parsed->asDictionary()) return fail("not a JSON object");
    value = *parsed->asDictionary();
    return true;
}

bool MessageDecoder::readDictionary(KSDictionary& value) {
    if (!open("a{sv}")) return false;
    if (!type_.starts_with("a{s")) return fail("not a record");
    return dictionary(value, 1);
}

bool MessageDecoder::readDictionaries(std::vector<KSDictionary>& value) {
    if (!open("aa{sv}")) return false;
    if (!type_.starts_with("aa{s")) return fail("not an array of records");
    return eachElement([&] { return dictionary(value.emplace_back(), 2); });
}

bool MessageDecoder::dictionary(KSDictionary& value, std::size_t depth) {
    if (depth > bus::kDeepestValue) return fail("nested too deeply");
    return spend(kValueCost) && eachEntry([&](std::string_view key) {
               return this->value(value[std::string(key)], depth);
           });
}

bool MessageDecoder::array(KSValue& value, std::size_t depth) {
    if (is("ay")) {
        const void* bytes = nullptr;
        std::size_t size = 0;
        const int result = sd_bus_message_read_array(message_, 'y', &bytes, &size);
        if (result < 0) return failMessage(result);
        const auto* start = static_cast<const std::uint8_t*>(bytes);
        value = KSValue::Bytes(start, start + size);
        return spend(kValueCost + size);
    }
    if (depth >= bus::kDeepestValue) return fail("nested too deeply");
    KSArray items;
    if (!eachElement([&] { return this->value(items.emplace_back(), depth + 1); })) return false;
    value = std::move(items);
    return true;
}

bool MessageDecoder::whole(KSValue& value) {
    if (!kIntegers.contains(type_[0])) return fail("of a kind without meaning");
    std::int64_t read = 0;
    if (!integer(read)) return false;
    const bool tooLarge = is("t") && read < 0;
    value =
        tooLarge ? KSValue(static_cast<double>(static_cast<std::uint64_t>(read))) : KSValue(read);
    return true;
}

bool MessageDecoder::value(KSValue& value, std::size_t depth) {
    if (!open() || !spend(kValueCost)) return false;
    switch (type_[0]) {
        case 'b': {
            bool read = false;
            if (!readBool(read)) return false;
            value = read;
            return true;
        }
        case 'd': {
            double read = 0;
            if (!basic('d', &read)) return false;
            value = read;
            return true;
        }
        case 's':
        case 'o':
        case 'g': {
            const char* read = nullptr;
            if (!text(read)) return false;
            value = read;
            return true;
        }
        case 'v': {
            char type = 0;
            const char* contents = nullptr;
            const int result = sd_bus_message_peek_type(message_, &type, &contents);
            if (result <= 0) return failMessage(result);
            if (depth >= bus::kDeepestValue) return fail("nested too deeply");
            const auto outer = type_;
            if (!enter('v', contents)) return false;
            type_ = contents;
            if (!this->value(value, depth + 1) || !exit()) return false;
            type_ = outer;
            return true;
        }
        case 'a': {
            if (!type_.starts_with("a{s")) return array(value, depth);
            KSDictionary read;
            if (!dictionary(read, depth + 1)) return false;
            value = std::move(read);
            return true;
        }
        default:
            return whole(value);
    }
}

bool MessageDecoder::readRecord(const ReadField& field) {
    if (!stand() || !open("a{sv}")) return false;
    if (!is("a{sv}")) return fail("not a record");
    return eachEntry([&](std::string_view key) { return field(key, *this); });
}

bool MessageDecoder::readRecords(const std::function<bool(KeyedDecoder&)>& element) {
    if (!stand() || !open("aa{sv}")) return false;
    if (!is("aa{sv}")) return fail("not an array of records");
    return eachElement([&] { return spend(kRecordCost) && element(*this); });
}

// The library's own way to skip does not tell how much that was. The bus bounds the nesting.
bool MessageDecoder::skip() {
    if (!open()) return false;
    const char type = type_[0];
    if (type == 'a' && kTrivials.contains(type_[1])) {
        const void* items = nullptr;
        std::size_t size = 0;
        const int result = sd_bus_message_read_array(message_, type_[1], &items, &size);
        return result < 0 ? failMessage(result) : spend(size);
    }
    if (type == 's' || type == 'o' || type == 'g') {
        const char* ignored = nullptr;
        return text(ignored);
    }
    const int result = sd_bus_message_skip(message_, nullptr);
    return result < 0 ? failMessage(result) : spend(kValueCost);
}

}  // namespace keepsakes
