// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <span>
#include <string_view>

namespace keepsakes {

/// A keyword stands for an inference or a holiday when the whole of it is one of the table's words
/// (English, German, French, Spanish, Italian, Dutch), whatever its case, accents and separators.
/// docs/device-data.md says what the tables are for; the tables are in the source.

/// The inference that a keyword stands for, spelled as the photo analysis spells it.
std::optional<std::string_view> inferenceOfKeyword(std::string_view keyword);

/// The English name of the holiday that a keyword names.
std::optional<std::string_view> holidayOfKeyword(std::string_view keyword);

inline constexpr std::string_view kInferencePet = "pet";
inline constexpr std::string_view kInferenceHolidayEvent = "HolidayEvent";

}  // namespace keepsakes
