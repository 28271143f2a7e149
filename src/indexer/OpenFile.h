// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <optional>
#include <string>

#include "indexer/ReadMark.h"

namespace keepsakes {

/// A file of the owner's, open for reading; not a link.
class OpenFile {
  public:
    explicit OpenFile(const std::string& path)
        // Without O_NONBLOCK, a pipe that took the file's place would be waited for.
        : fd_(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK)),
          error_(fd_ < 0 ? errno : 0) {}
    ~OpenFile() {
        if (fd_ >= 0) ::close(fd_);
    }
    OpenFile(const OpenFile&) = delete;
    OpenFile& operator=(const OpenFile&) = delete;

    int get() const { return fd_; }
    int error() const { return error_; }

    /// Nothing for what is no regular file.
    std::optional<FileStamp> stamp() const {
        struct stat info {};
        if (fd_ < 0 || ::fstat(fd_, &info) != 0 || !S_ISREG(info.st_mode)) return std::nullopt;
        return FileStamp{
            .size = info.st_size,
            .mtime = std::int64_t{info.st_mtim.tv_sec} * 1'000'000'000 + info.st_mtim.tv_nsec,
            .inode = static_cast<std::int64_t>(info.st_ino)};
    }

  private:
    int fd_;
    int error_;
};

}  // namespace keepsakes
