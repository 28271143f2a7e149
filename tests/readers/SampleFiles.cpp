// SPDX-License-Identifier: Apache-2.0
#include "SampleFiles.h"

#include <fmt/format.h>
#include <sys/mman.h>
#include <unistd.h>

#include <array>
#include <cstdint>
#include <exiv2/exiv2.hpp>
#include <span>
#include <stdexcept>

#include "PlaceFiles.h"
#include "platform/ActivityCatalogue.h"

namespace keepsakes {

namespace {

std::string fromHex(std::string_view hex) {
    std::string bytes;
    for (std::size_t i = 0; i + 1 < hex.size(); i += 2) {
        bytes += static_cast<char>(std::stoi(std::string(hex.substr(i, 2)), nullptr, 16));
    }
    return bytes;
}

// One grey pixel each.
const std::string kJpeg = fromHex(
    "ffd8ffdb004300010101010101010101010101010101010101010101010101010101010101010101010101010101"
    "01010101010101010101010101010101010101010101010101ffc0000b080001000101011100ffc4001400010000"
    "0000000000000000000000000009ffc40014100100000000000000000000000000000000ffda0008010100003f00"
    "54ffd9");
const std::string kPng = fromHex(
    "89504e470d0a1a0a0000000d49484452000000010000000108000000003a7e9b550000000a49444154789c636800"
    "000082008177cd72b60000000049454e44ae426082");

constexpr std::string_view kXmpHead =
    R"(<x:xmpmeta xmlns:x="adobe:ns:meta/"><rdf:RDF)"
    R"( xmlns:rdf="http://www.w3.org/1999/02/22-rdf-syntax-ns#"><rdf:Description rdf:about="")"
    R"( xmlns:dc="http://purl.org/dc/elements/1.1/")"
    R"( xmlns:lr="http://ns.adobe.com/lightroom/1.0/")"
    R"( xmlns:digiKam="http://www.digikam.org/ns/1.0/")"
    R"( xmlns:MicrosoftPhoto="http://ns.microsoft.com/photo/1.0/")"
    R"( xmlns:MP="http://ns.microsoft.com/photo/1.2/")"
    R"( xmlns:MPRI="http://ns.microsoft.com/photo/1.2/t/RegionInfo#")"
    R"( xmlns:MPReg="http://ns.microsoft.com/photo/1.2/t/Region#")"
    R"( xmlns:mwg-rs="http://www.metadataworkinggroup.com/schemas/regions/")"
    R"( xmlns:exif="http://ns.adobe.com/exif/1.0/")"
    R"( xmlns:photoshop="http://ns.adobe.com/photoshop/1.0/")"
    R"( xmlns:Iptc4xmpExt="http://iptc.org/std/Iptc4xmpExt/2008-02-29/">)";
constexpr std::string_view kXmpTail = "</rdf:Description></rdf:RDF></x:xmpmeta>";

void set(Exiv2::ExifData& exif, const char* key, const std::string& value) {
    if (!value.empty()) exif[key].setValue(value);
}

Exiv2::ExifData exifOf(const SampleMetadata& metadata) {
    Exiv2::ExifData exif;
    set(exif, "Exif.Photo.DateTimeOriginal", metadata.time);
    set(exif, "Exif.Photo.OffsetTimeOriginal", metadata.offset);
    set(exif, "Exif.GPSInfo.GPSDateStamp", metadata.gpsDay);
    set(exif, "Exif.GPSInfo.GPSTimeStamp", metadata.gpsTime);
    if (!metadata.latitude.empty()) {
        exif["Exif.GPSInfo.GPSLatitudeRef"].setValue("N");
        exif["Exif.GPSInfo.GPSLongitudeRef"].setValue("E");
    }
    set(exif, "Exif.GPSInfo.GPSLatitude", metadata.latitude);
    set(exif, "Exif.GPSInfo.GPSLongitude", metadata.longitude);
    return exif;
}

std::string number(std::uint64_t value, int bytes) {
    std::string text;
    for (int shift = (bytes - 1) * 8; shift >= 0; shift -= 8) {
        text += static_cast<char>((value >> static_cast<unsigned>(shift)) & 0xFFU);
    }
    return text;
}

std::string box(std::string_view type, const std::string& content) {
    return number(content.size() + 8, 4) + std::string(type) + content;
}

/// ISO/IEC 14496-12: an item of type Exif in the mdat at the end, one of XMP in the idat.
std::string heif(const Exiv2::ExifData& exif, const std::string& xmp) {
    const std::string fullBox(4, '\0');
    const std::string zero(1, '\0');
    Exiv2::Blob blob;
    Exiv2::ExifParser::encode(blob, Exiv2::littleEndian, exif);
    const std::string item =
        number(6, 4) + std::string("Exif\0\0", 6) + std::string(blob.begin(), blob.end());
    const auto ftyp = box("ftyp", "heic" + number(0, 4) + "mif1heic");
    const auto infe = [&](std::uint64_t id, const std::string& type) {
        return box("infe", number(2U << 24U, 4) + number(id, 2) + number(0, 2) + type + zero);
    };
    const auto location = [&](std::uint64_t id, std::uint64_t method, std::uint64_t offset,
                              std::uint64_t length) {
        return number(id, 2) + number(method, 2) + number(0, 2) + number(1, 2) + number(offset, 4) +
               number(length, 4);
    };
    const auto metaOf = [&](std::size_t offset) {
        return box("meta", fullBox +
                               box("iinf", fullBox + number(2, 2) + infe(1, "Exif") +
                                               infe(2, "mime" + zero + "application/rdf+xml")) +
                               box("iloc", number(1U << 24U, 4) + number(0x4400, 2) + number(2, 2) +
                                               location(1, 0, offset, item.size()) +
                                               location(2, 1, 0, xmp.size())) +
                               box("idat", xmp));
    };
    const auto start = ftyp.size() + metaOf(0).size() + 8;
    return ftyp + metaOf(start) + box("mdat", item);
}

}  // namespace

std::expected<FileRecords, std::string> readBytes(std::string_view bytes) {
    PlaceLines places;
    const int fd = ::memfd_create("sample", MFD_CLOEXEC);
    if (fd < 0 || ::write(fd, bytes.data(), bytes.size()) != static_cast<ssize_t>(bytes.size())) {
        throw std::runtime_error("no memory file");
    }
    const auto kind = kindOf(std::as_bytes(std::span(bytes)));
    auto records =
        kind == FileKind::photo ? readPhotoFile(fd, kReadOn) : readTrackFile(fd, kReadOn, places);
    ::close(fd);
    return records;
}

std::string told(const std::expected<FileRecords, std::string>& records) {
    if (!records) return "error: " + records.error() + "\n";
    std::string text;
    for (const auto& workout : records->workouts) {
        text += fmt::format("{} {} {}\n", activityName(workout.activityType).value_or("?"),
                            formatISO8601(workout.start), formatISO8601(workout.end));
    }
    for (const auto& zone : records->zones) {
        text += fmt::format("zone {} {} {}\n", zone.offsetSeconds, formatISO8601(zone.span.start),
                            formatISO8601(zone.span.end));
    }
    constexpr std::array<std::string_view, 4> kSources{"offset", "gps", "track", "owner"};
    for (const auto& shot : records->photos) {
        text += fmt::format("{} by {}, local {}", formatISO8601(shot.taken),
                            kSources.at(static_cast<std::size_t>(shot.timeSource)),
                            formatISO8601(shot.localTime));
        if (shot.position) {
            text += fmt::format(", at {:.4f} {:.4f}", shot.position->latitude,
                                shot.position->longitude);
        }
        for (const auto& word : shot.inferences) text += ", " + word;
        for (const auto& name : shot.persons) text += ", person " + name;
        for (const auto& name : shot.holidays) text += ", holiday " + name;
        for (const auto& event : shot.publicEvents) text += ", event " + event.name;
        text += '\n';
    }
    return text;
}

std::string photo(const SampleMetadata& metadata, ImageForm form) {
    const auto exif = exifOf(metadata);
    std::string xmp;
    if (!metadata.xmp.empty()) {
        xmp = std::string(kXmpHead) + metadata.xmp + std::string(kXmpTail);
    }
    if (form == ImageForm::heif) return heif(exif, xmp);
    const auto& pixel = form == ImageForm::jpeg ? kJpeg : kPng;
    // NOLINTNEXTLINE(cppcoreguidelines-pro-type-reinterpret-cast): bytes as the library has them
    const auto* data = reinterpret_cast<const Exiv2::byte*>(pixel.data());
    const auto image = Exiv2::ImageFactory::open(data, static_cast<long>(pixel.size()));
    image->readMetadata();
    image->setExifData(exif);
    if (!metadata.keyword.empty()) {
        Exiv2::IptcData iptc;
        iptc["Iptc.Application2.Keywords"].setValue(metadata.keyword);
        image->setIptcData(iptc);
    }
    if (!xmp.empty()) {
        image->setXmpPacket(xmp);
        image->writeXmpFromPacket(true);
    }
    image->writeMetadata();
    auto& io = image->io();
    io.open();
    const auto written = io.read(static_cast<long>(io.size()));
    return {written.pData_, written.pData_ + written.size_};
}

}  // namespace keepsakes
