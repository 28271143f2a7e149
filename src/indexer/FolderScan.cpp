// SPDX-License-Identifier: Apache-2.0
#include "indexer/FolderScan.h"

#include <fmt/format.h>
#include <sqlite3.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <cerrno>
#include <chrono>
#include <new>
#include <system_error>

#include "core/Log.h"
#include "indexer/CalendarRows.h"
#include "indexer/ContentHash.h"
#include "indexer/FolderListing.h"
#include "indexer/FolderWalk.h"
#include "indexer/GazetteerUpdate.h"
#include "indexer/IndexWriter.h"
#include "indexer/LocationWriter.h"
#include "indexer/OccasionUpdate.h"
#include "indexer/OpenFile.h"
#include "indexer/PeopleRows.h"
#include "indexer/PeopleUpdate.h"
#include "indexer/PlaceUpdate.h"
#include "indexer/TripUpdate.h"
#include "indexer/VisitUpdate.h"

namespace keepsakes {

namespace {

using Steady = std::chrono::steady_clock;

/// Stands for the time of change of a file that could not be opened, so that it is tried again: its
/// permissions may change without the file's doing so.
constexpr std::int64_t kTryAgain = -1;

/// After so many bytes a reader gives a sign of going on.
constexpr std::uint64_t kBytesPerSign = std::uint64_t{1} << 20U;

double secondsSince(Steady::time_point then) {
    return std::chrono::duration<double>(Steady::now() - then).count();
}

/// Whether the owner would take a file of this name for one of those that are searched for, so that
/// its content's being none is worth a word. What a file is, its content tells.
bool promises(std::string_view name, int wanted) {
    static constexpr std::array<std::string_view, 5> kTracks{".gpx", ".tcx", ".fit", ".rec",
                                                             ".geojson"};
    static constexpr std::array<std::string_view, 2> kMessages{".eml", ".mbox"};
    static constexpr std::array<std::string_view, 1> kContacts{".vcf"};
    static constexpr std::array<std::string_view, 5> kPhotos{".jpg", ".jpeg", ".png", ".heic",
                                                             ".heif"};
    static constexpr std::array<std::string_view, 1> kCalendars{".ics"};
    const auto dot = name.rfind('.');
    if (dot == std::string_view::npos) return false;
    std::string extension(name.substr(dot));
    for (char& c : extension) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    const auto promised = [wanted, &extension](int kind, const auto& extensions) {
        return (wanted & kind) != 0 && std::ranges::find(extensions, extension) != extensions.end();
    };
    return promised(kWantsTracks | kWantsPlaces, kTracks) || promised(kWantsPhotos, kPhotos) ||
           promised(kWantsMessages, kMessages) || promised(kWantsContacts, kContacts) ||
           promised(kWantsCalendars, kCalendars);
}

struct Refusal {
    RefusalReason reason;
    std::string text;
};

/// What reading one file came to.
struct ReadOutcome {
    FileStamp stamp;
    std::string hash{};
    std::optional<FileRecords> records{};  ///< None: of another kind, or refused.
    std::optional<Refusal> refusal{};
    bool isGone = false;
};

class Scan {
  public:
    Scan(const ScanOptions& options, FileReader& reader, ReadMark& mark, ScanReporter& reporter)
        : options_(options),
          reader_(reader),
          mark_(mark),
          reporter_(reporter),
          index_(options.index),
          locations_(index_, [this] { tell(done_, total_); }),
          people_(index_) {}

    void run() {
        rereadUsedUp(index_, options_.now);
        changes_ = compareFolders(index_, searchedFolders(), [this] { tell(0, 0); });
        condemnMarked();
        moveRenamed();
        removeVanished();
        takeGazetteer();
        commit();
        formRecords();
        readChanged();
        formRecords();
        findPeople();
        if (summary_.changed) {
            index_.removeEmptyFolders();
            commit();
            index_.tidy();
        }
        reportAll();
    }

  private:
    std::vector<SearchedFolder> searchedFolders() const {
        std::vector<SearchedFolder> folders;
        const auto add = [&folders](const std::filesystem::path& path, int wanted) {
            auto text = std::filesystem::absolute(path).lexically_normal().string();
            while (text.size() > 1 && text.ends_with('/')) text.pop_back();
            const auto same = std::ranges::find(folders, text, &SearchedFolder::path);
            if (same == folders.end()) {
                folders.push_back({.path = std::move(text), .wanted = wanted});
            } else {
                same->wanted |= wanted;
            }
        };
        for (const auto& path : options_.tracks) add(path, kWantsTracks);
        for (const auto& path : options_.photos) add(path, kWantsPhotos);
        for (const auto& path : options_.places) add(path, kWantsPlaces);
        for (const auto& path : options_.messages) add(path, kWantsMessages);
        for (const auto& path : options_.contacts) add(path, kWantsContacts);
        for (const auto& path : options_.calendars) add(path, kWantsCalendars);
        for (auto& folder : folders) {
            folder.mayBeMissing = std::ranges::any_of(
                options_.standardFolders,
                [&folder](const auto& standard) { return standard == folder.path; });
        }
        return folders;
    }

    std::string pathOf(const ChangedFile& file) const {
        const auto& folder = changes_.folders[file.folder];
        return (folder == "/" ? "" : folder) + "/" + file.name;
    }

    void tell(std::uint64_t done, std::uint64_t total) {
        if (secondsSince(told_) < 0.25) return;
        told_ = Steady::now();
        reporter_.progress(done, total);
    }

    /// Passes over the file that an earlier scan died of, unless it changed since.
    void condemnMarked() {
        const auto& left = mark_.leftBehind();
        if (!left) return;
        const auto found = std::ranges::find_if(changes_.changed, [this, &left](const auto& file) {
            return file.stamp == left->stamp && pathOf(file) == left->path;
        });
        if (found != changes_.changed.end()) {
            ReadOutcome outcome{.stamp = found->stamp};
            outcome.refusal =
                left->outOfTime
                    ? Refusal{RefusalReason::outOfTime, "reading it took too long"}
                    : Refusal{RefusalReason::endedIndexer, "it ended the indexer that read it"};
            if (found->knownId == 0) found->knownId = index_.newFileId();
            store(*found, outcome, FileState::condemned);
            changes_.changed.erase(found);
        }
        commit();
        mark_.end();
    }

    /// Vanished files by their size.
    using BySize = std::unordered_multimap<std::int64_t, std::size_t>;

    /// A renamed file, such as a mail that was read, has the stamp that it had; it need not even be
    /// opened.
    bool moveSameFile(const ChangedFile& file, BySize& bySize) {
        const auto [first, last] = bySize.equal_range(file.stamp.size);
        const auto same = std::find_if(first, last, [this, &file](const auto& entry) {
            const auto& known = changes_.vanished[entry.second].file;
            return known.stamp == file.stamp && known.wanted == file.wanted;
        });
        if (same == last) return false;
        move(changes_.vanished[same->second], file);
        bySize.erase(same);
        return true;
    }

    /// Gives a changed path the records of a vanished file of the same content.
    void moveRenamed() {
        BySize bySize;
        for (std::size_t i = 0; i < changes_.vanished.size(); ++i) {
            const auto& file = changes_.vanished[i].file;
            if (!file.hash.empty()) bySize.emplace(file.stamp.size, i);
        }
        if (bySize.empty()) return;
        std::erase_if(changes_.changed, [this, &bySize](const ChangedFile& file) {
            if (!bySize.contains(file.stamp.size)) return false;
            if (moveSameFile(file, bySize)) return true;
            const auto path = pathOf(file);
            mark_.begin(path, file.stamp);
            const OpenFile open(path);
            const auto stamp = open.stamp();
            const auto hash = stamp ? contentHash(open.get(), stamp->size) : std::nullopt;
            mark_.end();
            if (!hash || withLog(path, *stamp) != file.stamp) return false;
            const auto [first, last] = bySize.equal_range(stamp->size);
            const auto same = std::find_if(first, last, [this, &hash, &file](const auto& entry) {
                const auto& known = changes_.vanished[entry.second].file;
                return known.hash == *hash && known.wanted == file.wanted;
            });
            if (same == last) return false;
            move(changes_.vanished[same->second], file);
            bySize.erase(same);
            return true;
        });
    }

    void move(VanishedFile& from, const ChangedFile& to) {
        if (to.knownId != 0) index_.removeRecords(to.knownId);
        index_.removeFile(from.folder, from.name);
        from.file.stamp = to.stamp;
        const auto mailbox = mailboxRole(pathOf(to));
        if (mailbox != std::exchange(from.file.mailbox, mailbox)) {
            index_.setMeta(kMetaPeopleStale, 1);
        }
        index_.putFile(index_.folderId(changes_.folders[to.folder]), to.name, from.file);
        from.file.id = 0;  // Gone on under its new name.
        ++summary_.renamed;
        changed();
    }

    void removeVanished() {
        for (const auto& vanished : changes_.vanished) {
            if (vanished.file.id == 0) continue;
            index_.removeRecords(vanished.file.id);
            index_.removeFile(vanished.folder, vanished.name);
            ++summary_.removed;
            changed();
        }
        changes_.vanished = {};
    }

    void takeGazetteer() {
        if (auto problem = updateGazetteer(index_, options_.gazetteer, mark_)) {
            changes_.problems.push_back(std::move(*problem));
        }
    }

    void readChanged() {
        auto& files = changes_.changed;
        std::ranges::stable_sort(files, std::ranges::greater{},
                                 [](const ChangedFile& file) { return file.stamp.mtime; });
        for (const auto& file : files) total_ += signsOf(file);
        for (auto& file : files) {
            tell(done_, total_);
            if (file.knownId == 0) file.knownId = index_.newFileId();
            const auto outcome = read(file);
            if (outcome.isGone) {
                forget(file);
            } else {
                store(file, outcome, FileState::refused);
            }
            ++summary_.read;
            done_ += signsOf(file);
            if (secondsSince(formed_) > kSecondsPerForming) formRecords();
        }
        if (!files.empty()) {
            told_ = {};
            tell(total_, total_);
        }
    }

    ReadOutcome read(const ChangedFile& file) {
        ReadOutcome outcome{.stamp = file.stamp};
        const auto path = pathOf(file);
        mark_.begin(path, file.stamp);
        const OpenFile open(path);
        if (const auto stamp = open.stamp()) {
            outcome.stamp = withLog(path, *stamp);
            readOpen(open.get(), file, outcome);
        } else if (open.error() == 0 || open.error() == ENOENT || open.error() == ELOOP ||
                   open.error() == ENOTDIR) {
            outcome.isGone = true;
        } else {
            outcome.stamp.mtime = kTryAgain;
            outcome.refusal = {RefusalReason::unreadable,
                               std::generic_category().message(open.error())};
        }
        mark_.end();
        return outcome;
    }

    void readOpen(int fd, const ChangedFile& file, ReadOutcome& outcome) {
        locations_.begin(file.knownId);
        people_.begin(file.knownId);
        try {
            outcome.hash = contentHash(fd, outcome.stamp.size).value_or("");
            auto records = reader_.read(fd, file.wanted, contextOf(file), locations_, people_);
            if (!records) {
                outcome.refusal = {RefusalReason::damaged, std::move(records.error())};
            } else if (*records) {
                outcome.records = std::move(**records);
            } else if (promises(file.name, file.wanted)) {
                outcome.refusal = {RefusalReason::wrongContent,
                                   "its content is not what its name says"};
            }
        } catch (const std::bad_alloc&) {
            outcome.refusal = {RefusalReason::outOfMemory, "reading it takes too much memory"};
        } catch (const std::exception& error) {
            outcome.refusal = {RefusalReason::damaged, error.what()};
        }
        // As `begin` outside: what goes wrong with the index is not the file's fault.
        locations_.finish();
        people_.finish();
        if (!outcome.records) people_.drop();
    }

    /// A large file's reader tells how far it is, so that neither its time runs out nor the daemon
    /// takes the scan for dead.
    ReaderContext contextOf(const ChangedFile& file) {
        return {.now = options_.latest,
                .path = pathOf(file),
                .progress =
                    [this, told = std::uint64_t{0}](std::uint64_t bytes) mutable {
                        if (bytes < told + kBytesPerSign) return;
                        told = bytes;
                        mark_.goOn();
                        tell(done_ + bytes / kBytesPerSign, total_);
                    },
                .today = options_.now};
    }

    void store(const ChangedFile& file, const ReadOutcome& outcome, FileState refusedState) {
        IndexedFile row{.id = file.knownId,
                        .stamp = outcome.stamp,
                        .wanted = file.wanted,
                        .state = outcome.records ? FileState::read : FileState::foreign,
                        .mailbox = mailboxRole(pathOf(file)),
                        .hash = outcome.hash,
                        .reason = std::nullopt,
                        .refusedAt = options_.now};
        if (outcome.refusal) {
            row.state = refusedState;
            row.reason = escaped(outcome.refusal->text);
            ++summary_.refused[outcome.refusal->reason];
            if (row.reason != file.knownReason) {
                logWarning(fmt::format("passed over {}: {}", escaped(pathOf(file)), *row.reason));
            }
        }
        if (outcome.records) {
            index_.putRecords(row.id, *outcome.records);
            putCalendar(index_, row.id, *outcome.records);
            tellRemarks(file, outcome.records->remarks);
        } else {
            index_.removeRecords(row.id);
        }
        index_.putFile(index_.folderId(changes_.folders[file.folder]), file.name, row);
        changed();
    }

    void tellRemarks(const ChangedFile& file, const std::vector<std::string>& remarks) {
        for (const auto& remark : remarks) {
            const auto line = escaped(fmt::format("{}: {}", pathOf(file), remark));
            logWarning(line);
            if (remarks_.size() < kMostProblems) remarks_.push_back(line);
        }
    }

    void forget(const ChangedFile& file) {
        index_.removeRecords(file.knownId);
        index_.removeFile(index_.folderId(changes_.folders[file.folder]), file.name);
        changed();
    }

    void changed() {
        summary_.changed = true;
        if (++uncommitted_ >= kFilesPerCommit || secondsSince(committed_) > kSecondsPerCommit) {
            commit();
        }
    }

    void commit() {
        index_.commit(options_.now);
        uncommitted_ = 0;
        committed_ = Steady::now();
    }

    void formRecords() {
        formed_ = Steady::now();
        // What is stale though nothing changed was left to be done by a scan that died.
        if (index_.meta(kMetaOccasionsStale, 0) != 0) {
            updateOccasions(index_);
            summary_.changed = true;
        }
        if (updateVisits(index_, options_.now, [this] { tell(done_, total_); })) {
            summary_.changed = true;
        }
        if (updatePlaces(index_)) summary_.changed = true;
        if (updateTrips(index_)) summary_.changed = true;
        commit();
    }

    void findPeople() {
        if (!updatePeople(index_, options_.ownerAddresses, options_.now)) return;
        summary_.changed = true;
        commit();
    }

    /// Steps of progress that a file counts as: one, and more for a large one that is read whole.
    static std::uint64_t signsOf(const ChangedFile& file) {
        const bool isReadWhole =
            (file.wanted & (kWantsMessages | kWantsContacts | kWantsCalendars)) != 0;
        return 1 + (isReadWhole ? static_cast<std::uint64_t>(file.stamp.size) / kBytesPerSign : 0);
    }

    void reportAll() {
        summary_.totals = index_.totals();
        auto refused = index_.refusedFiles(kMostProblems);
        std::ranges::reverse(refused);
        for (const auto& file : refused) {
            reporter_.problem(fmt::format("passed over {}: {}", escaped(file.path), file.reason));
        }
        for (const auto& remark : remarks_) reporter_.problem(remark);
        for (const auto& problem : changes_.problems) {
            logWarning(problem);
            reporter_.problem(problem);
        }
        reporter_.report(summary_);
    }

    const ScanOptions& options_;
    FileReader& reader_;
    ReadMark& mark_;
    ScanReporter& reporter_;
    IndexWriter index_;
    LocationWriter locations_;
    PeopleRows people_;
    FolderChanges changes_;
    std::uint64_t done_ = 0;
    std::uint64_t total_ = 0;
    ScanSummary summary_;
    std::vector<std::string> remarks_;
    std::size_t uncommitted_ = 0;
    Steady::time_point committed_ = Steady::now();
    Steady::time_point formed_ = Steady::now();
    Steady::time_point told_;
};

}  // namespace

OptionalError scanFolders(const ScanOptions& options, FileReader& reader, ReadMark& mark,
                          ScanReporter& reporter) {
    for (bool isSecond = false;; isSecond = true) {
        try {
            Scan(options, reader, mark, reporter).run();
            return std::nullopt;
        } catch (const SQLite::Exception& error) {
            const bool isDamaged =
                error.getErrorCode() == SQLITE_CORRUPT || error.getErrorCode() == SQLITE_NOTADB;
            if (!isDamaged || isSecond) {
                return KSError::make(
                    kSQLiteErrorDomain, error.getExtendedErrorCode(),
                    fmt::format("write {}: {}", escaped(options.index.string()), error.what()));
            }
            logWarning(fmt::format("the index is damaged ({}): it is built anew", error.what()));
        }
        IndexWriter::remove(options.index);
    }
}

}  // namespace keepsakes
