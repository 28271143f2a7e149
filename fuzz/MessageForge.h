// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <fuzzer/FuzzedDataProvider.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <limits>
#include <string>
#include <string_view>

#include "Check.h"
#include "bus/BusHandles.h"
#include "wire/MessageEncoder.h"

namespace keepsakes {

/// An input as the decisions by which a message is chosen, one at a time; zeros at the end.
class Choices {
  public:
    Choices(const std::uint8_t* data, std::size_t size) : bytes_(data, size) {}

    unsigned of(std::size_t count) {
        return bytes_.ConsumeIntegralInRange(0U, static_cast<unsigned>(count) - 1);
    }
    std::uint64_t word() { return bytes_.ConsumeIntegral<std::uint64_t>(); }
    std::string text() {
        auto text = bytes_.ConsumeRandomLengthString(16);
        std::ranges::replace(text, '\0', '0');
        return text;
    }

  private:
    FuzzedDataProvider bytes_;
};

/// Writes records into a message as a client would that gets some fields wrong: each may be left
/// out, stand twice, hold any value of its type or of another, or have a stranger beside it. Does
/// not own the message.
class MessageForge final : public KeyedEncoder {
  public:
    MessageForge(sd_bus_message* message, Choices& choices)
        : message_(message), choices_(choices), right_(message) {}

    void appendRecord(const WriteRecord& write) {
        right_.appendRecord([&](KeyedEncoder&) { write(*this); });
    }
    void beginRecords() { right_.beginRecords(); }
    void endRecords() { right_.endRecords(); }
    /// False when the bus library would not hold what was chosen; no client can send it then.
    bool ok() const { return right_.ok() && !refused_; }

    void writeBool(std::string_view key, bool value) override {
        put(key, "b", [&] { right_.writeBool(key, value); });
    }
    void writeUnsigned(std::string_view key, std::uint64_t value) override {
        put(key, "t", [&] { right_.writeUnsigned(key, value); });
    }
    void writeNumber(std::string_view key, double value) override {
        put(key, "d", [&] { right_.writeNumber(key, value); });
    }
    void writeString(std::string_view key, std::string_view value) override {
        put(key, "s", [&] { right_.writeString(key, value); });
    }
    void writeStrings(std::string_view key, const std::vector<std::string>& value) override {
        put(key, "as", [&] { right_.writeStrings(key, value); });
    }
    void writeUUID(std::string_view key, const KSUUID& value) override {
        put(key, "s", [&] { right_.writeUUID(key, value); });
    }
    void writeDate(std::string_view key, KSDate value) override {
        put(key, "d", [&] { right_.writeDate(key, value); });
    }
    void writeInterval(std::string_view key, const KSDateInterval& value) override {
        put(key, "(dd)", [&] { right_.writeInterval(key, value); });
    }
    void writeLocation(std::string_view key, double latitude, double longitude) override {
        put(key, "(dd)", [&] { right_.writeLocation(key, latitude, longitude); });
    }
    void writeJson(std::string_view key, const KSDictionary& value) override {
        put(key, "ay", [&] { right_.writeJson(key, value); });
    }
    void writeDictionary(std::string_view key, const KSDictionary& value) override {
        put(key, "a{sv}", [&] { right_.writeDictionary(key, value); });
    }
    void writeDictionaries(std::string_view key, const std::vector<KSDictionary>& value) override {
        put(key, "aa{sv}", [&] { right_.writeDictionaries(key, value); });
    }
    void writeRecord(std::string_view key, const WriteRecord& write) override {
        put(key, "a{sv}", [&] { right_.writeRecord(key, [&](KeyedEncoder&) { write(*this); }); });
    }
    void writeRecords(std::string_view key, std::size_t count,
                      const std::function<void(std::size_t, KeyedEncoder&)>& write) override {
        put(key, "aa{sv}", [&] {
            right_.writeRecords(key, count,
                                [&](std::size_t index, KeyedEncoder&) { write(index, *this); });
        });
    }

  private:
    static constexpr unsigned kDeepestType = 6;

    template <class Write>
    void put(std::string_view key, const std::string& rightType, const Write& write) {
        enum : unsigned { leaveOut = 1, otherValue, otherType, twice, stranger, kinds = 120 };
        switch (choices_.of(kinds)) {
            case leaveOut:
                return;
            case otherValue:
                entry(std::string(key), rightType);
                return;
            case otherType:
                entry(std::string(key), type(0));
                return;
            case twice:
                write();
                break;
            case stranger:
                entry(choices_.text(), type(0));
                break;
            default:
                break;
        }
        write();
    }

    void entry(const std::string& key, const std::string& type) {
        require(sd_bus_message_open_container(message_, 'e', "sv"));
        require(sd_bus_message_append_basic(message_, 's', key.c_str()));
        variantOf(type);
        require(sd_bus_message_close_container(message_));
    }

    void require(int result) { refused_ |= result < 0; }

    /// A complete type of the D-Bus Specification, "Type System"; no file descriptors.
    std::string type(unsigned depth) {
        constexpr std::string_view kBasic = "sdxtuyiqnbog";
        const auto kind = choices_.of(depth < kDeepestType ? 20 : kBasic.size());
        if (kind < kBasic.size()) return std::string(1, kBasic[kind]);
        switch (kind) {
            case 12:
                return "ay";
            case 13:
            case 14:
                return "a{s" + type(depth + 1) + "}";
            case 15:
                return "(" + type(depth + 1) + type(depth + 1) + ")";
            case 16:
                return "a" + type(depth + 1);
            case 17:
                return "a{sv}";
            default:
                return "v";
        }
    }

    void variantOf(const std::string& type) {
        require(sd_bus_message_open_container(message_, 'v', type.c_str()));
        value(type);
        require(sd_bus_message_close_container(message_));
    }

    void value(const std::string& type) {
        if (refused_) return;
        switch (type[0]) {
            case 'v':
                if (choices_.of(4) == 1) {
                    tower(choices_.of(64));
                } else {
                    variantOf(this->type(0));
                }
                break;
            case 'a':
                array(type.substr(1));
                break;
            case '(': {
                const auto inside = type.substr(1, type.size() - 2);
                const auto first = lengthOfFirst(inside);
                require(sd_bus_message_open_container(message_, 'r', inside.c_str()));
                value(inside.substr(0, first));
                value(inside.substr(first));
                require(sd_bus_message_close_container(message_));
                break;
            }
            default:
                basic(type[0]);
        }
    }

    /// A variant that holds an array of one variant and so on.
    void tower(unsigned levels) {
        for (unsigned level = 0; level < levels; ++level) {
            require(sd_bus_message_open_container(message_, 'v', "av"));
            require(sd_bus_message_open_container(message_, 'a', "v"));
        }
        variantOf("s");
        for (unsigned level = 0; level < 2 * levels; ++level) {
            require(sd_bus_message_close_container(message_));
        }
    }

    void array(const std::string& inside) {
        if (inside == "y") {
            constexpr std::array<std::string_view, 5> kTexts = {
                "{}", "[1]", "{\"a\":[1e999,-0.0,{\"b\":null}]}", "{\"photoKeepsakePersons\":[{}]}",
                "{\"photoKeepsakeInferences\":[\"\\ud800\",1],\"photoKeepsakeHolidays\":{}}"};
            const auto which = choices_.of(8);
            const auto text = which < kTexts.size() ? std::string(kTexts[which]) : choices_.text();
            require(sd_bus_message_append_array(message_, 'y', text.data(), text.size()));
            return;
        }
        require(sd_bus_message_open_container(message_, 'a', inside.c_str()));
        for (auto left = choices_.of(4); left > 0 && !refused_; --left) {
            if (inside[0] != '{') {
                value(inside);
                continue;
            }
            const auto content = inside.substr(1, inside.size() - 2);
            require(sd_bus_message_open_container(message_, 'e', content.c_str()));
            basic('s');
            value(content.substr(1));
            require(sd_bus_message_close_container(message_));
        }
        require(sd_bus_message_close_container(message_));
    }

    void basic(char type) {
        constexpr auto kInfinity = std::numeric_limits<double>::infinity();
        constexpr std::array<double, 6> kOddNumbers = {0, -1, 1e300, 0.1, kInfinity, -kInfinity};
        const void* source = nullptr;
        const auto word = choices_.word();
        double number = static_cast<double>(word % 100000);
        if (word % 3 == 0) number = kOddNumbers[word / 3 % kOddNumbers.size()];
        const int truth = static_cast<int>(word & 1U);
        const auto text = type == 's' ? choices_.text() : "";
        switch (type) {
            case 's':
                source = text.c_str();
                break;
            case 'o':
                source = "/a/b";
                break;
            case 'g':
                source = "a{sv}";
                break;
            case 'd':
                source = &number;
                break;
            case 'b':
                source = &truth;
                break;
            default:
                source = &word;
        }
        require(sd_bus_message_append_basic(message_, type, source));
    }

    /// Of a structure's two types, which `type` made.
    static std::size_t lengthOfFirst(std::string_view types) {
        std::size_t at = 0;
        while (types[at] == 'a') ++at;
        int depth = 0;
        do {
            depth += types[at] == '(' || types[at] == '{' ? 1 : 0;
            depth -= types[at] == ')' || types[at] == '}' ? 1 : 0;
            ++at;
        } while (depth > 0);
        return at;
    }

    sd_bus_message* message_;
    Choices& choices_;
    MessageEncoder right_;
    bool refused_ = false;
};

}  // namespace keepsakes
