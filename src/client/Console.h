// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <memory>
#include <string>
#include <string_view>

#include "client/ConduitClient.h"
#include "client/Terminal.h"

namespace keepsakes {

/// What every command of keepsakesctl ends with.
enum ExitStatus : int { kDone = 0, kAnsweredError = 1, kUsage = 2, kNoDaemon = 3 };

/// One run of keepsakesctl: where it writes and whom it asks.
class Console {
  public:
    explicit Console(bool json) : json_(json) {}

    bool json() const { return json_; }
    const Screen& screen() const { return screen_; }

    /// Writes to standard output; `kDone`, or `kAnsweredError` when it cannot be written.
    int print(std::string_view text) const;

    /// Says on standard error what went wrong; the exit status that belongs to it.
    int fail(const KSError& error) const;
    int usage(std::string_view text) const;

    /// Connected, with a progress line when standard error is a terminal.
    std::expected<std::unique_ptr<ConduitClient>, KSError> connect() const;
    void endProgress() const;

  private:
    const bool json_;
    const Screen screen_ = Screen::ofStandardOutput();
};

/// The content of a file, or of standard input for "-"; at most 1 GiB.
std::expected<std::string, KSError> readInput(const std::string& path);

}  // namespace keepsakes
