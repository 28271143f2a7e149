// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <functional>
#include <mutex>
#include <optional>

#include "core/KSError.h"
#include "platform/MediaStream.h"

namespace SQLite {
class Database;
}

namespace keepsakes {

class Clock;
class Problems;

/// The now-playing stream in a file of its own: what the watcher of media players appends is kept
/// for 30 days, across restarts. Opened for one operation at a time, so nothing of it stays in
/// memory. Any thread may call it; operations take turns. The clock and the problems outlive it.
///
/// A file that is damaged, or no database at all, is set aside under a dated name, which is logged
/// and noted in the problems, and a new one is begun; a file of a newer version is refused and left
/// alone.
class MediaStreamFile final : public NowPlayingStream {
  public:
    static constexpr double kKeptSeconds = 2592000;  ///< 30 days.
    /// Beyond these the oldest go: ten times what a day full of music writes in a month.
    static constexpr int kMostRecords = 100000;

    /// Makes the file where it is missing, and drops what is too old. A failure is logged.
    MediaStreamFile(std::filesystem::path path, const Clock& clock, Problems& problems);

    /// On disk when it returns without an error.
    OptionalError append(const NowPlayingRecord& record);

    void read(KSDate start, const EachRecord& each,
              const std::function<void(OptionalError)>& completion) override;

  private:
    using Work = std::function<void(SQLite::Database&)>;

    OptionalError perform(const Work& work);
    OptionalError attempt(const Work& work);
    void dropOldRecords(SQLite::Database& database);
    OptionalError setAside(const KSError& damage);

    const std::filesystem::path path_;
    const Clock& clock_;
    Problems& problems_;
    std::mutex mutex_;                // guards the file and what follows
    std::optional<KSDate> lastDrop_;  // when old records were last dropped
};

}  // namespace keepsakes
