// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

namespace keepsakes {

/// What the last scan left behind.
struct ScanReport {
    bool complete = false;              ///< False when the scan was given up on or could not run.
    std::uint64_t filesIndexed = 0;     ///< Files that the index holds records or a state of.
    std::uint64_t filesRefused = 0;     ///< Files of these that were passed over.
    std::vector<std::string> problems;  ///< What the owner should know, a line each, newest first.
};

/// The index of the owner's files, brought up to date before data is asked for.
class DeviceDataIndex {
  public:
    using Progress = std::function<void(std::uint64_t done, std::uint64_t total)>;

    virtual ~DeviceDataIndex() = default;

    /// Scans the configured folders and returns when done, when the port's own time limit has
    /// passed, or when `stop` was called; the index then answers with what it holds. Callers on
    /// several threads share one scan. `progress` (total 0 when not known) is called on the calling
    /// thread.
    virtual ScanReport refresh(const Progress& progress) = 0;

    /// What the last scan left, without scanning.
    virtual ScanReport lastReport() const = 0;

    /// Ends a scan that runs, and makes later ones return at once. For shutdown.
    virtual void stop() = 0;
};

}  // namespace keepsakes
