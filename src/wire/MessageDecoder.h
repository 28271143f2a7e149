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

/// Keyed coding straight out of the body of a D-Bus message. Each instance reads one argument of
/// it, an a{sv} (`readRecord`) or an aa{sv} (`readRecords`), from where the message stands.
/// Strict about kinds, lenient about widths: any integer type is an integer, any number a number.
/// Keys that nobody asked for are passed over, whatever they hold.
///
/// Lives on the thread of the message's connection; the message outlives it. Fails with a text
/// that names the place, as in "event 12: startDate: not a date"; the message is of no use then.
class MessageDecoder final : public KeyedDecoder {
  public:
    /// `what` names the argument in errors: "context", or for an array of records "event".
    MessageDecoder(sd_bus_message* message, std::string_view what)
        : message_(message), what_(what) {}

    /// Reads an argument that is a record whose fields the system does not name.
    bool readWhole(KSDictionary& value) { return stand() && readDictionary(value); }

    /// About how many bytes were read and, for what was kept, are held in memory.
    std::size_t cost() const { return cost_; }
    /// Whether it failed because what was read would hold more than `kLargestCost`.
    bool tooCostly() const { return cost_ > kLargestCost; }
    /// 64 MiB of smallest strings would otherwise become ten times as much.
    static constexpr std::size_t kLargestCost = std::size_t{384} << 20;

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
    bool skip() override;
    bool fail(std::string_view reason) override;
    const std::string& error() const override { return error_; }

  private:
    /// A step into the archive: a key, or with no key an index.
    struct Step {
        std::string_view key;
        std::size_t index = 0;
    };

    bool stand();
    /// Opens the variant that this stands before, if any; `likely` is the type to expect.
    bool open(const char* likely = nullptr);
    bool failMessage(int result);
    bool is(std::string_view type) const { return type_ == type; }
    bool isNumber(char type) const;
    bool spend(std::size_t bytes);
    bool enter(char type, const char* contents);
    /// As `enter`, where there may be nothing more.
    bool enterNext(char type, const char* contents, bool& any);
    bool exit();
    bool basic(char type, void* value);
    bool number(char type, double& value);
    bool text(const char*& value);
    bool pair(double& first, double& second);
    bool value(KSValue& value, std::size_t depth);
    bool array(KSValue& value, std::size_t depth);
    bool integer(std::int64_t& value);
    bool whole(KSValue& value);
    bool dictionary(KSDictionary& value, std::size_t depth);
    /// Reads the entries of the dictionary that this stands on: `read(key)` for each, standing on
    /// the value.
    template <class Read>
    bool eachEntry(const Read& read);
    template <class Read>
    bool eachElement(const Read& read);
    std::string place() const;

    sd_bus_message* message_;
    std::string_view what_;
    std::string_view type_;  ///< Of the value that this stands on; null-terminated.
    bool closed_ = false;    ///< That value is a variant which is not opened yet.
    std::vector<Step> path_;
    std::string error_;
    std::size_t cost_ = 0;
};

}  // namespace keepsakes
