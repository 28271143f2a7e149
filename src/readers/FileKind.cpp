// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <array>
#include <string>
#include <string_view>

#include "readers/FileReaders.h"

namespace keepsakes {

namespace {

using namespace std::string_view_literals;

constexpr auto kJpeg = "\xFF\xD8\xFF"sv;
constexpr auto kPng = "\x89PNG\r\n\x1A\n"sv;
// ISO/IEC 23008-12 and AV1 Image File Format: brands of still images and bursts.
constexpr auto kHeifBrands = std::to_array<std::string_view>(
    {"mif1", "msf1", "heic", "heix", "heim", "heis", "hevc", "hevx", "avif"});

bool isHeif(std::string_view head) {
    if (head.size() < 16 || head.substr(4, 4) != "ftyp") return false;
    const auto length = (static_cast<std::size_t>(static_cast<unsigned char>(head[2])) << 8U) +
                        static_cast<unsigned char>(head[3]);
    const auto box = head.substr(0, std::min(length, head.size()));
    // The major brand, and after the minor version the compatible ones.
    for (std::size_t at = 8; at + 4 <= box.size(); at += at == 8 ? 8 : 4) {
        if (std::ranges::find(kHeifBrands, box.substr(at, 4)) != kHeifBrands.end()) return true;
    }
    return false;
}

/// The local name of the document's first element.
std::string_view rootName(std::string_view text) {
    while (true) {
        const auto open = text.find('<');
        if (open == std::string_view::npos || open + 1 >= text.size()) return {};
        text.remove_prefix(open + 1);
        if (text.starts_with("!--")) {
            const auto end = text.find("-->");
            if (end == std::string_view::npos) return {};
            text.remove_prefix(end);
        } else if (text.front() != '?' && text.front() != '!') {
            break;
        }
    }
    const auto name = text.substr(0, text.find_first_of(" \t\r\n/>"));
    const auto colon = name.rfind(':');
    return colon == std::string_view::npos ? name : name.substr(colon + 1);
}

}  // namespace

FileKind kindOf(std::span<const std::byte> head) {
    head = head.first(std::min(head.size(), kHeadSize));
    std::string bytes(head.size(), '\0');
    std::ranges::transform(head, bytes.begin(), [](std::byte b) { return static_cast<char>(b); });
    if (bytes.starts_with(kJpeg) || bytes.starts_with(kPng) || isHeif(bytes)) {
        return FileKind::photo;
    }
    // Names in UTF-16 are their ASCII letters with zero bytes between.
    if (bytes.starts_with("\xFF\xFE") || bytes.starts_with("\xFE\xFF") ||
        bytes.starts_with("<\0"sv) || bytes.starts_with("\0<"sv)) {
        std::erase(bytes, '\0');
    }
    const auto first = bytes.find_first_not_of(" \t\r\n\xEF\xBB\xBF\xFE\xFF");
    if (first == std::string::npos || bytes[first] != '<') return FileKind::unknown;
    const auto root = rootName(bytes);
    return root == "gpx" || root == "TrainingCenterDatabase" ? FileKind::track : FileKind::unknown;
}

}  // namespace keepsakes
