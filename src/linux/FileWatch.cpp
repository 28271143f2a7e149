// SPDX-License-Identifier: Apache-2.0
#include "linux/FileWatch.h"

#include <fmt/format.h>
#include <sys/inotify.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <system_error>
#include <utility>

#include "core/Log.h"

namespace keepsakes {

namespace {

constexpr std::uint32_t kChanges = IN_CLOSE_WRITE | IN_MOVED_FROM | IN_MOVED_TO | IN_CREATE |
                                   IN_DELETE | IN_DELETE_SELF | IN_MOVE_SELF | IN_ONLYDIR;
/// Said of the folder itself, or of the watch: everything has to be looked at again.
constexpr std::uint32_t kFolderChanges =
    IN_DELETE_SELF | IN_MOVE_SELF | IN_IGNORED | IN_UNMOUNT | IN_Q_OVERFLOW;
constexpr int kMostLinks = 16;

}  // namespace

FileWatch::FileWatch(std::filesystem::path file)
    : file_(std::move(file)), descriptor_(::inotify_init1(IN_CLOEXEC | IN_NONBLOCK)) {
    if (descriptor_ < 0) {
        logWarning(fmt::format("changes of {} are not seen: {}", file_.string(),
                               std::generic_category().message(errno)));
        return;
    }
    watchAll();
}

FileWatch::~FileWatch() {
    if (descriptor_ >= 0) ::close(descriptor_);
}

void FileWatch::watchAll() {
    auto before = std::exchange(names_, {});
    std::error_code error;
    auto path = std::filesystem::absolute(file_, error);
    for (int link = 0; link < kMostLinks; ++link) {
        watch(path);
        const auto target = std::filesystem::read_symlink(path, error);
        if (error) break;
        path = (path.parent_path() / target).lexically_normal();
    }
    for (const auto& [number, names] : before) {
        if (!names_.contains(number)) ::inotify_rm_watch(descriptor_, number);
    }
}

void FileWatch::watch(const std::filesystem::path& path) {
    auto name = path.filename();
    auto folder = path.parent_path();
    while (true) {
        const int number = ::inotify_add_watch(descriptor_, folder.c_str(), kChanges);
        if (number >= 0) {
            names_[number].insert(name.string());
            return;
        }
        if (errno != ENOENT || !folder.has_relative_path()) break;
        name = folder.filename();
        folder = folder.parent_path();
    }
    logWarning(fmt::format("changes of {} are not seen: {}", path.string(),
                           std::generic_category().message(errno)));
}

bool FileWatch::take() {
    bool isChanged = false;
    alignas(inotify_event) std::array<char, 4096> buffer{};
    ssize_t length = 0;
    while ((length = ::read(descriptor_, buffer.data(), buffer.size())) > 0) {
        for (std::size_t at = 0; at < static_cast<std::size_t>(length);) {
            inotify_event event{};
            std::memcpy(&event, buffer.data() + at, sizeof event);
            const char* name = event.len > 0 ? buffer.data() + at + sizeof event : "";
            at += sizeof event + event.len;
            const auto known = names_.find(event.wd);
            if (known == names_.end() && (event.mask & IN_Q_OVERFLOW) == 0) continue;
            isChanged =
                isChanged || (event.mask & kFolderChanges) != 0 || known->second.contains(name);
        }
    }
    if (isChanged) watchAll();
    return isChanged;
}

}  // namespace keepsakes
