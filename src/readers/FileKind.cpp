// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <array>
#include <string>
#include <string_view>

#include "core/Text.h"
#include "readers/FileReaders.h"
#include "readers/FitMessages.h"
#include "readers/JsonStream.h"
#include "readers/MailHeaders.h"

namespace keepsakes {

namespace {

using namespace std::string_view_literals;

constexpr auto kJpeg = "\xFF\xD8\xFF"sv;
constexpr auto kSqlite = "SQLite format 3\0"sv;
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

/// Tells what a JSON document is by the names near its top, and by its GeoJSON type.
class JsonHead final : public JsonHandler {
  public:
    void startObject() override { ++depth_; }
    void endObject() override { --depth_; }
    void startArray() override {
        if (depth_ == 0) inArray_ = true;
        ++depth_;
    }
    void endArray() override { --depth_; }

    void key(std::string_view name) override {
        key_ = name;
        if (depth_ == 1) {
            if (is(kHistoryRoots, name)) kind_ = FileKind::locationHistory;
            hasLocations_ = hasLocations_ || name == "locations";
        } else if ((depth_ == 2 && inArray_ && is(kSegmentParts, name)) ||
                   (hasLocations_ && is(kRecordParts, name))) {
            kind_ = FileKind::locationHistory;
        }
    }

    void scalar(const JsonScalar& value) override {
        // Of a collection whose type stands behind its features, the first feature's type tells.
        const bool tells = depth_ == 1 || (depth_ == 3 && kind_ == FileKind::unknown);
        if (tells && key_ == "type" && value.text && is(kGeoJsonTypes, *value.text) &&
            (depth_ == 1 || *value.text == "Feature")) {
            kind_ = FileKind::geoJson;
        }
    }

    FileKind kind() const { return kind_; }

  private:
    template <std::size_t size>
    static bool is(const std::array<std::string_view, size>& names, std::string_view name) {
        return std::ranges::find(names, name) != names.end();
    }

    static constexpr auto kHistoryRoots = std::to_array<std::string_view>(
        {"timelineObjects", "semanticSegments", "rawSignals", "userLocationProfile"});
    static constexpr auto kSegmentParts =
        std::to_array<std::string_view>({"timelinePath", "timelineMemory", "visit", "activity"});
    static constexpr auto kRecordParts =
        std::to_array<std::string_view>({"latitudeE7", "longitudeE7", "timestampMs"});
    // RFC 7946
    static constexpr auto kGeoJsonTypes = std::to_array<std::string_view>(
        {"FeatureCollection", "Feature", "Point", "MultiPoint", "LineString", "MultiLineString",
         "Polygon", "MultiPolygon", "GeometryCollection"});

    int depth_ = 0;
    bool inArray_ = false;
    bool hasLocations_ = false;
    std::string key_;
    FileKind kind_ = FileKind::unknown;
};

FileKind kindOfJson(std::string_view head) {
    JsonHead json;
    // Mostly an error, since the head ends anywhere; what came before it tells.
    [[maybe_unused]] const auto error = readJson(head, json);
    return json.kind();
}

/// "2015-08-24T05:55:07Z", a tabulator, a kind padded with blanks, a tabulator.
bool isOwnTracksLine(std::string_view head) {
    constexpr std::size_t kTimeLength = 20;
    constexpr std::size_t kLongestKind = 64;
    if (head.size() <= kTimeLength || head[kTimeLength] != '\t') return false;
    const auto time = head.substr(0, kTimeLength);
    if (time[10] != 'T' || time.back() != 'Z' || !parseISO8601(time)) return false;
    const auto rest = head.substr(kTimeLength + 1, kLongestKind);
    const auto kindEnd = rest.find_first_of("\t\r\n");
    return kindEnd != std::string_view::npos && rest[kindEnd] == '\t';
}

/// Names that stand in the first lines of every mail's header (RFC 5322 and 3834, common practice).
constexpr auto kMailFields =
    std::to_array<std::string_view>({"arc-",         "authentication-results",
                                     "bcc",          "cc",
                                     "content-",     "date",
                                     "delivered-to", "delivery-date",
                                     "dkim-",        "envelope-to",
                                     "errors-to",    "from",
                                     "in-reply-to",  "list-",
                                     "mailing-list", "message-id",
                                     "mime-version", "organization",
                                     "received",     "references",
                                     "reply-to",     "resent-",
                                     "return-path",  "sender",
                                     "status",       "subject",
                                     "thread-",      "to",
                                     "user-agent",   "x-"});

bool isMailField(std::string_view line) {
    const auto name = lowerCased(line.substr(0, std::min(line.find(':'), line.size())));
    return std::ranges::any_of(kMailFields, [&name](std::string_view field) {
        return name == field || (field.ends_with('-') && name.starts_with(field));
    });
}

/// Whether the lines from the start, up to the first empty one, are a mail's header: fields alone,
/// at least two of them known.
bool isMailHeader(std::string_view text) {
    int known = 0;
    bool isFirst = true;
    while (!text.empty()) {
        const auto end = text.find('\n');
        auto line = text.substr(0, end);
        const bool isCut = end == std::string_view::npos;
        text.remove_prefix(isCut ? text.size() : end + 1);
        if (line.ends_with('\r')) line.remove_suffix(1);
        if (line.empty() || isCut) break;
        const bool goesOn = !isFirst && (line.front() == ' ' || line.front() == '\t');
        isFirst = false;
        if (goesOn) continue;
        if (!isHeaderLine(line)) return false;
        known += isMailField(line) ? 1 : 0;
    }
    return known >= 2;
}

FileKind kindOfText(std::string_view text) {
    const auto end = std::min(text.find('\n'), text.size());
    auto line = text.substr(0, end);
    if (line.ends_with('\r')) line.remove_suffix(1);
    if (lowerCased(line) == "begin:vcard") return FileKind::contacts;
    if (lowerCased(line) == "begin:vcalendar") return FileKind::calendar;
    if (isMailHeader(text)) return FileKind::mail;
    text.remove_prefix(std::min(end + 1, text.size()));
    return isMailSeparator(line) && isMailHeader(text) ? FileKind::mailbox : FileKind::unknown;
}

}  // namespace

FileKind kindOf(std::span<const std::byte> head) {
    head = head.first(std::min(head.size(), kHeadSize));
    std::string bytes(head.size(), '\0');
    std::ranges::transform(head, bytes.begin(), [](std::byte b) { return static_cast<char>(b); });
    if (bytes.starts_with(kJpeg) || bytes.starts_with(kPng) || isHeif(bytes)) {
        return FileKind::photo;
    }
    if (isFitHeader(bytes)) return FileKind::fit;
    if (isOwnTracksLine(bytes)) return FileKind::ownTracks;
    // Names in UTF-16 are their ASCII letters with zero bytes between.
    if (bytes.starts_with("\xFF\xFE") || bytes.starts_with("\xFE\xFF") ||
        bytes.starts_with("<\0"sv) || bytes.starts_with("\0<"sv)) {
        std::erase(bytes, '\0');
    }
    if (bytes.starts_with(kSqlite)) return FileKind::chatHistory;
    const auto first = bytes.find_first_not_of(" \t\r\n\xEF\xBB\xBF\xFE\xFF");
    if (first == std::string::npos) return FileKind::unknown;
    if (bytes[first] == '{' || bytes[first] == '[') return kindOfJson(bytes);
    if (bytes[first] != '<') return kindOfText(std::string_view(bytes).substr(first));
    const auto root = rootName(bytes);
    if (root == "smses" || root == "calls") return FileKind::messageBackup;
    return root == "gpx" || root == "TrainingCenterDatabase" ? FileKind::track : FileKind::unknown;
}

}  // namespace keepsakes
