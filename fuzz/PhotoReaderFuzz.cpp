// SPDX-License-Identifier: Apache-2.0
// Property: the same bytes give the same record, and the record is one that the index may hold.
#include <sys/mman.h>
#include <unistd.h>

#include <cmath>
#include <cstdint>
#include <string>
#include <string_view>

#include "ReaderCheck.h"
#include "readers/PhotoWords.h"
#include "readers/TextFolding.h"

namespace {

using namespace keepsakes;
using namespace std::string_view_literals;

// A little-endian TIFF block of one IFD with a sub-IFD that holds the time of capture alone.
constexpr auto kTiff =
    "II*\0\x08\0\0\0\x01\0\x69\x87\x04\0\x01\0\0\0\x1A\0\0\0\0\0\0\0"
    "\x01\0\x03\x90\x02\0\x14\0\0\0\x2C\0\0\0\0\0\0\0"
    "2024:06:15 10:02:03\0"sv;

constexpr auto kXmp =
    "http://ns.adobe.com/xap/1.0/\0"
    "<x:xmpmeta xmlns:x='adobe:ns:meta/'><rdf:RDF xmlns:rdf='http://www.w3.org/1999/02/22-rdf-"
    "syntax-ns#'><rdf:Description xmlns:dc='http://purl.org/dc/elements/1.1/' xmlns:exif='http://"
    "ns.adobe.com/exif/1.0/' exif:GPSLatitude='48,12.5N' exif:GPSLongitude='16,1E'><dc:subject>"
    "<rdf:Bag><rdf:li>Berge</rdf:li></rdf:Bag></dc:subject></rdf:Description></rdf:RDF>"
    "</x:xmpmeta>"sv;

std::string bigEndian(std::size_t value, int bytes) {
    std::string text;
    for (int shift = (bytes - 1) * 8; shift >= 0; shift -= 8) {
        text += static_cast<char>(value >> static_cast<unsigned>(shift) & 0xFFU);
    }
    return text;
}

std::string box(std::string_view type, const std::string& content) {
    return bigEndian(content.size() + 8, 4) + std::string(type) + content;
}

std::string heif() {
    const std::string item = bigEndian(0, 4) + std::string(kTiff);
    const auto ftyp = box("ftyp", "heic" + bigEndian(0, 4) + "mif1");
    const auto metaOf = [&](std::size_t offset) {
        return box("meta",
                   bigEndian(0, 4) +
                       box("iinf", bigEndian(0, 4) + bigEndian(1, 2) +
                                       box("infe", bigEndian(2U << 24U, 4) + bigEndian(1, 2) +
                                                       bigEndian(0, 2) + "Exif" + '\0')) +
                       box("iloc", bigEndian(0, 4) + bigEndian(0x4400, 2) + bigEndian(1, 2) +
                                       bigEndian(1, 2) + bigEndian(0, 2) + bigEndian(1, 2) +
                                       bigEndian(offset, 4) + bigEndian(item.size(), 4)));
    };
    return ftyp + metaOf(ftyp.size() + metaOf(0).size() + 8) + box("mdat", item);
}

std::string jpeg() {
    const auto segment = [](char marker, const std::string& content) {
        return std::string("\xFF") + marker + bigEndian(content.size() + 2, 2) + content;
    };
    return "\xFF\xD8" + segment('\xE1', std::string("Exif\0\0"sv) + std::string(kTiff)) +
           segment('\xE1', std::string(kXmp)) + "\xFF\xD9";
}

std::string png() {
    // The checksum of a chunk is not looked at.
    const auto chunk = [](std::string_view type, const std::string& content) {
        return bigEndian(content.size(), 4) + std::string(type) + content + bigEndian(0, 4);
    };
    return "\x89PNG\r\n\x1A\n" +
           chunk("IHDR", bigEndian(1, 4) + bigEndian(1, 4) + std::string("\x08\0\0\0\0"sv)) +
           chunk("eXIf", std::string(kTiff)) + chunk("IEND", "");
}

std::expected<FileRecords, std::string> read(std::string_view bytes) {
    static const int fd = ::memfd_create("fuzz", MFD_CLOEXEC);
    check(::ftruncate(fd, 0) == 0 &&
              ::pwrite(fd, bytes.data(), bytes.size(), 0) == static_cast<ssize_t>(bytes.size()),
          "a memory file");
    return readPhotoFile(fd, kFuzzNow);
}

}  // namespace

extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t* data, std::size_t size,
                                               std::size_t most, unsigned seed) {
    static const std::string kSeeds[] = {jpeg(), heif(), png()};
    return beginOrMutate(kSeeds[seed % std::size(kSeeds)], data, size, most);
}

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    // Else a seed that nobody can read would leave the fuzzer with refusals alone.
    for (const auto& bytes : {jpeg(), heif(), png()}) {
        check(read(bytes).has_value(), "the first inputs are photos");
    }
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string bytes(data, data + size);
    const auto records = read(bytes);
    const auto again = read(bytes);
    check(records == again, "the same bytes give the same records");
    if (!records) {
        check(!records.error().empty(), "a refusal has a reason");
        return 0;
    }
    check(records->photos.size() == 1 && records->workouts.empty(), "one photo");
    const auto& photo = records->photos.front();
    check(limits::isSane(photo.taken, kFuzzNow.now), "a sane time");
    check(limits::isOffset(static_cast<int>(std::lround(photo.localTime - photo.taken))),
          "an offset that exists");
    if (photo.position) {
        check(
            std::abs(photo.position->latitude) <= 90 && std::abs(photo.position->longitude) <= 180,
            "a position on earth");
    }
    for (const auto& word : photo.inferences) {
        check(inferenceOfKeyword(word) == word, "an inference of the table");
    }
    for (const auto& name : photo.persons) {
        check(!name.empty() && cleanText(name) == name, "a clean name");
    }
    return 0;
}
