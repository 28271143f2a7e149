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
        default:
            break;
    }
    return FileRecords();
}

bool tellsOfPlaces(FileKind kind) {
    return kind == FileKind::track || kind == FileKind::fit || kind == FileKind::ownTracks ||
           kind == FileKind::locationHistory || kind == FileKind::geoJson;
}

/// Hands the places of contacts on, too.
class ContactPlaces final : public PeopleSink {
  public:
    ContactPlaces(PeopleSink& people, LocationSink& places) : people_(people), places_(places) {}
    void interaction(const InteractionRecord& record) override { people_.interaction(record); }
    void link(const LinkRecord& link) override { people_.link(link); }
    void card(const ContactCard& card) override {
        people_.card(card);
        if (!card.position || card.name.empty()) return;
        places_.place({.position = *card.position,
                       .name = card.name,
                       .use = PlaceUse::unknown,
                       .origin = NamedPlace::Origin::contact});
    }
    void ownerHandle(const std::string& handle) override { people_.ownerHandle(handle); }

  private:
    PeopleSink& people_;
    LocationSink& places_;
};

using Answer = std::expected<std::optional<FileRecords>, std::string>;

/// Everything of such a file went to the sink.
Answer streamed(const std::expected<void, std::string>& done) {
    if (!done) return std::unexpected(done.error());
    return FileRecords();
}

Answer readPeople(FileKind kind, int fd, const ReaderContext& context, PeopleSink& people) {
    switch (kind) {
        case FileKind::mail:
            return streamed(readMailFile(fd, context, people));
        case FileKind::mailbox:
            return streamed(readMailboxFile(fd, context, people));
        case FileKind::messageBackup:
            return streamed(readMessageBackupFile(fd, context, people));
        case FileKind::chatHistory: {
            const auto isChattys = readChatHistoryFile(context, people);
            if (!isChattys) return std::unexpected(isChattys.error());
            return *isChattys ? std::optional(FileRecords()) : std::nullopt;
        }
        default:
            return std::nullopt;
    }
}

}  // namespace

Answer ContentReader::read(int fd, int wanted, const ReaderContext& context, LocationSink& places,
                           PeopleSink& people) {
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
    if (kind == FileKind::calendar && (wanted & kWantsCalendars) != 0) {
        return readCalendarFile(fd, context);
    }
    if (kind == FileKind::contacts && (wanted & kWantsContacts) != 0) {
        ContactPlaces both(people, places);
        return streamed(readContactFile(fd, context, both));
    }
    if ((wanted & kWantsMessages) != 0) return readPeople(kind, fd, context, people);
    return std::nullopt;
}

}  // namespace keepsakes
