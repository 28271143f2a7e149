// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "indexer/OccasionRule.h"
#include "readers/FileRecords.h"

namespace keepsakes {

/// A photo's words as the index keeps them, a JSON object of the lists that are not empty; nothing
/// for a photo without words. Words that are not UTF-8 have their bytes escaped.
std::optional<std::string> wordsText(const PhotoRecord& photo);

/// The words of such a text; none of one that is damaged.
OccasionWords parseWords(std::string_view text);

}  // namespace keepsakes
