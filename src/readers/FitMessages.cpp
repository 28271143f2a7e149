// SPDX-License-Identifier: Apache-2.0
#include "readers/FitMessages.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <limits>

#include "readers/ReaderLimits.h"

namespace keepsakes {

namespace {

constexpr std::size_t kShortHeader = 12;
constexpr std::size_t kHeaderWithChecksum = 14;
constexpr std::uint8_t kTimestampField = 253;

// Bits of a record's first byte.
constexpr unsigned kCompressed = 0x80;
constexpr unsigned kIsDefinition = 0x40;
constexpr unsigned kHasDeveloperFields = 0x20;
constexpr unsigned kLocalType = 0x0F;
constexpr unsigned kTimeOffset = 0x1F;

/// CRC-16 of the protocol: polynomial 0x8005, bits reversed, from zero.
class Checksum {
  public:
    void add(std::span<const std::uint8_t> bytes) {
        for (const auto byte : bytes) {
            value_ = static_cast<std::uint16_t>((value_ >> 8U) ^ kTable[(value_ ^ byte) & 0xFFU]);
        }
    }
    std::uint16_t value() const { return value_; }

  private:
    static constexpr std::array<std::uint16_t, 256> kTable = [] {
        std::array<std::uint16_t, 256> table{};
        for (unsigned byte = 0; byte < table.size(); ++byte) {
            unsigned value = byte;
            for (int bit = 0; bit < 8; ++bit) {
                value = (value & 1U) != 0 ? (value >> 1U) ^ 0xA001U : value >> 1U;
            }
            table[byte] = static_cast<std::uint16_t>(value);
        }
        return table;
    }();

    std::uint16_t value_ = 0;
};

std::uint64_t unsignedOf(std::span<const std::uint8_t> bytes, bool bigEndian) {
    std::uint64_t value = 0;
    for (std::size_t i = 0; i < bytes.size(); ++i) {
        value = value << 8U | bytes[bigEndian ? i : bytes.size() - 1 - i];
    }
    return value;
}

struct BaseType {
    std::uint8_t type;
    std::uint8_t size;
    bool isSigned;
    std::uint64_t invalid;
};

// The integers among the protocol's base types, with the value that stands for none.
constexpr auto kIntegers = std::to_array<BaseType>({
    {0x00, 1, false, 0xFF},
    {0x01, 1, true, 0x7F},
    {0x02, 1, false, 0xFF},
    {0x83, 2, true, 0x7FFF},
    {0x84, 2, false, 0xFFFF},
    {0x85, 4, true, 0x7FFFFFFF},
    {0x86, 4, false, 0xFFFFFFFF},
    {0x0A, 1, false, 0},
    {0x8B, 2, false, 0},
    {0x8C, 4, false, 0},
});

/// The bytes of a file in order, block by block, with their checksum.
class FitBytes {
  public:
    explicit FitBytes(const ReadBlock& read) : read_(read), block_(limits::kBlockSize) {}

    /// Fills the span; false at the end of the bytes or when reading fails.
    bool take(std::span<std::uint8_t> into) {
        std::size_t done = 0;
        while (done < into.size()) {
            if (at_ == filled_ && !refill()) return false;
            const auto count = std::min(into.size() - done, filled_ - at_);
            std::memcpy(into.subspan(done).data(), block_.data() + at_, count);
            done += count;
            at_ += count;
            position_ += count;
        }
        checksum_.add(into);
        return true;
    }

    void restartChecksum() { checksum_ = {}; }
    std::uint16_t checksum() const { return checksum_.value(); }
    std::uint64_t position() const { return position_; }
    const std::string& error() const { return error_; }

  private:
    bool refill() {
        const auto count = error_.empty() ? read_(block_) : std::size_t{0};
        if (!count) error_ = count.error();
        at_ = 0;
        filled_ = count.value_or(0);
        return filled_ > 0;
    }

    ReadBlock read_;
    std::vector<char> block_;
    std::size_t at_ = 0;
    std::size_t filled_ = 0;
    std::uint64_t position_ = 0;
    Checksum checksum_;
    std::string error_;
};

class FitParse {
  public:
    FitParse(const ReadBlock& read, FitHandler& handler) : bytes_(read), handler_(handler) {}

    std::expected<void, std::string> run() {
        bool isFirst = true;
        while (true) {
            const auto size = header(isFirst);
            if (!size) return std::unexpected(size.error());
            if (!*size) break;
            isFirst = false;
            handler_.startFile();
            const auto whole = file(**size);
            if (!whole) return std::unexpected(whole.error());
            handler_.endFile();
            if (!*whole) break;
        }
        if (!bytes_.error().empty()) return std::unexpected(bytes_.error());
        return {};
    }

  private:
    using Failure = std::unexpected<std::string>;

    /// The size of the data that follows; nothing at the end of the bytes.
    std::expected<std::optional<std::uint64_t>, std::string> header(bool isFirst) {
        const auto start = bytes_.position();
        std::array<std::uint8_t, 255> head{};
        const auto rest = std::span(head);
        bytes_.restartChecksum();
        const bool hasStart = bytes_.take(rest.first(kShortHeader));
        const bool isEmpty = bytes_.position() == start;
        // Some writers fill the last block of their file with zeros.
        if (!isFirst && (!hasStart || head[0] == 0)) return std::nullopt;
        if (isEmpty) return Failure("the file is empty");
        if (hasStart && !isFitHeader(std::string(head.begin(), head.end()))) {
            return Failure(fmt::format("byte {}: no FIT header", start));
        }
        if (!hasStart || !bytes_.take(rest.subspan(kShortHeader, head[0] - kShortHeader))) {
            if (!isFirst) return std::nullopt;
            return Failure(fmt::format("byte {}: the header is cut", start));
        }
        Checksum checksum;
        checksum.add(rest.first(kShortHeader));
        const auto stated = unsignedOf(rest.subspan(kShortHeader, 2), false);
        if (head[0] >= kHeaderWithChecksum && stated != 0 && stated != checksum.value()) {
            return Failure(fmt::format("byte {}: the header's checksum is wrong", start));
        }
        const auto size = unsignedOf(rest.subspan(4, 4), false);
        // A recording that was never ended has no size yet.
        return size == 0 ? std::numeric_limits<std::uint64_t>::max() : size;
    }

    /// Whether the file is whole.
    std::expected<bool, std::string> file(std::uint64_t size) {
        definitions_ = {};
        lastTime_.reset();
        left_ = size;
        while (left_ > 0) {
            const auto more = record();
            if (!more || !*more) return more;
        }
        const auto computed = bytes_.checksum();
        std::array<std::uint8_t, 2> stated{};
        if (!bytes_.take(stated)) return false;
        if (handler_.isClosed() && unsignedOf(stated, false) != computed) {
            return Failure(
                fmt::format("byte {}: the checksum is wrong", bytes_.position() - stated.size()));
        }
        return true;
    }

    /// Whether there was a whole one.
    std::expected<bool, std::string> record() {
        const auto start = bytes_.position();
        std::array<std::uint8_t, 1> head{};
        if (!take(head)) return false;
        if ((head[0] & (kCompressed | kIsDefinition)) == kIsDefinition) {
            return definition(head[0] & kLocalType, (head[0] & kHasDeveloperFields) != 0);
        }
        const bool isCompressed = (head[0] & kCompressed) != 0;
        const auto local = isCompressed ? head[0] >> 5U & 3U : head[0] & kLocalType;
        const auto& definition = definitions_.at(local);
        if (!definition) {
            return Failure(
                fmt::format("byte {}: data of message {}, which is not defined", start, local));
        }
        return data(*definition, isCompressed ? timeAfter(head[0] & kTimeOffset) : std::nullopt);
    }

    bool definition(std::size_t local, bool hasDeveloperFields) {
        std::array<std::uint8_t, 5> head{};
        if (!take(head)) return false;
        FitDefinition definition;
        definition.bigEndian = (head[1] & 1U) != 0;
        definition.message = static_cast<std::uint16_t>(
            unsignedOf(std::span(head).subspan(2, 2), definition.bigEndian));
        std::array<std::uint8_t, 3> field{};
        for (int i = 0; i < head[4]; ++i) {
            if (!take(field)) return false;
            definition.fields.push_back({field[0], field[1], field[2]});
            definition.fieldBytes += field[1];
        }
        std::array<std::uint8_t, 1> count{};
        if (hasDeveloperFields && !take(count)) return false;
        for (int i = 0; i < count[0]; ++i) {
            if (!take(field)) return false;
            definition.developerBytes += field[1];
        }
        definitions_.at(local) = std::move(definition);
        return true;
    }

    bool data(const FitDefinition& definition, std::optional<std::uint32_t> compressedTime) {
        message_.resize(definition.fieldBytes + definition.developerBytes);
        if (!take(message_)) return false;
        const FitMessage message(definition, message_, compressedTime);
        if (const auto time = message.rawTime()) lastTime_ = time;
        handler_.message(message);
        return true;
    }

    /// The next time whose lowest five bits are these.
    std::optional<std::uint32_t> timeAfter(unsigned offset) const {
        if (!lastTime_) return std::nullopt;
        return *lastTime_ + ((offset - *lastTime_) & kTimeOffset);
    }

    /// Bytes of the data; false where they end.
    bool take(std::span<std::uint8_t> into) {
        if (into.size() > left_ || !bytes_.take(into)) return false;
        left_ -= into.size();
        return true;
    }

    FitBytes bytes_;
    FitHandler& handler_;
    // Of the file that is read.
    std::array<std::optional<FitDefinition>, kLocalType + 1> definitions_;
    std::optional<std::uint32_t> lastTime_;
    std::uint64_t left_ = 0;  // bytes of its data
    std::vector<std::uint8_t> message_;
};

}  // namespace

bool isFitHeader(std::string_view head) {
    return head.size() >= kShortHeader && static_cast<unsigned char>(head[0]) >= kShortHeader &&
           head.substr(8, 4) == ".FIT";
}

std::optional<std::int64_t> FitMessage::integer(std::uint8_t field) const {
    std::size_t at = 0;
    for (const auto& one : definition_.fields) {
        if (one.number != field) {
            at += one.size;
            continue;
        }
        const auto* const base = std::ranges::find(kIntegers, one.type, &BaseType::type);
        if (base == kIntegers.end() || base->size != one.size) return std::nullopt;
        const auto value = unsignedOf(bytes_.subspan(at, one.size), definition_.bigEndian);
        if (value == base->invalid) return std::nullopt;
        const auto signedValue = static_cast<std::int64_t>(value);
        const auto range = std::int64_t{1} << (base->size * 8U);
        return base->isSigned && signedValue >= range / 2 ? signedValue - range : signedValue;
    }
    return std::nullopt;
}

std::optional<KSDate> FitMessage::date(std::uint8_t field) const {
    constexpr std::int64_t kEpoch = 631065600;  // 1989-12-31, in seconds since 1970
    constexpr std::int64_t kLeastDate = 0x10000000;
    const std::optional<std::int64_t> seconds =
        field == kTimestampField ? std::optional<std::int64_t>(rawTime()) : integer(field);
    if (!seconds || *seconds < kLeastDate) return std::nullopt;
    return KSDate::fromUnix(static_cast<double>(*seconds + kEpoch));
}

std::optional<KSDate> FitMessage::time() const { return date(kTimestampField); }

std::optional<std::uint32_t> FitMessage::rawTime() const {
    if (compressedTime_) return compressedTime_;
    const auto stated = integer(kTimestampField);
    if (!stated) return std::nullopt;
    return static_cast<std::uint32_t>(*stated);
}

std::expected<void, std::string> readFitMessages(const ReadBlock& read, FitHandler& handler) {
    return FitParse(read, handler).run();
}

}  // namespace keepsakes
