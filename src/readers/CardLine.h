// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "readers/LineReader.h"

namespace keepsakes {

/// One property of a vCard: "group.NAME;PARAMETER=value:text". A plain value.
struct CardLine {
    std::string name;        ///< In upper case, without its group.
    std::string parameters;  ///< As they stand, behind the first ";".
    std::string text;        ///< Without the transfer encoding; in UTF-8.

    /// The value of a parameter, or empty; in vCard 2.1 a parameter may stand without its name.
    std::string parameter(std::string_view name) const;
};

/// Takes an unfolded line apart; nothing for a line without a colon.
bool parseCardLine(std::string_view line, CardLine& parsed);

/// Whether the line's value is quoted-printable and goes on in the next line.
bool goesOn(std::string_view line);

/// The parts of a text, which ";" separates where no backslash stands before it; escapes undone.
std::vector<std::string> cardParts(std::string_view text);
/// Escapes (\n \, \; \\) undone; line ends become blanks.
std::string cardText(std::string_view text);

/// Gives the unfolded lines of a card file (RFC 6350, 3.2; quoted-printable lines of vCard 2.1 are
/// joined too). Used by one thread.
class CardLines {
  public:
    explicit CardLines(ReadBlock read) : lines_(std::move(read)) {}

    /// As `LineReader::next`. What a line has beyond `limits::kLongestField` is left out.
    std::expected<bool, std::string> next(std::string& line);

  private:
    LineReader lines_;
    std::string ahead_;
    bool hasAhead_ = false;
    bool isOver_ = false;
};

}  // namespace keepsakes
