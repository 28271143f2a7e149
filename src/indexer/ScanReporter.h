// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "indexer/IndexWriter.h"

namespace keepsakes {

/// Why a file has no records though its folder was searched for them.
enum class RefusalReason {
    unreadable,
    damaged,
    wrongContent,
    outOfMemory,
    endedIndexer,
    outOfTime
};

const char* nameOf(RefusalReason reason);

/// What one scan did and what it left.
struct ScanSummary {
    IndexWriter::Totals totals;
    std::uint64_t read = 0;     ///< Files read, because they are new or changed.
    std::uint64_t renamed = 0;  ///< Files that kept their records under a new path.
    std::uint64_t removed = 0;  ///< Files that are gone with their records.
    bool changed = false;
    std::map<RefusalReason, std::uint64_t> refused;  ///< In this scan.
};

/// Tells what a scan does, on the scan's thread.
class ScanReporter {
  public:
    virtual ~ScanReporter() = default;
    /// `total` is 0 while it is not known.
    virtual void progress(std::uint64_t done, std::uint64_t total) = 0;
    /// What the owner should know, one line of UTF-8; the newest comes last.
    virtual void problem(const std::string& line) = 0;
    /// Once, at the end of a scan that came to its end.
    virtual void report(const ScanSummary& summary) = 0;
};

/// One JSON object a line on standard output: {"progress": {"done", "total"}}, {"problem": text}
/// and {"report": {...}} with the summary's counts.
std::unique_ptr<ScanReporter> makeJsonReporter();

/// Sentences for people on standard output; progress only where that is a terminal.
std::unique_ptr<ScanReporter> makeHumanReporter();

}  // namespace keepsakes
