// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace keepsakes {

/// Text that is safe to show: what would steer a terminal or turn the line around is replaced by
/// U+FFFD, line breaks and tabs by a blank.
std::string printable(std::string_view text);

/// Columns that the text takes on a terminal: two for wide East Asian characters, none for
/// combining marks. Takes printable text.
std::size_t displayWidth(std::string_view text);

/// The text cut to at most `columns`, with "…" where something is missing.
std::string fitted(std::string_view text, std::size_t columns);

/// Where output goes. Neither wide nor coloured unless it is a terminal.
struct Screen {
    bool isTerminal = false;
    bool coloured = false;
    std::size_t columns = 0;  ///< 0: no limit.

    /// Of standard output; NO_COLOR (https://no-color.org) turns colours off.
    static Screen ofStandardOutput();

    std::string bold(std::string_view text) const;
    std::string dim(std::string_view text) const;
};

/// Rows under headings, columns as wide as what stands in them; on a terminal the last column is
/// cut at its edge.
class Table {
  public:
    explicit Table(std::vector<std::string> headings) : headings_(std::move(headings)) {}

    void add(std::vector<std::string> cells);
    /// Each line behind `indent` blanks.
    std::string text(const Screen& screen, std::size_t indent = 0) const;

  private:
    std::vector<std::string> headings_;
    std::vector<std::vector<std::string>> rows_;
};

}  // namespace keepsakes
