// SPDX-License-Identifier: Apache-2.0
#include "indexer/ContentReader.h"

#include <unistd.h>

#include <array>
#include <cerrno>
#include <system_error>

#include "readers/FileReaders.h"

namespace keepsakes {

namespace {

/// Of a folder that is searched for places alone, only those count.
class NamedPlacesOnly final : public LocationSink {
  public:
    explicit NamedPlacesOnly(LocationSink& places) : places_(places) {}
    void point(const TrackPoint&) override {}
    void visit(StatedVisit) override {}
    void place(NamedPlace place) override { places_.place(std::move(place)); }

  private:
    LocationSink& places_;
};

std::expected<FileRecords, std::string> readTracks(int fd, FileKind kind,
                                                   const ReaderContext& context,
                                                   LocationSink& places) {
    switch (kind) {
        case FileKind::track:
            return readTrackFile(fd, context, places);
        case FileKind::fit:
            return readFitFile(fd, context, places);
        case FileKind::ownTracks:
            return readOwnTracksFile(fd, context, places);
        case FileKind::locationHistory:
            return readLocationHistoryFile(fd, context, places);
        case FileKind::geoJson:
            return readGeoJsonFile(fd, context, places);
        case FileKind::unknown:
        case FileKind::photo:
            break;
    }
    return FileRecords();
}

bool tellsOfPlaces(FileKind kind) { return kind != FileKind::unknown && kind != FileKind::photo; }

}  // namespace

std::expected<std::optional<FileRecords>, std::string> ContentReader::read(int fd, int wanted,
                                                                           KSDate now,
                                                                           LocationSink& places) {
    std::array<std::byte, kHeadSize> head{};
    std::size_t filled = 0;
    while (filled < head.size()) {
        const auto count =
            ::pread(fd, head.data() + filled, head.size() - filled, static_cast<off_t>(filled));
        if (count < 0 && errno == EINTR) continue;
        if (count < 0) return std::unexpected(std::generic_category().message(errno));
        if (count == 0) break;
        filled += static_cast<std::size_t>(count);
    }
    const auto kind = kindOf(std::span(head).first(filled));
    const ReaderContext context{.now = now};
    if (tellsOfPlaces(kind) && (wanted & kWantsTracks) != 0) {
        return readTracks(fd, kind, context, places);
    }
    if (tellsOfPlaces(kind) && (wanted & kWantsPlaces) != 0) {
        NamedPlacesOnly named(places);
        const auto read = readTracks(fd, kind, context, named);
        if (!read) return std::unexpected(read.error());
        return FileRecords();
    }
    if (kind == FileKind::photo && (wanted & kWantsPhotos) != 0) {
        return readPhotoFile(fd, context);
    }
    return std::nullopt;
}

}  // namespace keepsakes
