// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <memory>
#include <mutex>
#include <thread>
#include <vector>

#include "core/Clock.h"
#include "core/WorkQueue.h"
#include "platform/DeviceDataIndex.h"

namespace keepsakes {

class ChildProcess;

struct IndexerOptions {
    std::filesystem::path program;  ///< keepsakes-indexer.
    std::filesystem::path index;
    std::vector<std::filesystem::path> tracks;
    std::vector<std::filesystem::path> photos;
    std::vector<std::filesystem::path> places;
    std::filesystem::path gazetteer;  ///< Empty when there is none.
    std::vector<std::filesystem::path> messages;
    std::vector<std::filesystem::path> contacts;
    std::vector<std::filesystem::path> calendars;
    std::vector<std::string> ownerAddresses;
    /// Seconds after which `refresh` returns though the scan goes on; the next one joins it.
    double replyLimit = 100;
    /// Seconds after which a scan is ended in order.
    double hardLimit = 1800;
    /// Seconds without a word after which the indexer is killed: its own limit of time per file is
    /// shorter, so that it hangs.
    double silenceLimit = 120;
    /// How often the indexer is started in one scan; each crash passes over the file it came from.
    int mostStarts = 16;
};

/// The index of the owner's files, kept by the program keepsakes-indexer, which runs while a scan
/// does and never otherwise. Any thread may call it; `refresh` blocks for `replyLimit` at most. A
/// thread of its own supervises the child; its limits are timers on the clock. Destruction ends a
/// scan that runs, within twice `ChildProcess::kGraceMilliseconds`. `clock` outlives it.
class IndexerProcess final : public DeviceDataIndex {
  public:
    static constexpr std::size_t kMostProblems = 50;

    IndexerProcess(Clock& clock, IndexerOptions options);
    ~IndexerProcess() override;

    ScanReport refresh(const Progress& progress) override;
    ScanReport lastReport() const override;
    void stop() override;

  private:
    struct Waiter;
    struct ChildReport;
    enum class Outcome { complete, crashed, failed };

    void startScan();
    void supervise();
    Outcome runChild(ChildReport& report);
    void takeLine(std::string_view line, ChildReport& report);
    Outcome judge(const struct ChildEnd& end, ChildReport& report);
    std::vector<std::string> arguments() const;
    void wakeWaiters();

    Clock& clock_;
    const IndexerOptions options_;

    mutable std::mutex mutex_;
    bool isStopped_ = false;
    bool isScanning_ = false;
    std::uint64_t scanNumber_ = 0;  ///< Of the scan that runs or ran last.
    std::uint64_t done_ = 0;
    std::uint64_t total_ = 0;
    ScanReport last_;
    std::vector<std::shared_ptr<Waiter>> waiters_;
    std::shared_ptr<ChildProcess> child_;
    /// Children that hang in the kernel, kept so that they can still be taken leave of.
    std::vector<std::shared_ptr<ChildProcess>> abandoned_;
    std::thread supervisor_;

    WorkQueue timers_{"IndexerProcess"};
};

}  // namespace keepsakes
