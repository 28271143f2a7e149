// SPDX-License-Identifier: Apache-2.0
#include "indexer/ContentReader.h"

#include <unistd.h>

#include <array>
#include <cerrno>
#include <system_error>

#include "readers/FileReaders.h"

namespace keepsakes {

std::expected<std::optional<FileRecords>, std::string> ContentReader::read(int fd, int wanted,
                                                                           KSDate now) {
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
    if (kind == FileKind::track && (wanted & kWantsTracks) != 0) {
        return readTrackFile(fd, context);
    }
    if (kind == FileKind::photo && (wanted & kWantsPhotos) != 0) {
        return readPhotoFile(fd, context);
    }
    return std::nullopt;
}

}  // namespace keepsakes
