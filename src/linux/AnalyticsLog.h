// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>
#include <cstdint>
#include <filesystem>
#include <string>

#include "core/KSError.h"
#include "core/WorkQueue.h"
#include "platform/AnalyticsService.h"

namespace keepsakes {

class Clock;

/// The analytics service's local sink: one JSON object a line,
/// {"time": seconds since 2001-01-01 UTC, "event": name, "fields": {…}}, in a file that never
/// leaves the machine. Any thread may send; lines are written on a queue of the log's own, in the
/// order of sending, whole or not at all. Destroying it waits for what was sent. The clock must
/// outlive it.
///
/// What cannot be kept is dropped and counted: for want of room on the disk or of a usable folder,
/// in a backlog beyond `kLargestBacklog`, and events that JSON cannot hold (a number that is not
/// finite, text that is not UTF-8) or that are longer than `kLongestLine`. The log tells the count
/// at the first drop of a streak, at every tenfold, when events are kept again, and at the end.
class AnalyticsLog final : public AnalyticsService {
  public:
    /// A line that would take the file beyond this many bytes begins a new file; the old one is
    /// kept beside it as "<name>.1", in place of the one before. So the two never exceed twice
    /// that.
    static constexpr std::uint64_t kLargestFile = 4u << 20;
    static constexpr std::size_t kLongestLine = 256u << 10;
    /// Bytes of lines that wait for the disk.
    static constexpr std::size_t kLargestBacklog = 4u << 20;

    AnalyticsLog(std::filesystem::path file, const Clock& clock);
    ~AnalyticsLog() override;

    void send(std::string_view event, const KSDictionary& fields) override;

    /// How many events were dropped since the start.
    std::uint64_t dropped() const { return dropped_; }

    /// Returns when what was sent before is written or dropped.
    void flush();

  private:
    void drop(const std::string& reason);
    void write(const std::string& line);
    OptionalError openFile();
    OptionalError removeHalfLine(std::uint64_t size);
    OptionalError append(const std::string& line);
    void closeFile();

    const std::filesystem::path file_;
    const Clock& clock_;
    std::atomic<std::uint64_t> dropped_ = 0;
    std::atomic<std::size_t> backlog_ = 0;
    std::atomic<bool> dropping_ = false;  // the last event was dropped: a streak

    int descriptor_ = -1;  // only on queue_, as what follows

    WorkQueue queue_;  // last: its destructor drains what uses the members above
};

}  // namespace keepsakes
