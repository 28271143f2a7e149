// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <string>
#include <string_view>
#include <vector>

#include "readers/XmlStream.h"

namespace keepsakes {

/// Gives a text's lines one by one, in flat memory. Used by one thread.
class LineReader {
  public:
    /// Bytes of a line that are given; what is longer is passed over to its end.
    static constexpr std::size_t kLongestLine = std::size_t{64} * 1024;

    explicit LineReader(ReadBlock read);

    /// The next line without its end (LF or CR LF), valid until the next call; false at the end of
    /// the text, or why it cannot be read. A last line without an end is one.
    std::expected<bool, std::string> next(std::string_view& line);

    /// Whether the line given last had its end; false only for the last one of a text.
    bool hasEnd() const { return hasEnd_; }

  private:
    std::expected<bool, std::string> fill();

    ReadBlock read_;
    std::vector<char> buffer_;
    std::vector<char> long_;  // a line that was too long
    std::size_t begin_ = 0;
    std::size_t end_ = 0;
    bool isOver_ = false;
    bool hasEnd_ = false;
};

}  // namespace keepsakes
