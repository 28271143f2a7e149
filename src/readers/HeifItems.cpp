// SPDX-License-Identifier: Apache-2.0
#include "readers/HeifItems.h"

#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <limits>
#include <map>
#include <optional>
#include <stdexcept>
#include <string_view>
#include <vector>

#include "readers/ReaderLimits.h"

namespace keepsakes {

namespace {

/// Thrown here, caught in `readHeifItems`.
struct BadBoxes : std::runtime_error {
    using std::runtime_error::runtime_error;
};

std::string bytesAt(int fd, std::uint64_t offset, std::uint64_t count) {
    if (offset > static_cast<std::uint64_t>(std::numeric_limits<off_t>::max()) - count) {
        throw BadBoxes("an offset beyond any file");
    }
    std::string bytes(count, '\0');
    std::size_t filled = 0;
    while (filled < bytes.size()) {
        const auto got = ::pread(fd, bytes.data() + filled, bytes.size() - filled,
                                 static_cast<off_t>(offset + filled));
        if (got < 0 && errno == EINTR) continue;
        if (got <= 0) throw BadBoxes("the file ends within its metadata");
        filled += static_cast<std::size_t>(got);
    }
    return bytes;
}

/// Reads big-endian fields from the front of a box's content.
class Fields {
  public:
    explicit Fields(std::string_view bytes) : rest_(bytes) {}

    bool atEnd() const { return rest_.empty(); }
    std::string_view rest() const { return rest_; }

    std::string_view bytes(std::uint64_t count) {
        if (count > rest_.size()) throw BadBoxes("a box ends within a field");
        const auto taken = rest_.substr(0, count);
        rest_.remove_prefix(count);
        return taken;
    }

    std::uint64_t number(unsigned count) {
        std::uint64_t value = 0;
        for (char c : bytes(count)) value = value << 8U | static_cast<unsigned char>(c);
        return value;
    }

    std::string_view text() {
        const auto end = rest_.find('\0');
        if (end == std::string_view::npos) return bytes(rest_.size());
        const auto taken = bytes(end);
        bytes(1);
        return taken;
    }

  private:
    std::string_view rest_;
};

struct Box {
    std::string_view type;
    std::string_view content;
};

Box nextBox(Fields& in) {
    constexpr std::uint64_t kHeader = 8;
    const auto size = in.number(4);
    const auto type = in.bytes(4);
    if (size == 0) return {type, in.bytes(in.rest().size())};
    if (size < kHeader) throw BadBoxes("a box shorter than its header");
    return {type, in.bytes(size - kHeader)};
}

/// The content of the file's meta box.
std::string metaBox(int fd) {
    constexpr int kMostBoxes = 1000;
    std::uint64_t offset = 0;
    for (int i = 0; i < kMostBoxes; ++i) {
        const auto head = bytesAt(fd, offset, 8);
        Fields fields(head);
        auto size = fields.number(4);
        const auto type = fields.bytes(4);
        std::uint64_t header = 8;
        if (size == 1) {
            const auto large = bytesAt(fd, offset + header, 8);
            size = Fields(large).number(8);
            header = 16;
        }
        if (size < header) break;
        if (type == "meta") {
            if (size > limits::kLargestMetaBox) throw BadBoxes("the meta box is too large");
            return bytesAt(fd, offset + header, size - header);
        }
        if (size > limits::kLargestPhoto) break;
        offset += size;
    }
    throw BadBoxes("no meta box");
}

struct ItemNumbers {
    std::optional<std::uint64_t> exif;
    std::optional<std::uint64_t> xmp;
};

ItemNumbers itemNumbers(std::string_view iinf) {
    ItemNumbers numbers;
    Fields in(iinf);
    const auto version = in.number(4) >> 24U;
    in.number(version == 0 ? 2 : 4);
    while (!in.atEnd()) {
        const auto box = nextBox(in);
        if (box.type != "infe") continue;
        Fields entry(box.content);
        const auto entryVersion = entry.number(4) >> 24U;
        if (entryVersion < 2) continue;
        const auto number = entry.number(entryVersion == 2 ? 2 : 4);
        entry.number(2);
        const auto type = entry.bytes(4);
        if (type == "Exif" && !numbers.exif) numbers.exif = number;
        if (type != "mime" || numbers.xmp) continue;
        entry.text();
        if (entry.text() == "application/rdf+xml") numbers.xmp = number;
    }
    return numbers;
}

struct Extent {
    std::uint64_t offset;
    std::uint64_t length;
};

struct Location {
    std::uint64_t method = 0;  ///< 0: offsets in the file, 1: in the idat box.
    std::vector<Extent> extents;
};

/// Where the wanted items lie.
std::map<std::uint64_t, Location> itemLocations(std::string_view iloc, const ItemNumbers& wanted) {
    std::map<std::uint64_t, Location> locations;
    Fields in(iloc);
    const auto version = in.number(4) >> 24U;
    if (version > 2) throw BadBoxes("an iloc box of an unknown version");
    const auto sizes = static_cast<unsigned>(in.number(2));
    const unsigned offsetSize = sizes >> 12U;
    const unsigned lengthSize = sizes >> 8U & 0xFU;
    const unsigned baseSize = sizes >> 4U & 0xFU;
    const unsigned indexSize = version == 0 ? 0 : sizes & 0xFU;
    if (offsetSize > 8 || lengthSize > 8 || baseSize > 8 || indexSize > 8) {
        throw BadBoxes("an iloc box with fields of an unknown size");
    }
    const auto count = in.number(version < 2 ? 2 : 4);
    for (std::uint64_t i = 0; i < count; ++i) {
        const auto number = in.number(version < 2 ? 2 : 4);
        Location location;
        if (version > 0) location.method = in.number(2) & 0xFU;
        in.number(2);
        const auto base = in.number(baseSize);
        const auto extents = in.number(2);
        if (extents > 1 && offsetSize + lengthSize + indexSize == 0) {
            throw BadBoxes("an iloc box with extents of no size");
        }
        for (std::uint64_t j = 0; j < extents; ++j) {
            in.number(indexSize);
            const auto offset = in.number(offsetSize);
            const auto length = in.number(lengthSize);
            if (number != wanted.exif && number != wanted.xmp) continue;
            location.extents.push_back({base + offset, length});
        }
        if (!location.extents.empty()) locations.try_emplace(number, std::move(location));
    }
    return locations;
}

std::string itemBytes(int fd, const Location& location, std::string_view idat) {
    std::string bytes;
    for (const auto& [offset, length] : location.extents) {
        if (length > limits::kLargestItem - bytes.size()) {
            throw BadBoxes("a metadata item is too large");
        }
        if (location.method == 0) {
            bytes += bytesAt(fd, offset, length);
        } else if (location.method == 1) {
            Fields in(idat);
            in.bytes(offset);
            bytes += in.bytes(length);
        }
    }
    return bytes;
}

/// ISO/IEC 23008-12, A.2.1: the item begins with the offset of its TIFF header.
std::string tiffOf(const std::string& item) {
    if (item.empty()) return {};
    Fields in(item);
    in.bytes(in.number(4));
    return std::string(in.rest());
}

HeifItems findItems(int fd) {
    const auto meta = metaBox(fd);
    std::map<std::string_view, std::string_view> boxes;
    Fields in(meta);
    in.number(4);
    while (!in.atEnd()) {
        const auto box = nextBox(in);
        boxes.try_emplace(box.type, box.content);
    }
    HeifItems items;
    if (!boxes.contains("iinf") || !boxes.contains("iloc")) return items;
    const auto numbers = itemNumbers(boxes["iinf"]);
    const auto locations = itemLocations(boxes["iloc"], numbers);
    const auto read = [&](std::optional<std::uint64_t> number) {
        const auto found = number ? locations.find(*number) : locations.end();
        return found == locations.end() ? "" : itemBytes(fd, found->second, boxes["idat"]);
    };
    items.exif = tiffOf(read(numbers.exif));
    items.xmp = read(numbers.xmp);
    return items;
}

}  // namespace

std::expected<HeifItems, std::string> readHeifItems(int fd) {
    try {
        return findItems(fd);
    } catch (const BadBoxes& error) {
        return std::unexpected(error.what());
    }
}

}  // namespace keepsakes
