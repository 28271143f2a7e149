// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <expected>
#include <filesystem>
#include <set>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

namespace keepsakes {

/// Which words tell of which topic: a table in English, German, French, Spanish, Italian and Dutch,
/// and the owner's own words. Made for one question and dropped; not synchronised.
class TopicWords {
  public:
    /// A text is looked at up to this many words.
    static constexpr std::size_t kMostTokens = 200;
    static constexpr std::uintmax_t kLargestFile = 65536;

    TopicWords();

    /// Adds the owner's words: a line "<topic's name>: <word>, <word>..."; "#" begins a comment.
    /// What is wrong with lines is answered, "<file>:<line>: <what>", and the others count. Only
    /// a file that cannot be read adds nothing.
    std::vector<std::string> addFile(const std::filesystem::path& file);

    /// The identifiers of the topics that a text tells of, in the catalogue's own storage. A word
    /// of the table may be several words of the text one behind the other; of those that begin at
    /// the same place the longest counts alone ("film festival" is no film). Line ends part texts.
    std::set<std::string_view> topicsOf(std::string_view text) const;

  private:
    void add(std::string_view topic, std::string key);
    void addTopicsOfLine(std::string_view line, std::set<std::string_view>& topics) const;

    std::unordered_multimap<std::string, std::string_view> topics_;  ///< By the folded word.
};

}  // namespace keepsakes
