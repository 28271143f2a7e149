// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <expected>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "indexer/ReadMark.h"

namespace keepsakes {

struct ListedFile {
    std::string name;
    FileStamp stamp;
};

/// One folder's regular files and folders, each by name. Links, pipes, sockets and devices are
/// passed over, and so are the names that syncing tools and trash cans leave (`isPassedOver`) and
/// the folder of a Maildir in which mails are still being written.
struct FolderListing {
    std::vector<ListedFile> files;
    std::vector<std::string> folders;
    std::pair<std::uint64_t, std::uint64_t> identity;  ///< Device and inode of the folder.
};

/// Fails with an errno. A file that vanishes meanwhile is not in the list.
std::expected<FolderListing, int> listFolder(const std::string& path);

/// The stamp of a file together with the log that a database keeps beside it ("<name>-wal"): what
/// changes a live database is its log. `listFolder` gives such stamps, and lists neither logs nor
/// their indexes and journals as files of their own.
FileStamp withLog(const std::string& path, FileStamp stamp);

/// Unfinished downloads, deleted files kept for a while, old versions, thumbnails.
bool isPassedOver(std::string_view name);

/// A path or another text of strangers as one line of UTF-8: control characters and bytes that are
/// not UTF-8 become \xHH.
std::string escaped(std::string_view text);

}  // namespace keepsakes
