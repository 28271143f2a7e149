// SPDX-License-Identifier: Apache-2.0
#include "linux/AnalyticsLog.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <optional>
#include <utility>

#include "core/Clock.h"
#include "core/Files.h"
#include "core/Json.h"
#include "core/Log.h"

namespace keepsakes {

namespace {

bool isPowerOfTen(std::uint64_t number) {
    while (number % 10 == 0 && number > 0) number /= 10;
    return number == 1;
}

}  // namespace

AnalyticsLog::AnalyticsLog(std::filesystem::path file, const Clock& clock)
    : file_(std::move(file)), clock_(clock), queue_("analytics log") {}

AnalyticsLog::~AnalyticsLog() {
    queue_.sync([this] { closeFile(); });
    if (dropped() > 0) logWarning(fmt::format("{} analytics events were dropped", dropped()));
}

void AnalyticsLog::send(std::string_view event, const KSDictionary& fields) {
    auto line = jsonText(
        KSDictionary{{"time", clock_.now().seconds}, {"event", event}, {"fields", fields}});
    if (!line) {
        drop(fmt::format("{} holds what JSON cannot", event));
        return;
    }
    *line += '\n';
    const auto size = line->size();
    if (size > kLongestLine) {
        drop(fmt::format("{} is {} bytes long", event, size));
        return;
    }
    if (backlog_.fetch_add(size) + size > kLargestBacklog) {
        backlog_ -= size;
        drop("the disk does not keep up");
        return;
    }
    queue_.async([this, line = std::move(*line)] {
        write(line);
        backlog_ -= line.size();
    });
}

void AnalyticsLog::flush() {
    queue_.sync([] {});
}

void AnalyticsLog::drop(const std::string& reason) {
    const auto count = ++dropped_;
    if (!dropping_.exchange(true) || isPowerOfTen(count)) {
        logWarning(fmt::format("analytics events are dropped: {}; {} so far", reason, count));
    }
}

void AnalyticsLog::write(const std::string& line) {
    if (auto error = append(line)) {
        closeFile();
        drop(error->description());
    } else if (dropping_.exchange(false)) {
        logInfo(fmt::format("analytics events are kept again; {} were dropped", dropped()));
    }
}

OptionalError AnalyticsLog::openFile() {
    if (auto error = makePrivateFolder(file_.parent_path())) return error;
    // Without O_NONBLOCK, opening a pipe that somebody left there would wait for ever.
    descriptor_ = ::open(file_.c_str(), O_RDWR | O_CREAT | O_APPEND | O_CLOEXEC | O_NONBLOCK, 0600);
    struct stat info {};
    if (descriptor_ < 0 || ::fstat(descriptor_, &info) != 0)
        return posixError(errno, "open", file_);
    if (!S_ISREG(info.st_mode)) return posixError(EINVAL, "not a file:", file_);
    return removeHalfLine(static_cast<std::uint64_t>(info.st_size));
}

/// What a power cut left of a line would spoil the next one.
OptionalError AnalyticsLog::removeHalfLine(std::uint64_t size) {
    std::string tail(std::min<std::uint64_t>(size, kLongestLine), '\0');
    const auto start = size - tail.size();
    const auto count = ::pread(descriptor_, tail.data(), tail.size(), static_cast<off_t>(start));
    if (!std::cmp_equal(count, tail.size())) return posixError(EIO, "read", file_);
    const auto newline = tail.rfind('\n');
    const auto end = newline == std::string::npos ? start : start + newline + 1;
    if (end != size && ::ftruncate(descriptor_, static_cast<off_t>(end)) != 0) {
        return posixError(errno, "mend", file_);
    }
    return std::nullopt;
}

OptionalError AnalyticsLog::append(const std::string& line) {
    struct stat named {};
    struct stat info {};
    if (descriptor_ >= 0 && (::stat(file_.c_str(), &named) != 0 ||
                             ::fstat(descriptor_, &info) != 0 || named.st_ino != info.st_ino)) {
        closeFile();  // the owner moved or removed it
    }
    if (descriptor_ < 0) {
        if (auto error = openFile()) return error;
    }
    if (::fstat(descriptor_, &info) != 0) return posixError(errno, "stat", file_);
    const auto size = static_cast<std::uint64_t>(info.st_size);
    if (size > 0 && size + line.size() > kLargestFile) {
        auto old = file_;
        old += ".1";
        if (::rename(file_.c_str(), old.c_str()) != 0) return posixError(errno, "rotate", file_);
        closeFile();
        return append(line);
    }
    const auto written = ::write(descriptor_, line.data(), line.size());
    if (std::cmp_equal(written, line.size())) return std::nullopt;
    const int code = written < 0 ? errno : ENOSPC;
    // Half a line would spoil the next one.
    if (written > 0 && ::ftruncate(descriptor_, info.st_size) != 0) {
        return posixError(errno, "mend", file_);
    }
    return posixError(code, "write", file_);
}

void AnalyticsLog::closeFile() {
    if (descriptor_ >= 0) ::close(std::exchange(descriptor_, -1));
}

}  // namespace keepsakes
