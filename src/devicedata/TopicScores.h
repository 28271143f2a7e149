// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <map>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/TopicStore.h"

namespace keepsakes {

/// One kind of evidence, such as photo keywords: what one piece of it is worth, 0 to 1.
struct EvidenceKind {
    std::string_view name;
    double weight = 0;
};

/// Adds evidence of topics up to scores, in whatever order it comes. A plain value; not
/// synchronised.
///
/// A topic's score is 1 - product over its evidence of (1 - w * exp(-r * a)): the "noisy or" of
/// Pearl, "Probabilistic Reasoning in Intelligent Systems" (1988), where w is the kind's weight, r
/// the query's decay rate and a the seconds from the evidence to the scoring date. Evidence of one
/// kind that follows within `kRepetitionSeconds` on one that counts is the same again and adds
/// nothing.
class TopicScores {
  public:
    static constexpr double kRepetitionSeconds = 600;

    explicit TopicScores(const TopicQuery& query) : query_(query) {}

    /// A kind is known by its name. Evidence outside the query's dates is passed over.
    void add(const EvidenceKind& kind, KSDate date, const std::set<std::string_view>& topics);

    std::map<std::string, double> scores() const;

  private:
    struct Pieces {
        double weight = 0;
        std::vector<double> dates;
    };

    const TopicQuery query_;
    std::map<std::pair<std::string, std::string>, Pieces> pieces_;  ///< By topic and kind.
};

}  // namespace keepsakes
