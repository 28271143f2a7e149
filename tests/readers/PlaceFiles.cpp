// SPDX-License-Identifier: Apache-2.0
#include "PlaceFiles.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <cstring>

#include "SampleFiles.h"
#include "readers/FitReader.h"
#include "readers/GeoJsonReader.h"
#include "readers/LocationHistoryReader.h"
#include "readers/OwnTracksReader.h"
#include "readers/TrackReader.h"

namespace keepsakes {

namespace {

std::string useText(PlaceUse use) {
    constexpr std::array<std::string_view, 3> kUses{"", " home", " work"};
    return std::string(kUses.at(static_cast<std::size_t>(use)));
}

std::string positionText(const GeoPoint& position) {
    return fmt::format("{:.4f} {:.4f}", position.latitude, position.longitude);
}

constexpr auto kWhole = std::string_view::npos;

ReadBlock inBlocks(std::string_view bytes, std::size_t most) {
    return [bytes, most](std::span<char> into) mutable -> std::expected<std::size_t, std::string> {
        const auto count = std::min({most, bytes.size(), into.size()});
        std::memcpy(into.data(), bytes.data(), count);
        bytes.remove_prefix(count);
        return count;
    };
}

std::expected<FileRecords, std::string> read(std::string_view bytes, std::size_t block,
                                             LocationSink& places) {
    switch (kindOf(std::as_bytes(std::span(bytes)))) {
        case FileKind::track:
            return readTrack(inBlocks(bytes, block), kReadOn, places);
        case FileKind::fit:
            return readFit(inBlocks(bytes, block), kReadOn, places);
        case FileKind::ownTracks:
            return readOwnTracks(inBlocks(bytes, block), kReadOn, places);
        case FileKind::locationHistory:
            return readLocationHistory(inBlocks(bytes, block), kReadOn, places);
        case FileKind::geoJson:
            return readGeoJson(inBlocks(bytes, block), kReadOn, places);
        default:
            return std::unexpected("of another kind");
    }
}

}  // namespace

void PlaceLines::point(const TrackPoint& point) {
    lines.push_back(
        formatISO8601(point.time) + " " + positionText(point.position) +
        (std::isnan(point.accuracyMeters) ? "" : fmt::format(" {} m", point.accuracyMeters)));
}

void PlaceLines::visit(StatedVisit visit) {
    lines.push_back(fmt::format("stay {} {} {} {} '{}'{}", formatISO8601(visit.stay.start),
                                formatISO8601(visit.stay.end), positionText(visit.position),
                                visit.confidence, visit.name, useText(visit.use)));
}

void PlaceLines::place(NamedPlace place) {
    lines.push_back(fmt::format("place {} '{}'{}", positionText(place.position), place.name,
                                useText(place.use)));
}

std::string toldPlaces(std::string_view bytes) {
    PlaceLines places;
    const auto records = read(bytes, kWhole, places);
    std::string text;
    for (const auto& line : places.lines) text += line + "\n";
    return text + told(records);
}

std::string brokenCut(const std::string& bytes) {
    PlaceLines whole;
    const auto records = read(bytes, kWhole, whole);
    PlaceLines again;
    if (read(bytes, 7, again) != records || again.lines != whole.lines) return "in small blocks";
    for (std::size_t length = 0; length < bytes.size(); ++length) {
        PlaceLines part;
        const auto cut = read(std::string_view(bytes).substr(0, length), kWhole, part);
        if (part.lines.size() > whole.lines.size() ||
            !std::equal(part.lines.begin(), part.lines.end(), whole.lines.begin()) ||
            (!cut && cut.error().empty())) {
            return fmt::format("cut at {}", length);
        }
    }
    return {};
}

}  // namespace keepsakes
