// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <fmt/format.h>

#include <cstdio>
#include <filesystem>
#include <memory>
#include <string>

#include "indexer/FolderScan.h"

namespace keepsakes::bench {

/// Scans folders as keepsakes-indexer does; what goes wrong is told on standard error.
class Scan final : public ScanReporter {
  public:
    explicit Scan(const std::filesystem::path& folder)
        : mark_(ReadMark::take(folder / "mark").value()) {}

    void run(const ScanOptions& options, FileReader& reader) {
        const auto error = scanFolders(options, reader, *mark_, *this);
        if (error) fmt::print(stderr, "scan: {}\n", error->description());
    }
    /// Of the last one.
    const ScanSummary& summary() const { return summary_; }

    void progress(std::uint64_t, std::uint64_t) override {}
    void problem(const std::string& line) override { fmt::print(stderr, "problem: {}\n", line); }
    void report(const ScanSummary& done) override { summary_ = done; }

  private:
    const std::unique_ptr<ReadMark> mark_;
    ScanSummary summary_;
};

}  // namespace keepsakes::bench
