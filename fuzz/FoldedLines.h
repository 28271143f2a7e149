// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>

namespace keepsakes {

/// Cards and calendars (RFC 6350, RFC 5545): each line that is not folded yet, broken behind its
/// first byte, which changes nothing of what it says.
inline std::string folded(std::string_view text) {
    std::string result;
    for (std::size_t i = 0; i < text.size(); ++i) {
        result += text[i];
        const bool isFirst = i == 0 || text[i - 1] == '\n';
        const bool isPlain =
            text[i] != ' ' && text[i] != '\t' && text[i] != '\r' && text[i] != '\n';
        if (isFirst && isPlain) result += "\r\n ";
    }
    return result;
}

}  // namespace keepsakes
