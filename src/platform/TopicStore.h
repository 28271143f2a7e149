// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <map>
#include <string>
#include <string_view>

#include "core/KSDate.h"
#include "core/KSError.h"

namespace keepsakes {

/// What a topic's score is asked for.
struct TopicQuery {
    KSDate fromDate;
    KSDate toDate;
    KSDate scoringDate;    ///< As of when: what lies before it counts the less the older it is.
    double decayRate = 0;  ///< Of that, a second.
    bool scoreWithBiases = false;

    friend bool operator==(const TopicQuery&, const TopicQuery&) = default;
};

/// The topic store of the personal profile service: how strongly each topic of interest shows in an
/// interval of the owner's life. Any thread may call it; it blocks the caller and changes nothing.
class TopicStore {
  public:
    /// Topic identifier to score, 0 to 1; topics without any evidence are left out.
    using Scores = std::expected<std::map<std::string, double>, KSError>;

    virtual ~TopicStore() = default;

    /// A mapping names a set of topics for a client. Evidence that cannot be looked at, or not yet
    /// all of it, is an error and never a low score.
    virtual Scores scoresForTopicMapping(std::string_view mapping, const TopicQuery& query) = 0;
};

}  // namespace keepsakes
