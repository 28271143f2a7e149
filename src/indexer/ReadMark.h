// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <expected>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>

namespace keepsakes {

/// What tells one state of a file from another.
struct FileStamp {
    std::int64_t size = 0;
    std::int64_t mtime = 0;  ///< Nanoseconds since 1970.
    std::int64_t inode = 0;

    friend bool operator==(const FileStamp&, const FileStamp&) = default;
};

/// The file that the process was reading when it ended.
struct ReadMarkEntry {
    std::string path;
    FileStamp stamp;
    bool outOfTime = false;  ///< The watchdog ended the process.
};

/// Says on disk which file is being read, so that one that ends the process is known afterwards;
/// its lock lets only one scan at a time work on an index. Its watchdog ends the process when a
/// file takes too long. One for the process, on its main thread. SIGTERM in between ends the
/// process in order (status `kStoppedStatus`) and takes the mark away, for the file is innocent.
class ReadMark {
  public:
    static constexpr int kStoppedStatus = 4;
    static constexpr unsigned kSecondsPerFile = 30;
    /// A second more for each of so many bytes.
    static constexpr std::int64_t kBytesPerSecond = 10'000'000;

    /// Fails when another scan holds the lock, or when the file cannot be written.
    static std::expected<std::unique_ptr<ReadMark>, std::string> take(
        const std::filesystem::path& path, unsigned secondsPerFile = kSecondsPerFile);
    ~ReadMark();
    ReadMark(const ReadMark&) = delete;
    ReadMark& operator=(const ReadMark&) = delete;

    /// What an earlier process left. Nothing when the machine went down meanwhile: any file may
    /// have been in work then.
    const std::optional<ReadMarkEntry>& leftBehind() const { return leftBehind_; }

    void begin(const std::string& path, const FileStamp& stamp);
    /// The file is large and its reading goes on: its time begins anew.
    void goOn();
    void end();

  private:
    ReadMark(int fd, unsigned secondsPerFile);

    int fd_;
    unsigned secondsPerFile_;
    std::string bootId_;
    std::optional<ReadMarkEntry> leftBehind_;
};

}  // namespace keepsakes
