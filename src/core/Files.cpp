// SPDX-License-Identifier: Apache-2.0
#include "core/Files.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <system_error>

namespace keepsakes {

namespace {

/// Owns a file descriptor.
class Descriptor {
  public:
    explicit Descriptor(int fd) : fd_(fd) {}
    ~Descriptor() {
        if (fd_ >= 0) ::close(fd_);
    }
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    int get() const { return fd_; }

  private:
    int fd_;
};

bool writeAll(int fd, std::string_view content) {
    while (!content.empty()) {
        const auto written = ::write(fd, content.data(), content.size());
        if (written < 0 && errno != EINTR) return false;
        if (written > 0) content.remove_prefix(static_cast<std::size_t>(written));
    }
    return true;
}

}  // namespace

KSError posixError(int code, std::string_view what, const std::filesystem::path& path) {
    return KSError::make(
        kPosixErrorDomain, code,
        fmt::format("{} {}: {}", what, path.string(), std::generic_category().message(code)));
}

std::expected<std::string, KSError> readFile(const std::filesystem::path& path,
                                             std::uintmax_t largest) {
    // Without O_NONBLOCK, opening a pipe that somebody left in the folder would wait for ever.
    const Descriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
    if (file.get() < 0) return std::unexpected(posixError(errno, "open", path));
    struct stat info {};
    if (::fstat(file.get(), &info) != 0) return std::unexpected(posixError(errno, "stat", path));
    if (!S_ISREG(info.st_mode)) return std::unexpected(posixError(EINVAL, "not a file:", path));
    if (static_cast<std::uintmax_t>(info.st_size) > largest) {
        return std::unexpected(posixError(EFBIG, "read", path));
    }
    std::string content(static_cast<std::size_t>(info.st_size), '\0');
    std::size_t filled = 0;
    while (filled < content.size()) {
        const auto count = ::read(file.get(), content.data() + filled, content.size() - filled);
        if (count < 0 && errno == EINTR) continue;
        if (count < 0) return std::unexpected(posixError(errno, "read", path));
        if (count == 0) break;
        filled += static_cast<std::size_t>(count);
    }
    content.resize(filled);
    return content;
}

OptionalError replaceFile(const std::filesystem::path& path, std::string_view content) {
    // A name of its own: two writers at once must not mix their contents.
    std::string beside = path.string() + ".XXXXXX";
    {
        const Descriptor file(::mkostemp(beside.data(), O_CLOEXEC));
        if (file.get() < 0) return posixError(errno, "create", beside);
        if (!writeAll(file.get(), content) || ::fsync(file.get()) != 0) {
            const int code = errno;
            ::unlink(beside.c_str());
            return posixError(code, "write", beside);
        }
    }
    if (::rename(beside.c_str(), path.c_str()) != 0) {
        const int code = errno;
        ::unlink(beside.c_str());
        return posixError(code, "replace", path);
    }
    return std::nullopt;
}

OptionalError makePrivateFolder(const std::filesystem::path& path) {
    int failed = ::mkdir(path.c_str(), 0700) == 0 ? 0 : errno;
    if (failed == ENOENT && path.has_relative_path()) {
        if (auto error = makePrivateFolder(path.parent_path())) return error;
        failed = ::mkdir(path.c_str(), 0700) == 0 ? 0 : errno;
    }
    if (failed != 0 && failed != EEXIST) return posixError(failed, "create", path);
    std::error_code error;
    if (!std::filesystem::is_directory(path, error)) return posixError(ENOTDIR, "use", path);
    return std::nullopt;
}

}  // namespace keepsakes
