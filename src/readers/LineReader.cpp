// SPDX-License-Identifier: Apache-2.0
#include "readers/LineReader.h"

#include <algorithm>
#include <cstring>
#include <utility>

namespace keepsakes {

LineReader::LineReader(ReadBlock read) : read_(std::move(read)), buffer_(2 * kLongestLine) {}

/// Whether more came. Moves what is left to the buffer's start.
std::expected<bool, std::string> LineReader::fill() {
    if (isOver_) return false;
    if (begin_ > 0) {
        std::memmove(buffer_.data(), buffer_.data() + begin_, end_ - begin_);
        end_ -= begin_;
        begin_ = 0;
    }
    const auto count = read_(std::span(buffer_).subspan(end_));
    if (!count) return std::unexpected(count.error());
    isOver_ = *count == 0;
    end_ += *count;
    return !isOver_;
}

std::expected<bool, std::string> LineReader::next(std::string_view& line) {
    const char* end = nullptr;
    std::size_t searched = 0;
    while (true) {
        const auto* from = buffer_.data() + begin_ + searched;
        end = static_cast<const char*>(
            std::memchr(from, '\n', static_cast<std::size_t>(buffer_.data() + end_ - from)));
        searched = end_ - begin_;
        if (end || searched >= kLongestLine) break;
        const auto more = fill();
        if (!more) return std::unexpected(more.error());
        if (*more) continue;
        line = {buffer_.data() + begin_, searched};
        begin_ = end_;
        hasEnd_ = false;
        return searched > 0;
    }
    const auto length = end ? static_cast<std::size_t>(end - buffer_.data()) - begin_ : searched;
    hasEnd_ = true;
    if (length < kLongestLine) {
        line = {buffer_.data() + begin_, length};
        begin_ += length + 1;
        if (line.ends_with('\r')) line.remove_suffix(1);
        return true;
    }
    // Kept apart: the rest of the line is read over where it stood.
    std::vector<char> kept(buffer_.begin() + static_cast<std::ptrdiff_t>(begin_),
                           buffer_.begin() + static_cast<std::ptrdiff_t>(begin_ + kLongestLine));
    while (!end) {
        begin_ = end_;
        const auto more = fill();
        if (!more) return std::unexpected(more.error());
        if (!*more) break;
        end = static_cast<const char*>(std::memchr(buffer_.data() + begin_, '\n', end_ - begin_));
    }
    hasEnd_ = end != nullptr;
    begin_ = end ? static_cast<std::size_t>(end - buffer_.data()) + 1 : end_;
    long_ = std::move(kept);
    line = {long_.data(), long_.size()};
    return true;
}

}  // namespace keepsakes
