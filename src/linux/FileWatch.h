// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <map>
#include <set>
#include <string>

namespace keepsakes {

/// Tells that a file may have changed: written, replaced, removed or made. It watches the file's
/// folder, since editors replace files, and where the file is a link also what that leads to. Used
/// by one thread at a time.
class FileWatch final {
  public:
    /// What cannot be watched is logged. The folder need not exist yet; the nearest one above it is
    /// watched then.
    explicit FileWatch(std::filesystem::path file);
    ~FileWatch();
    FileWatch(const FileWatch&) = delete;
    FileWatch& operator=(const FileWatch&) = delete;

    /// Readable when there is something to `take`; -1 where nothing can be watched.
    int descriptor() const { return descriptor_; }

    /// Whether the file may have changed since the last call. Follows it to another folder.
    bool take();

  private:
    void watchAll();
    void watch(const std::filesystem::path& path);

    const std::filesystem::path file_;
    const int descriptor_;
    /// By watch: the names in that folder that matter.
    std::map<int, std::set<std::string>> names_;
};

}  // namespace keepsakes
