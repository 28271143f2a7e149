// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <span>
#include <string_view>

namespace keepsakes {

/// One topic of interest: its stable identifier and the English name that people are shown.
struct Topic {
    std::string_view identifier;
    std::string_view name;
};

/// Every topic that has a name; identifiers and names are distinct.
std::span<const Topic> topicCatalogue();

/// The name of a topic; nothing for an identifier that is not in the catalogue.
std::optional<std::string_view> topicName(std::string_view identifier);

}  // namespace keepsakes
