// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <mutex>
#include <string>
#include <string_view>
#include <vector>

namespace keepsakes {

/// What the owner should know, a line each, newest first, at most 50; the same line is held once.
/// Shared by the whole daemon; any thread may call it.
class Problems {
  public:
    static constexpr std::size_t kMost = 50;

    void add(std::string_view line);
    std::vector<std::string> list() const;

  private:
    mutable std::mutex mutex_;
    std::vector<std::string> newestFirst_;
};

}  // namespace keepsakes
