// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <gtest/gtest.h>

#include <filesystem>
#include <functional>
#include <utility>

#include "indexer/ContentReader.h"
#include "indexer/FolderScan.h"
#include "platform/DeviceDataIndex.h"

namespace keepsakes {

/// Scans real folders within the test's process, so that the clock may be virtual.
class ScannedFolders final : public DeviceDataIndex {
  public:
    /// `options` says what to scan as of now.
    explicit ScannedFolders(std::function<ScanOptions()> options) : options_(std::move(options)) {}

    ScanReport refresh(const Progress&) override {
        class SilentReporter final : public ScanReporter {
          public:
            void progress(std::uint64_t, std::uint64_t) override {}
            void problem(const std::string&) override {}
            void report(const ScanSummary&) override {}
        };
        ContentReader reader;
        SilentReporter reporter;
        const auto options = options_();
        const auto mark = ReadMark::take(options.index.string() + ".mark");
        const auto error = scanFolders(options, reader, **mark, reporter);
        EXPECT_FALSE(error) << error->description();
        return {.complete = true};
    }
    ScanReport lastReport() const override { return {}; }
    void stop() override {}

  private:
    const std::function<ScanOptions()> options_;
};

}  // namespace keepsakes
