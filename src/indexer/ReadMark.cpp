// SPDX-License-Identifier: Apache-2.0
#include "indexer/ReadMark.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/file.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstdio>
#include <fstream>
#include <limits>
#include <system_error>

namespace keepsakes {

namespace {

// The mark's form: cause ('c' or 't'), boot id, size, mtime, inode, a line each, then the path,
// which may hold any byte but the last. The cause is first so that a signal handler can write it.
constexpr std::size_t kLongestMark = 8192;

/// For the signal handlers; -1 while there is no mark.
volatile sig_atomic_t markDescriptor = -1;

void stopInOrder(int) {
    if (markDescriptor >= 0) (void)!::ftruncate(markDescriptor, 0);
    ::_exit(ReadMark::kStoppedStatus);
}

void outOfTime(int signal) {
    if (markDescriptor >= 0) (void)!::pwrite(markDescriptor, "t", 1, 0);
    std::signal(signal, SIG_DFL);
    std::raise(signal);
}

std::string currentBootId() {
    std::string id;
    std::ifstream in("/proc/sys/kernel/random/boot_id");
    std::getline(in, id);
    return id;
}

std::optional<ReadMarkEntry> parseMark(const std::string& text, const std::string& bootId) {
    std::array<std::string, 5> lines;
    std::size_t at = 0;
    for (auto& line : lines) {
        const auto end = text.find('\n', at);
        if (end == std::string::npos) return std::nullopt;
        line = text.substr(at, end - at);
        at = end + 1;
    }
    if (lines[1] != bootId || at >= text.size()) return std::nullopt;
    try {
        return ReadMarkEntry{.path = text.substr(at),
                             .stamp = {.size = std::stoll(lines[2]),
                                       .mtime = std::stoll(lines[3]),
                                       .inode = std::stoll(lines[4])},
                             .outOfTime = lines[0] == "t"};
    } catch (const std::logic_error&) {
        return std::nullopt;
    }
}

}  // namespace

std::expected<std::unique_ptr<ReadMark>, std::string> ReadMark::take(
    const std::filesystem::path& path, unsigned secondsPerFile) {
    const int fd = ::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600);
    if (fd < 0) {
        return std::unexpected(fmt::format("cannot write {}: {}", path.string(),
                                           std::generic_category().message(errno)));
    }
    if (::flock(fd, LOCK_EX | LOCK_NB) != 0) {
        ::close(fd);
        return std::unexpected(fmt::format("another scan holds {}", path.string()));
    }
    return std::unique_ptr<ReadMark>(new ReadMark(fd, secondsPerFile));
}

ReadMark::ReadMark(int fd, unsigned secondsPerFile)
    : fd_(fd), secondsPerFile_(secondsPerFile), bootId_(currentBootId()) {
    std::string text(kLongestMark, '\0');
    const auto count = ::pread(fd_, text.data(), text.size(), 0);
    text.resize(count > 0 ? static_cast<std::size_t>(count) : 0);
    leftBehind_ = parseMark(text, bootId_);
    markDescriptor = fd_;
    struct sigaction action {};
    action.sa_handler = stopInOrder;
    ::sigaction(SIGTERM, &action, nullptr);
    ::sigaction(SIGINT, &action, nullptr);
    action.sa_handler = outOfTime;
    ::sigaction(SIGALRM, &action, nullptr);
}

ReadMark::~ReadMark() {
    for (const int signal : {SIGTERM, SIGINT, SIGALRM}) std::signal(signal, SIG_DFL);
    markDescriptor = -1;
    ::close(fd_);
}

void ReadMark::begin(const std::string& path, const FileStamp& stamp) {
    const auto text =
        fmt::format("c\n{}\n{}\n{}\n{}\n{}", bootId_, stamp.size, stamp.mtime, stamp.inode, path);
    (void)!::pwrite(fd_, text.data(), text.size(), 0);
    (void)!::ftruncate(fd_, static_cast<off_t>(text.size()));
    constexpr std::int64_t kMostSeconds = 3600;
    ::alarm(secondsPerFile_ +
            static_cast<unsigned>(std::min(stamp.size / kBytesPerSecond, kMostSeconds)));
}

// NOLINTNEXTLINE(readability-make-member-function-const): it changes the process' alarm
void ReadMark::goOn() { ::alarm(secondsPerFile_); }

// NOLINTNEXTLINE(readability-make-member-function-const): it changes the file
void ReadMark::end() {
    ::alarm(0);
    (void)!::ftruncate(fd_, 0);
}

}  // namespace keepsakes
