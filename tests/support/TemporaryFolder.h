// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <string_view>

namespace keepsakes {

/// A folder of the test's own, removed with all it holds when the test ends.
class TemporaryFolder {
  public:
    TemporaryFolder();
    ~TemporaryFolder();
    TemporaryFolder(const TemporaryFolder&) = delete;
    TemporaryFolder& operator=(const TemporaryFolder&) = delete;

    const std::filesystem::path& path() const { return path_; }
    std::filesystem::path operator/(std::string_view name) const { return path_ / name; }

    /// Writes a file below the folder, making the folders above it.
    std::filesystem::path write(std::string_view name, std::string_view content) const;

  private:
    std::filesystem::path path_;
};

}  // namespace keepsakes
