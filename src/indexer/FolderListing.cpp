// SPDX-License-Identifier: Apache-2.0
#include "indexer/FolderListing.h"

#include <dirent.h>
#include <fcntl.h>
#include <fmt/format.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <memory>

namespace keepsakes {

namespace {

constexpr std::string_view kLogSuffix = "-wal";

FileStamp stampOf(const struct stat& info) {
    return {.size = info.st_size,
            .mtime = std::int64_t{info.st_mtim.tv_sec} * 1'000'000'000 + info.st_mtim.tv_nsec,
            .inode = static_cast<std::int64_t>(info.st_ino)};
}

/// How many bytes at the start of `text` are one character of UTF-8 (RFC 3629); 0 for none.
std::size_t characterLength(std::string_view text) {
    const auto byte = [text](std::size_t i) { return static_cast<unsigned char>(text[i]); };
    const unsigned char first = byte(0);
    if (first < 0x80) return 1;
    const std::size_t length = first >= 0xf0 ? 4 : first >= 0xe0 ? 3 : first >= 0xc2 ? 2 : 0;
    if (length == 0 || first > 0xf4 || text.size() < length) return 0;
    for (std::size_t i = 1; i < length; ++i) {
        if ((byte(i) & 0xc0) != 0x80) return 0;
    }
    const unsigned char second = byte(1);
    const bool isOverlong = (first == 0xe0 && second < 0xa0) || (first == 0xf0 && second < 0x90);
    const bool isOutside = (first == 0xed && second > 0x9f) || (first == 0xf4 && second > 0x8f);
    return isOverlong || isOutside ? 0 : length;
}

FileStamp joined(FileStamp stamp, const FileStamp& log) {
    return {.size = stamp.size + log.size,
            .mtime = std::max(stamp.mtime, log.mtime),
            .inode = stamp.inode};
}

/// Takes away what databases keep beside themselves; their logs go into their stamps.
void joinLogs(std::vector<ListedFile>& files) {
    const auto isBesideName = [](const ListedFile& file) {
        return file.name.ends_with(kLogSuffix) || file.name.ends_with("-shm") ||
               file.name.ends_with("-journal");
    };
    if (std::ranges::none_of(files, isBesideName)) return;
    const auto mainFile = [&files](std::string_view name) -> ListedFile* {
        for (const std::string_view end :
             {kLogSuffix, std::string_view("-shm"), std::string_view("-journal")}) {
            if (!name.ends_with(end)) continue;
            const auto main = name.substr(0, name.size() - end.size());
            const auto found = std::ranges::lower_bound(files, main, {}, &ListedFile::name);
            return found != files.end() && found->name == main ? &*found : nullptr;
        }
        return nullptr;
    };
    for (const auto& file : files) {
        if (!file.name.ends_with(kLogSuffix)) continue;
        if (auto* main = mainFile(file.name)) main->stamp = joined(main->stamp, file.stamp);
    }
    std::vector<ListedFile> kept;
    for (const auto& file : files) {
        if (!isBesideName(file) || !mainFile(file.name)) kept.push_back(file);
    }
    files = std::move(kept);
}

}  // namespace

std::expected<FolderListing, int> listFolder(const std::string& path) {
    const int fd = ::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (fd < 0) return std::unexpected(errno);
    const std::unique_ptr<DIR, int (*)(DIR*)> folder(::fdopendir(fd), ::closedir);
    if (!folder) {
        const int code = errno;
        ::close(fd);
        return std::unexpected(code);
    }
    struct stat info {};
    if (::fstat(fd, &info) != 0) return std::unexpected(errno);
    FolderListing listing;
    listing.identity = {info.st_dev, info.st_ino};
    for (;;) {
        errno = 0;
        // NOLINTNEXTLINE(concurrency-mt-unsafe): the stream is this function's own
        const dirent* entry = ::readdir(folder.get());
        if (!entry) {
            if (errno != 0) return std::unexpected(errno);
            break;
        }
        const std::string_view name(entry->d_name);
        if (name == "." || name == ".." || isPassedOver(name)) continue;
        if (entry->d_type == DT_DIR) {
            listing.folders.emplace_back(name);
            continue;
        }
        if (entry->d_type != DT_REG && entry->d_type != DT_UNKNOWN) continue;
        if (::fstatat(fd, entry->d_name, &info, AT_SYMLINK_NOFOLLOW) != 0) continue;
        if (S_ISDIR(info.st_mode)) listing.folders.emplace_back(name);
        if (S_ISREG(info.st_mode)) {
            listing.files.push_back({.name = std::string(name), .stamp = stampOf(info)});
        }
    }
    std::ranges::sort(listing.files, {}, &ListedFile::name);
    std::ranges::sort(listing.folders);
    joinLogs(listing.files);
    const auto has = [&listing](std::string_view name) {
        return std::ranges::binary_search(listing.folders, name);
    };
    if (has("cur") && has("new")) std::erase(listing.folders, "tmp");
    return listing;
}

FileStamp withLog(const std::string& path, FileStamp stamp) {
    struct stat info {};
    const auto log = path + std::string(kLogSuffix);
    if (::lstat(log.c_str(), &info) != 0 || !S_ISREG(info.st_mode)) return stamp;
    return joined(stamp, stampOf(info));
}

bool isPassedOver(std::string_view name) {
    static constexpr std::array<std::string_view, 3> kSuffixes{".part", ".crdownload", ".tmp"};
    static constexpr std::array<std::string_view, 4> kPrefixes{".trashed-", ".syncthing.",
                                                               "~syncthing~", ".Trash"};
    static constexpr std::array<std::string_view, 3> kNames{".stversions", ".stfolder",
                                                            ".thumbnails"};
    return std::ranges::any_of(kSuffixes, [name](auto end) { return name.ends_with(end); }) ||
           std::ranges::any_of(kPrefixes, [name](auto start) { return name.starts_with(start); }) ||
           std::ranges::find(kNames, name) != kNames.end();
}

std::string escaped(std::string_view text) {
    std::string line;
    line.reserve(text.size());
    while (!text.empty()) {
        const auto byte = static_cast<unsigned char>(text.front());
        const auto length = characterLength(text);
        if (length == 0 || byte < 0x20 || byte == 0x7f) {
            line += fmt::format("\\x{:02x}", byte);
            text.remove_prefix(1);
        } else {
            line += text.substr(0, length);
            text.remove_prefix(length);
        }
    }
    return line;
}

}  // namespace keepsakes
