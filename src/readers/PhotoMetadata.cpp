// SPDX-License-Identifier: Apache-2.0
#include "readers/PhotoMetadata.h"

#include <fmt/format.h>
#include <sys/stat.h>

#include <array>
#include <cerrno>
#include <charconv>
#include <cmath>
#include <exception>
#include <map>
#include <mutex>
#include <string_view>
#include <system_error>

#include "readers/DescriptorIo.h"
#include "readers/FileReaders.h"
#include "readers/HeifItems.h"
#include "readers/Position.h"
#include "readers/ReaderLimits.h"
#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

void lockToolkit(void* mutex, bool lock) {
    auto* toolkit = static_cast<std::recursive_mutex*>(mutex);
    lock ? toolkit->lock() : toolkit->unlock();
}

void prepareLibrary() {
    static std::once_flag once;
    std::call_once(once, [] {
        static std::recursive_mutex toolkit;
        Exiv2::XmpParser::initialize(lockToolkit, &toolkit);
        // It would write to standard error whatever a stranger's file makes it say.
        Exiv2::LogMsg::setLevel(Exiv2::LogMsg::mute);
    });
}

/// The metadata of one image.
struct Blocks {
    Exiv2::ExifData exif;
    Exiv2::XmpData xmp;
    Exiv2::IptcData iptc;
};

// The library's interface is of the days of std::auto_ptr.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

/// Reads with the class of one kind of image: the library's own guess knows many kinds more.
template <typename Image>
Blocks readImage(int fd, std::int64_t size) {
    Image image(Exiv2::BasicIo::AutoPtr(new DescriptorIo(fd, size)), false);
    image.readMetadata();
    return {image.exifData(), image.xmpData(), image.iptcData()};
}

#pragma GCC diagnostic pop

Blocks readHeif(int fd) {
    const auto items = readHeifItems(fd);
    if (!items) throw std::runtime_error(items.error());
    Blocks blocks;
    if (!items->exif.empty()) {
        const std::vector<Exiv2::byte> tiff(items->exif.begin(), items->exif.end());
        Exiv2::ExifParser::decode(blocks.exif, tiff.data(),
                                  static_cast<std::uint32_t>(tiff.size()));
    }
    if (!items->xmp.empty() && Exiv2::XmpParser::decode(blocks.xmp, items->xmp) != 0) {
        throw std::runtime_error("the XMP item cannot be read");
    }
    return blocks;
}

Blocks readBlocks(int fd, std::int64_t size) {
    std::array<std::byte, kHeadSize> head{};
    const auto count = DescriptorIo(fd, size).read(reinterpret_cast<Exiv2::byte*>(head.data()),
                                                   static_cast<long>(head.size()));
    if (kindOf(std::span(head).first(static_cast<std::size_t>(count))) != FileKind::photo) {
        throw std::runtime_error("neither JPEG nor PNG nor HEIF");
    }
    switch (std::to_integer<unsigned>(head[0])) {
        case 0xFF:
            return readImage<Exiv2::JpegImage>(fd, size);
        case 0x89:
            return readImage<Exiv2::PngImage>(fd, size);
        default:
            return readHeif(fd);
    }
}

/// A rational, or the quotient of one; nothing for x/0.
std::optional<double> rational(const Exiv2::Value& value, long index) {
    if (index >= value.count()) return std::nullopt;
    const auto [numerator, denominator] = value.toRational(index);
    if (denominator == 0) return std::nullopt;
    return static_cast<double>(numerator) / denominator;
}

/// Degrees, minutes and seconds (Exif 2.32, 4.6.6), the later ones absent or 0/0 in some files.
std::optional<double> sexagesimal(const Exiv2::Value& value) {
    const auto whole = rational(value, 0);
    if (!whole) return std::nullopt;
    return *whole + rational(value, 1).value_or(0) / 60 + rational(value, 2).value_or(0) / 3600;
}

class ExifBlock {
  public:
    explicit ExifBlock(const Exiv2::ExifData& data) : data_(data) {}

    std::optional<CameraTime> time() const {
        const auto taken = parseExifTime(text("Exif.Photo.DateTimeOriginal"));
        if (!taken) return std::nullopt;
        CameraTime time{.local = taken->date + taken->offsetSeconds.value_or(0),
                        .offsetSeconds = taken->offsetSeconds,
                        .gps = gpsTime()};
        if (!time.offsetSeconds) {
            time.offsetSeconds = parseExifOffset(text("Exif.Photo.OffsetTimeOriginal"));
        }
        time.local = time.local + subSeconds();
        return time;
    }

    std::optional<GeoPoint> position() const {
        return geoPoint(degrees("Exif.GPSInfo.GPSLatitude", 'N', 'S'),
                        degrees("Exif.GPSInfo.GPSLongitude", 'E', 'W'));
    }

  private:
    const Exiv2::Value* value(const char* key) const {
        const auto found = data_.findKey(Exiv2::ExifKey(key));
        return found == data_.end() || found->count() == 0 ? nullptr : &found->value();
    }

    std::string text(const char* key) const {
        const auto* found = value(key);
        return found ? found->toString() : std::string();
    }

    double subSeconds() const {
        const auto digits = cleanText(text("Exif.Photo.SubSecTimeOriginal"));
        double fraction = 0;
        const auto point = "0." + digits;
        const auto [end, error] =
            std::from_chars(point.data(), point.data() + point.size(), fraction);
        return error == std::errc() && end == point.data() + point.size() ? fraction : 0;
    }

    std::optional<GpsTime> gpsTime() const {
        const auto* stamp = value("Exif.GPSInfo.GPSTimeStamp");
        if (!stamp) return std::nullopt;
        const auto hours = sexagesimal(*stamp);
        if (!hours || !(*hours >= 0 && *hours < 24)) return std::nullopt;
        GpsTime time{.secondsOfDay = *hours * 3600, .day = std::nullopt};
        const auto day = parseExifTime(text("Exif.GPSInfo.GPSDateStamp") + " 00:00:00");
        if (day && !day->offsetSeconds) time.day = day->date;
        return time;
    }

    /// Without its hemisphere a number of degrees is no position.
    std::optional<double> degrees(const std::string& key, char positive, char negative) const {
        const auto* number = value(key.c_str());
        const auto reference = text((key + "Ref").c_str());
        if (!number || reference.empty()) return std::nullopt;
        if (reference[0] != positive && reference[0] != negative) return std::nullopt;
        const auto angle = sexagesimal(*number);
        if (!angle) return std::nullopt;
        return reference[0] == negative ? -*angle : *angle;
    }

    const Exiv2::ExifData& data_;
};

std::vector<std::string> texts(const Exiv2::Value& value) {
    if (const auto* byLanguage = dynamic_cast<const Exiv2::LangAltValue*>(&value)) {
        auto text = byLanguage->toString(0);
        if (text.empty() && !byLanguage->value_.empty()) text = byLanguage->value_.begin()->second;
        return {text};
    }
    std::vector<std::string> all;
    for (long i = 0; i < value.count() && all.size() < limits::kMostProperties; ++i) {
        all.push_back(value.toString(i));
    }
    return all;
}

/// "48,12.5N" or "48,12,30N" (XMP part 2, GPSCoordinate).
std::optional<double> xmpDegrees(std::string_view text, char positive, char negative) {
    if (text.empty() || (text.back() != positive && text.back() != negative)) return std::nullopt;
    const double sign = text.back() == negative ? -1 : 1;
    text.remove_suffix(1);
    double total = 0;
    double unit = 1;
    while (true) {
        const auto part = text.substr(0, text.find(','));
        double number = 0;
        const auto [end, error] = std::from_chars(part.data(), part.data() + part.size(), number);
        if (error != std::errc() || end != part.data() + part.size()) return std::nullopt;
        total += number / unit;
        if (part.size() == text.size()) return sign * total;
        text.remove_prefix(part.size() + 1);
        unit *= 60;
    }
}

/// What the XMP block says. Properties come in the block's order, those of a region one by one.
class XmpBlock {
  public:
    explicit XmpBlock(const Exiv2::XmpData& data) {
        std::size_t left = limits::kMostProperties;
        for (const auto& property : data) {
            if (left-- == 0) break;
            take(property.key(), property.value());
        }
    }

    std::optional<CameraTime> time() const {
        for (const auto& text : {originalTime_, createdTime_}) {
            const auto parsed = parseExifTime(text);
            if (!parsed) continue;
            CameraTime time{.local = parsed->date + parsed->offsetSeconds.value_or(0),
                            .offsetSeconds = parsed->offsetSeconds,
                            .gps = std::nullopt};
            if (const auto gps = parseISO8601(gpsTime_)) {
                const double day = std::floor(gps->date.seconds / 86400) * 86400;
                time.gps = GpsTime{gps->date.seconds - day, KSDate{day}};
            }
            return time;
        }
        return std::nullopt;
    }

    std::optional<GeoPoint> position() const {
        return geoPoint(xmpDegrees(latitude_, 'N', 'S'), xmpDegrees(longitude_, 'E', 'W'));
    }

    /// Keywords, persons and events, added to what other blocks had.
    void addNames(PhotoMetadata& metadata) const {
        const auto add = [](std::vector<std::string>& to, const std::vector<std::string>& from) {
            to.insert(to.end(), from.begin(), from.end());
        };
        add(metadata.keywords, keywords_);
        add(metadata.persons, persons_);
        add(metadata.events, events_);
        for (const auto& [path, region] : regions_) {
            // MWG Guidelines 2.0, 5.9: Face, Pet, Focus and BarCode; only a face is a person.
            if (region.type.empty() || region.type == "Face") {
                metadata.persons.push_back(region.name);
            }
            metadata.hasPetRegion = metadata.hasPetRegion || region.type == "Pet";
        }
    }

  private:
    struct Region {
        std::string name;
        std::string type;
    };

    void take(const std::string& key, const Exiv2::Value& value) {
        if (key == "Xmp.dc.subject") {
            for (auto& text : texts(value)) keywords_.push_back(std::move(text));
        } else if (key == "Xmp.lr.hierarchicalSubject" || key == "Xmp.digiKam.TagsList" ||
                   key == "Xmp.MicrosoftPhoto.LastKeywordXMP") {
            for (const auto& path : texts(value)) addParts(path);
        } else if (key == "Xmp.iptcExt.PersonInImage") {
            for (auto& text : texts(value)) persons_.push_back(std::move(text));
        } else if (key == "Xmp.iptcExt.Event") {
            for (auto& text : texts(value)) events_.push_back(std::move(text));
        } else if (key.starts_with("Xmp.mwg-rs.Regions/mwg-rs:RegionList[")) {
            takeRegion(key, value);
        } else if (key.starts_with("Xmp.MP.RegionInfo/MPRI:Regions[") &&
                   key.ends_with("/MPReg:PersonDisplayName")) {
            persons_.push_back(value.toString());
        } else if (key == "Xmp.exif.DateTimeOriginal") {
            originalTime_ = value.toString();
        } else if (key == "Xmp.photoshop.DateCreated") {
            createdTime_ = value.toString();
        } else if (key == "Xmp.exif.GPSTimeStamp") {
            gpsTime_ = value.toString();
        } else if (key == "Xmp.exif.GPSLatitude") {
            latitude_ = value.toString();
        } else if (key == "Xmp.exif.GPSLongitude") {
            longitude_ = value.toString();
        }
    }

    void takeRegion(const std::string& key, const Exiv2::Value& value) {
        const auto slash = key.rfind('/');
        if (key.ends_with("]/mwg-rs:Name")) regions_[key.substr(0, slash)].name = value.toString();
        if (key.ends_with("]/mwg-rs:Type")) regions_[key.substr(0, slash)].type = value.toString();
    }

    void addParts(std::string_view path) {
        while (!path.empty()) {
            const auto end = std::min(path.find_first_of("|/"), path.size());
            keywords_.emplace_back(path.substr(0, end));
            path.remove_prefix(std::min(end + 1, path.size()));
        }
    }

    std::vector<std::string> keywords_;
    std::vector<std::string> persons_;
    std::vector<std::string> events_;
    std::map<std::string, Region> regions_;
    std::string originalTime_;
    std::string createdTime_;
    std::string gpsTime_;
    std::string latitude_;
    std::string longitude_;
};

PhotoMetadata gather(const Blocks& blocks) {
    PhotoMetadata metadata;
    const ExifBlock exif(blocks.exif);
    const XmpBlock xmp(blocks.xmp);
    metadata.time = exif.time();
    if (!metadata.time) metadata.time = xmp.time();
    metadata.position = exif.position();
    if (!metadata.position) metadata.position = xmp.position();
    xmp.addNames(metadata);
    for (const auto& entry : blocks.iptc) {
        if (metadata.keywords.size() >= limits::kMostProperties) break;
        if (entry.key() == "Iptc.Application2.Keywords") {
            metadata.keywords.push_back(entry.toString());
        }
    }
    return metadata;
}

}  // namespace

std::expected<PhotoMetadata, std::string> readPhotoMetadata(int fd) {
    struct stat info {};
    if (::fstat(fd, &info) != 0) {
        return std::unexpected("stat: " + std::generic_category().message(errno));
    }
    if (static_cast<std::uint64_t>(info.st_size) > limits::kLargestPhoto) {
        return std::unexpected(fmt::format("a photo larger than {} bytes", limits::kLargestPhoto));
    }
    try {
        prepareLibrary();
        return gather(readBlocks(fd, info.st_size));
    } catch (const std::exception& error) {
        return std::unexpected(cleanText(error.what()));
    }
}

}  // namespace keepsakes
