// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "devicedata/IndexFile.h"
#include "platform/PhotoAnalysis.h"

namespace SQLite {
class Statement;
}

namespace keepsakes {

/// The photo analysis answered from the occasions of the index. The analysis' date is that of the
/// last scan that changed anything. Before the first scan there are no keepsakes, and the date is
/// the distant past.
class IndexedPhotoAnalysis final : public PhotoAnalysis {
  public:
    explicit IndexedPhotoAnalysis(std::filesystem::path index) : index_(std::move(index)) {}

    /// Touching counts as overlapping.
    Summary summary(KSDateInterval interval) override;

    /// In the order of their start. More identifiers than `kMostIdentifiers` are an error.
    Summary summary(std::span<const std::string> identifiers) override;

  private:
    Summary summaryOf(const std::string& condition,
                      const std::function<void(SQLite::Statement&)>& bind) const;

    const IndexFile index_;
};

}  // namespace keepsakes
