// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <filesystem>
#include <functional>
#include <optional>
#include <set>
#include <string>
#include <unordered_set>
#include <vector>

#include "indexer/IndexWriter.h"

namespace keepsakes {

/// A file to be read: new, or not as the index knows it.
struct ChangedFile {
    std::uint32_t folder;  ///< Into `FolderChanges::folders`.
    int wanted;
    std::string name;
    FileStamp stamp;
    std::int64_t knownId = 0;                ///< 0 for a file that is new at its path.
    std::optional<std::string> knownReason;  ///< Why it was passed over until now.
};

/// A file of the index that is gone from its path.
struct VanishedFile {
    std::int64_t folder;
    std::string name;
    IndexedFile file;
};

/// How the owner's folders differ from the index.
struct FolderChanges {
    std::vector<std::string> folders;  ///< Paths of those that hold changed files.
    std::vector<ChangedFile> changed;
    std::vector<VanishedFile> vanished;
    std::vector<std::string> problems;
};

struct SearchedFolder {
    std::string path;
    int wanted;
    bool mayBeMissing = false;  ///< That there is none is no problem, unless there was one.
};

/// Walks the folders and compares what is there with what the index knows, a folder at a time.
/// `alive` is called for each folder. Each folder is visited once, however many ways lead to it;
/// one that lies in another is searched for what both are.
FolderChanges compareFolders(IndexWriter& index, std::vector<SearchedFolder> searched,
                             const std::function<void()>& alive);

}  // namespace keepsakes
