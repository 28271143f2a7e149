// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "client/Terminal.h"
#include "core/KSValue.h"
#include "trends/TrendFindings.h"

namespace keepsakes {

/// One plan of the trend analysis as it is shown: the daemon's verdict, and the series behind it,
/// which the daemon does not tell and the client works out of the same events by the same code.
/// A series that comes to something else than the daemon's result is not shown.
class TrendView {
  public:
    /// The trends event is the daemon's, or none where it gave only a verdict.
    TrendView(KSTrendsAnalyzerOptions::Pointer plan, const KSEventArray& events,
              KSTrendsVerdict verdict, KSEventPointer trendsEvent);

    /// Whether the series is the one that the daemon looked at.
    bool agrees() const { return findings_.has_value(); }

    /// "more workout time than usual: 1 h 52 min against a median of 38 min".
    std::string words() const;

    /// Title, verdict, the four weeks as bars, fences.
    std::string text(const Screen& screen) const;

    /// The trends event's JSON form, with the series and what it comes to under "analysis".
    KSDictionary json() const;

  private:
    /// A value a day, the oldest first and yesterday last; nothing for a day without events.
    std::vector<std::optional<double>> days() const;
    std::string barLine() const;
    std::string fences() const;

    KSTrendsAnalyzerOptions::Pointer plan_;
    KSTrendsVerdict verdict_;
    KSEventPointer trendsEvent_;
    std::optional<TrendFindings> findings_;
};

}  // namespace keepsakes
