// SPDX-License-Identifier: Apache-2.0
// Property: blocks change nothing, a cut file tells a beginning of the places, and every record is
// one that the index may hold. The first two bytes choose blocks and cut; the others are messages,
// for which header and checksum are made, or with an odd first byte a whole file.
#include <cstdint>
#include <string>

#include "CheckedPlaces.h"
#include "readers/FitReader.h"
#include "support/FitWriter.h"

namespace {

using namespace keepsakes;

const std::string& seedMessages(bool bigEndian) {
    static const auto make = [](bool order) {
        const auto start = parseISO8601("2024-06-15T08:00:00Z")->date;
        FitWriter fit(order);
        fit.fileId()
            .record(start, 47, 15.5)
            .record(start + 60, 47.001, 15.5)
            .compressed(1, start + 70, {FitWriter::timestamp(start + 70), 5, 7})
            .define(4, 65280, {{0, FitWriter::Type::uint16}}, 3)
            .data(4, {7})
            .session(start, start + 60, 1, 3)
            .session(start + 60, start + 90, 3)
            .activity(start + 60, 7200);
        return fit.messages();
    };
    static const std::string kSeeds[] = {make(false), make(true)};
    return kSeeds[bigEndian ? 1 : 0];
}

}  // namespace

extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t* data, std::size_t size,
                                               std::size_t most, unsigned seed) {
    const auto& messages = seedMessages((seed & 1U) != 0);
    const bool asFile = (seed & 2U) != 0;
    const auto bytes =
        asFile ? FitWriter::fileOf(messages) + FitWriter::fileOf(messages) : messages;
    const unsigned choice = (seed & 0xFCU) | (asFile ? 1U : 0U);
    return beginOrMutate(chosen(choice, seed >> 8U, bytes), data, size, most);
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size < 2) return 0;
    const std::string given(data + 2, data + size);
    const bool isFile = (data[0] & 1U) != 0;
    checkReader(readFit, isFile ? given : FitWriter::fileOf(given),
                data[0] + static_cast<std::size_t>(data[1]) * 256U);
    return 0;
}
