// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "indexer/FolderScan.h"

namespace keepsakes {

/// Noon of 2024-06-15; what the files tell lies in the days before.
inline const KSDate kNow = parseISO8601("2024-06-15T12:00:00Z")->date;

/// What a scan told.
struct ScanOutcome {
    ScanSummary summary;
    std::vector<std::string> problems;
    std::uint64_t mostDone = 0;  ///< Of its progress.
};

/// Scans as a process of its own would. The scan itself has to succeed.
inline ScanOutcome scanOnce(const ScanOptions& options, FileReader& reader) {
    class Reporter final : public ScanReporter {
      public:
        void progress(std::uint64_t done, std::uint64_t total) override {
            outcome.mostDone = std::max(outcome.mostDone, done);
            EXPECT_LE(done, total);
        }
        void problem(const std::string& line) override { outcome.problems.push_back(line); }
        void report(const ScanSummary& done) override {
            outcome.summary = done;
            ++reports;
        }
        ScanOutcome outcome;
        int reports = 0;
    };
    Reporter reporter;
    const auto mark = ReadMark::take(options.index.string() + ".scan");
    EXPECT_TRUE(mark) << mark.error();
    const auto error = scanFolders(options, reader, **mark, reporter);
    EXPECT_FALSE(error) << error->description();
    EXPECT_EQ(reporter.reports, 1);
    return reporter.outcome;
}

}  // namespace keepsakes
