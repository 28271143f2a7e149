// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>

#include "core/Clock.h"

namespace keepsakes {

/// Decides which steps of long work clients hear of: none in the first second, then at most four a
/// second. Used by one thread at a time.
class ProgressReport {
  public:
    explicit ProgressReport(const Clock& clock) : clock_(clock) {}

    bool isDue(std::string_view activity, std::uint64_t done) {
        const KSDate now = clock_.now();
        if (activity != activity_ || done < done_) {
            activity_ = activity;
            nextReport_ = now + kSilentSeconds;
        }
        done_ = done;
        if (now < nextReport_) return false;
        nextReport_ = now + kSecondsBetween;
        return true;
    }

  private:
    static constexpr double kSilentSeconds = 1;
    static constexpr double kSecondsBetween = 0.25;

    const Clock& clock_;
    std::string activity_;
    std::uint64_t done_ = 0;
    KSDate nextReport_;
};

}  // namespace keepsakes
