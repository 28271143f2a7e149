// SPDX-License-Identifier: Apache-2.0
#include "indexer/FolderWalk.h"

#include <fmt/format.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <map>
#include <system_error>

#include "indexer/FolderListing.h"
#include "indexer/FolderScan.h"

namespace keepsakes {

namespace {

using Identity = std::pair<std::uint64_t, std::uint64_t>;

class Walk {
  public:
    Walk(IndexWriter& index, const std::function<void()>& alive)
        : index_(index), alive_(alive), unvisited_(index.folders()) {}

    FolderChanges run(std::vector<SearchedFolder> searched) {
        // A folder before those that lie in it.
        std::ranges::stable_sort(searched, {}, [](const auto& f) { return f.path.size(); });
        for (const auto& root : searched) {
            struct stat info {};
            if (::stat(root.path.c_str(), &info) == 0) {
                wanted_[{info.st_dev, info.st_ino}] |= root.wanted;
            }
        }
        for (auto& root : searched) {
            pending_.push_back({.path = std::move(root.path),
                                .wanted = root.wanted,
                                .depth = 0,
                                .mayBeMissing = root.mayBeMissing});
            while (!pending_.empty()) {
                const auto next = std::move(pending_.back());
                pending_.pop_back();
                visit(next);
            }
        }
        collectUnvisited();
        return std::move(changes_);
    }

  private:
    struct Pending {
        std::string path;
        int wanted;
        std::size_t depth;
        bool mayBeMissing = false;
    };

    void visit(const Pending& folder) {
        alive_();
        const auto listing = listFolder(folder.path);
        if (!listing) {
            // Inside a folder that was just listed, "not there" means deleted.
            if (listing.error() == ENOENT && folder.depth > 0) return;
            if (listing.error() == ENOENT && folder.mayBeMissing && !isKnown(folder.path)) return;
            keep(folder.path, std::generic_category().message(listing.error()));
            return;
        }
        if (!visited_.insert(listing->identity).second) return;
        int wanted = folder.wanted;
        if (const auto own = wanted_.find(listing->identity); own != wanted_.end()) {
            wanted |= own->second;
        }
        compare(folder.path, *listing, wanted);
        for (auto it = listing->folders.rbegin(); it != listing->folders.rend(); ++it) {
            auto path = (folder.path == "/" ? "" : folder.path) + "/" + *it;
            if (folder.depth + 1 > kDeepestFolder || path.size() + NAME_MAX + 2 > PATH_MAX) {
                keep(path, "too deep");
            } else {
                pending_.push_back(
                    {.path = std::move(path), .wanted = wanted, .depth = folder.depth + 1});
            }
        }
    }

    void keep(const std::string& path, const std::string& why) {
        kept_.push_back(path);
        if (changes_.problems.size() < kMostProblems) {
            changes_.problems.push_back(
                fmt::format("cannot search the folder {}: {}", escaped(path), why));
        }
    }

    /// Merges the listing with the folder's rows; both are in the order of the names.
    void compare(const std::string& path, const FolderListing& listing, int wanted) {
        auto there = listing.files.begin();
        std::optional<std::uint32_t> folder;
        const auto add = [this, &folder, &path, wanted](const ListedFile& file,
                                                        const IndexedFile* known) {
            if (!folder) {
                folder = static_cast<std::uint32_t>(changes_.folders.size());
                changes_.folders.push_back(path);
            }
            changes_.changed.push_back({.folder = *folder,
                                        .wanted = wanted,
                                        .name = file.name,
                                        .stamp = file.stamp,
                                        .knownId = known ? known->id : 0,
                                        .knownReason = known ? known->reason : std::nullopt});
        };
        if (const auto known = unvisited_.find(path); known != unvisited_.end()) {
            const auto id = known->second;
            unvisited_.erase(known);
            index_.forEachFile(id, [this, &there, &listing, &add, wanted, id](std::string&& name,
                                                                              IndexedFile&& file) {
                for (; there != listing.files.end() && there->name < name; ++there) {
                    add(*there, nullptr);
                }
                if (there == listing.files.end() || there->name != name) {
                    changes_.vanished.push_back(
                        {.folder = id, .name = std::move(name), .file = std::move(file)});
                    return;
                }
                if (there->stamp != file.stamp || wanted != file.wanted) add(*there, &file);
                ++there;
            });
        }
        for (; there != listing.files.end(); ++there) add(*there, nullptr);
    }

    static bool isWithin(const std::string& path, const std::string& above) {
        return path == above || (path.starts_with(above) && path[above.size()] == '/');
    }

    bool isKept(const std::string& path) const {
        return std::ranges::any_of(
            kept_, [&path](const std::string& above) { return isWithin(path, above); });
    }

    /// Whether the index holds files of the folder.
    bool isKnown(const std::string& above) const {
        return std::ranges::any_of(
            unvisited_, [&above](const auto& folder) { return isWithin(folder.first, above); });
    }

    void collectUnvisited() {
        for (const auto& [path, id] : unvisited_) {
            if (isKept(path)) continue;
            index_.forEachFile(id, [this, id](std::string&& name, IndexedFile&& file) {
                changes_.vanished.push_back(
                    {.folder = id, .name = std::move(name), .file = std::move(file)});
            });
        }
    }

    IndexWriter& index_;
    const std::function<void()>& alive_;
    std::unordered_map<std::string, std::int64_t> unvisited_;
    std::map<Identity, int> wanted_;
    std::set<Identity> visited_;
    std::vector<Pending> pending_;
    std::vector<std::string> kept_;
    FolderChanges changes_;
};

}  // namespace

FolderChanges compareFolders(IndexWriter& index, std::vector<SearchedFolder> searched,
                             const std::function<void()>& alive) {
    return Walk(index, alive).run(std::move(searched));
}

}  // namespace keepsakes
