// SPDX-License-Identifier: Apache-2.0
#include "client/Terminal.h"

#include <fmt/format.h>
#include <sys/ioctl.h>
#include <unicode/uchar.h>
#include <unicode/utf8.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>

#include "config/Environment.h"

namespace keepsakes {

namespace {

constexpr std::size_t kGap = 2;
/// A column in front of the last one is never wider than this.
constexpr std::size_t kWidestColumn = 40;

/// Calls `visit(code point or negative, bytes)` for each character.
template <class Visit>
void eachCharacter(std::string_view text, const Visit& visit) {
    const auto* bytes = reinterpret_cast<const std::uint8_t*>(text.data());
    const auto size = static_cast<std::int64_t>(text.size());
    for (std::int64_t at = 0; at < size;) {
        const auto start = static_cast<std::size_t>(at);
        UChar32 point = 0;
        U8_NEXT(bytes, at, size, point);
        if (!visit(point, text.substr(start, static_cast<std::size_t>(at) - start))) return;
    }
}

bool steers(UChar32 point) {
    if (point < 0 || u_charType(point) == U_CONTROL_CHAR) return true;
    if (u_hasBinaryProperty(point, UCHAR_BIDI_CONTROL)) return true;
    return point == 0x2028 || point == 0x2029;
}

std::size_t widthOf(UChar32 point) {
    switch (u_charType(point)) {
        case U_NON_SPACING_MARK:
        case U_ENCLOSING_MARK:
        case U_FORMAT_CHAR:
            return 0;
        default:
            break;
    }
    const int width = u_getIntPropertyValue(point, UCHAR_EAST_ASIAN_WIDTH);
    return width == U_EA_WIDE || width == U_EA_FULLWIDTH ? 2 : 1;
}

std::string padded(std::string_view text, std::size_t columns) {
    const auto width = displayWidth(text);
    return std::string(text) + std::string(columns > width ? columns - width : 0, ' ');
}

}  // namespace

std::string printable(std::string_view text) {
    std::string shown;
    eachCharacter(text, [&shown](UChar32 point, std::string_view bytes) {
        if (point == '\n' || point == '\t' || point == '\r') {
            shown += ' ';
        } else {
            shown += steers(point) ? "\uFFFD" : bytes;
        }
        return true;
    });
    return shown;
}

std::size_t displayWidth(std::string_view text) {
    std::size_t width = 0;
    eachCharacter(text, [&width](UChar32 point, std::string_view) {
        width += widthOf(point);
        return true;
    });
    return width;
}

std::string fitted(std::string_view text, std::size_t columns) {
    if (displayWidth(text) <= columns) return std::string(text);
    if (columns == 0) return {};
    std::string shown;
    std::size_t width = 0;
    eachCharacter(text, [&](UChar32 point, std::string_view bytes) {
        width += widthOf(point);
        if (width > columns - 1) return false;
        shown += bytes;
        return true;
    });
    return shown + "…";
}

Screen Screen::ofStandardOutput() {
    Screen screen;
    if (!isatty(STDOUT_FILENO)) return screen;
    screen.isTerminal = true;
    const auto environment = processEnvironment();
    screen.coloured = !environment("NO_COLOR") && environment("TERM").value_or("dumb") != "dumb";
    winsize size{};
    screen.columns =
        ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col > 0 ? size.ws_col : 80;
    return screen;
}

std::string Screen::bold(std::string_view text) const {
    return coloured ? fmt::format("\033[1m{}\033[0m", text) : std::string(text);
}

std::string Screen::dim(std::string_view text) const {
    return coloured ? fmt::format("\033[2m{}\033[0m", text) : std::string(text);
}

void Table::add(std::vector<std::string> cells) {
    for (auto& cell : cells) cell = printable(cell);
    rows_.push_back(std::move(cells));
}

std::string Table::text(const Screen& screen, std::size_t indent) const {
    std::vector<std::size_t> widths;
    for (std::size_t column = 0; column < headings_.size(); ++column) {
        std::size_t width = displayWidth(headings_[column]);
        for (const auto& row : rows_) width = std::max(width, displayWidth(row[column]));
        const bool last = column + 1 == headings_.size();
        widths.push_back(last ? width : std::min(width, kWidestColumn));
    }
    const auto line = [&](const std::vector<std::string>& cells) {
        std::string text(indent, ' ');
        std::size_t used = indent;
        for (std::size_t column = 0; column < cells.size(); ++column) {
            if (column + 1 < cells.size()) {
                text += padded(fitted(cells[column], widths[column]), widths[column] + kGap);
                used += widths[column] + kGap;
            } else {
                const auto left = screen.columns > used ? screen.columns - used : 0;
                text += screen.columns ? fitted(cells[column], left) : cells[column];
            }
        }
        text.erase(text.find_last_not_of(' ') + 1);
        return screen.columns ? fitted(text, screen.columns) : text;
    };
    std::string text = screen.bold(line(headings_)) + "\n";
    for (const auto& row : rows_) text += line(row) + "\n";
    return text;
}

}  // namespace keepsakes
