// SPDX-License-Identifier: Apache-2.0
#include "client/Console.h"

#include <fmt/format.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>

#include "core/Files.h"

namespace keepsakes {

namespace {

constexpr std::size_t kLargestInput = std::size_t{1} << 30;

void showProgress(std::string_view activity, std::uint64_t done, std::uint64_t total) {
    const auto count = total ? fmt::format("{} of {}", done, total) : fmt::format("{}", done);
    fmt::print(stderr, "\r\033[K{}: {}", printable(activity), count);
}

}  // namespace

int Console::print(std::string_view text) const {
    const bool written = std::fwrite(text.data(), 1, text.size(), stdout) == text.size();
    if (written && std::fflush(stdout) == 0) return kDone;
    return fail(posixError(errno, "cannot write to", "standard output"));
}

int Console::fail(const KSError& error) const {
    endProgress();
    if (meansNoDaemon(error)) {
        fmt::print(stderr, "keepsakesctl: no daemon: {}\n", printable(error.description()));
        return kNoDaemon;
    }
    fmt::print(stderr, "keepsakesctl: {}\n", printable(error.description()));
    return kAnsweredError;
}

int Console::usage(std::string_view text) const {
    fmt::print(stderr, "keepsakesctl: {}\n", printable(text));
    return kUsage;
}

std::expected<std::unique_ptr<ConduitClient>, KSError> Console::connect() const {
    auto client = ConduitClient::connect();
    if (client && isatty(STDERR_FILENO)) (*client)->setProgressHandler(showProgress);
    return client;
}

void Console::endProgress() const {
    if (isatty(STDERR_FILENO)) fmt::print(stderr, "\r\033[K");
}

std::expected<std::string, KSError> readInput(const std::string& path) {
    if (path != "-") return readFile(path, kLargestInput);
    std::string text;
    std::array<char, 65536> piece{};
    while (const auto count = std::fread(piece.data(), 1, piece.size(), stdin)) {
        text.append(piece.data(), count);
        if (text.size() > kLargestInput) {
            return std::unexpected(posixError(EFBIG, "cannot read", "standard input"));
        }
    }
    if (std::ferror(stdin))
        return std::unexpected(posixError(errno, "cannot read", "standard input"));
    return text;
}

}  // namespace keepsakes
