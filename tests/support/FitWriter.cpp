// SPDX-License-Identifier: Apache-2.0
#include "support/FitWriter.h"

#include <array>
#include <cmath>

namespace keepsakes {

namespace {

std::size_t sizeOf(FitWriter::Type type) {
    switch (type) {
        case FitWriter::Type::uint16:
            return 2;
        case FitWriter::Type::sint32:
        case FitWriter::Type::uint32:
            return 4;
        default:
            return 1;
    }
}

char byteOf(std::uint64_t value, std::size_t index) {
    return static_cast<char>(value >> (8 * index) & 0xFFU);
}

std::string littleEndian(std::uint64_t value, std::size_t bytes) {
    std::string text;
    for (std::size_t i = 0; i < bytes; ++i) text += byteOf(value, i);
    return text;
}

/// As the protocol's own text computes it, by halves of a byte.
std::uint16_t checksum(const std::string& bytes) {
    constexpr std::array<std::uint16_t, 16> kTable{0x0000, 0xCC01, 0xD801, 0x1400, 0xF001, 0x3C00,
                                                   0x2800, 0xE401, 0xA001, 0x6C00, 0x7800, 0xB401,
                                                   0x5000, 0x9C01, 0x8801, 0x4400};
    unsigned sum = 0;
    for (const char c : bytes) {
        const auto byte = static_cast<unsigned char>(c);
        for (const unsigned half : {byte & 0xFU, static_cast<unsigned>(byte) >> 4U}) {
            sum = ((sum >> 4U) & 0x0FFFU) ^ kTable.at(sum & 0xFU) ^ kTable.at(half);
        }
    }
    return static_cast<std::uint16_t>(sum);
}

}  // namespace

FitWriter& FitWriter::define(unsigned local, std::uint16_t message, std::vector<Field> fields,
                             std::uint8_t developerBytes) {
    put(0x40U | local | (developerBytes > 0 ? 0x20U : 0U), 1);
    put(0, 1);
    put(bigEndian_ ? 1 : 0, 1);
    put(message, 2);
    put(fields.size(), 1);
    for (const auto& field : fields) {
        put(field.number, 1);
        put(sizeOf(field.type), 1);
        put(static_cast<std::uint8_t>(field.type), 1);
    }
    if (developerBytes > 0) {
        put(1, 1);
        put(0, 1);
        put(developerBytes, 1);
        put(0, 1);
    }
    definitions_.at(local) = {std::move(fields), developerBytes};
    return *this;
}

FitWriter& FitWriter::data(unsigned local, const std::vector<Value>& values) {
    put(local, 1);
    putValues(definitions_.at(local), values);
    return *this;
}

FitWriter& FitWriter::compressed(unsigned local, KSDate time, const std::vector<Value>& values) {
    put(0x80U | local << 5U | (static_cast<std::uint64_t>(timestamp(time)) & 0x1FU), 1);
    putValues(definitions_.at(local), values);
    return *this;
}

FitWriter& FitWriter::fileId(std::int64_t type) {
    return define(0, 0, {{0, Type::enumeration}}).data(0, {type});
}

FitWriter& FitWriter::record(KSDate time, double latitude, double longitude) {
    if (definitions_[1].fields.empty()) {
        define(1, 20, {{253, Type::uint32}, {0, Type::sint32}, {1, Type::sint32}});
    }
    return data(1, {timestamp(time), semicircles(latitude), semicircles(longitude)});
}

FitWriter& FitWriter::session(KSDate start, KSDate end, std::int64_t sport, std::int64_t subSport) {
    return define(2, 18,
                  {{253, Type::uint32},
                   {2, Type::uint32},
                   {7, Type::uint32},
                   {5, Type::enumeration},
                   {6, Type::enumeration}})
        .data(2, {timestamp(end), timestamp(start), std::llround((end - start) * 1000), sport,
                  subSport});
}

FitWriter& FitWriter::activity(KSDate time, int offsetSeconds) {
    return define(3, 34, {{253, Type::uint32}, {5, Type::uint32}})
        .data(3, {timestamp(time), timestamp(time + offsetSeconds)});
}

std::string FitWriter::file(std::size_t headerSize) const { return fileOf(messages_, headerSize); }

std::string FitWriter::fileOf(const std::string& messages, std::size_t headerSize) {
    std::string header = littleEndian(headerSize, 1) + littleEndian(0x20, 1) +
                         littleEndian(2132, 2) + littleEndian(messages.size(), 4) + ".FIT";
    if (headerSize > header.size()) header += littleEndian(checksum(header), 2);
    const auto bytes = header + messages;
    return bytes + littleEndian(checksum(bytes), 2);
}

std::int64_t FitWriter::timestamp(KSDate date) {
    return std::llround(date.unixSeconds()) - 631065600;
}

std::int64_t FitWriter::semicircles(double degrees) {
    return std::llround(degrees / 180 * 2147483648.0);
}

void FitWriter::put(std::uint64_t value, std::size_t bytes) {
    for (std::size_t i = 0; i < bytes; ++i) {
        messages_ += byteOf(value, bigEndian_ ? bytes - 1 - i : i);
    }
}

void FitWriter::putValues(const Definition& definition, const std::vector<Value>& values) {
    for (std::size_t i = 0; i < definition.fields.size(); ++i) {
        const auto type = definition.fields[i].type;
        const auto none = type == Type::sint32 ? 0x7FFFFFFF : -1;
        put(static_cast<std::uint64_t>(values.at(i).value_or(none)), sizeOf(type));
    }
    messages_.append(definition.developerBytes, '\x55');
}

}  // namespace keepsakes
