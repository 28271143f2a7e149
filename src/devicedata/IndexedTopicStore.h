// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <filesystem>
#include <mutex>
#include <string>
#include <vector>

#include "devicedata/IndexFile.h"
#include "platform/TopicStore.h"

namespace keepsakes {

class NowPlayingStream;
class Problems;
class TopicScores;
class TopicWords;

/// The topic store answered from what the index and the now-playing stream hold of the interval:
/// keywords of photos, kinds of workouts, titles and genres of what was played. docs/device-data.md
/// has the rules. Biases are not known here and make no difference. Nothing stays in memory between
/// questions. The stream and the problems outlive it.
///
/// There is no answer before the first scan, nor while the index is being built anew.
class IndexedTopicStore final : public TopicStore {
  public:
    /// `words` is the owner's file of words, read at each question; may be empty. What is wrong
    /// with it is logged and noted in the problems once, and the rest of it counts.
    IndexedTopicStore(std::filesystem::path index, std::filesystem::path words,
                      NowPlayingStream& stream, Problems& problems);

    Scores scoresForTopicMapping(std::string_view mapping, const TopicQuery& query) override;

  private:
    TopicWords words();
    OptionalError addFromIndex(const TopicWords& words, const TopicQuery& query,
                               TopicScores& scores) const;
    OptionalError addPlays(const TopicWords& words, const TopicQuery& query, TopicScores& scores);

    const IndexFile index_;
    const std::filesystem::path ownWords_;
    NowPlayingStream& stream_;
    Problems& problems_;
    std::mutex mutex_;               // guards what follows
    std::vector<std::string> told_;  // what is wrong with the owner's words, as last told
};

}  // namespace keepsakes
