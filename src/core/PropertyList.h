// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>

#include "core/KSError.h"
#include "core/KSValue.h"

namespace keepsakes {

/// XML property lists (the public DTD "PropertyList 1.0") as a codec of `KSValue`. Identifiers are
/// written as strings; dates keep whole seconds. Null has no form and is left out of dictionaries
/// and arrays; nor has the null character, which U+FFFD stands for.
std::string propertyListText(const KSDictionary& root);

/// Reads a list whose root is a dictionary. The error says where the text stops making sense.
std::expected<KSDictionary, KSError> parsePropertyList(std::string_view text);

/// Reads a file of at most 16 MiB. A missing file is an error with code ENOENT.
std::expected<KSDictionary, KSError> readPropertyListFile(const std::filesystem::path& path);

/// Replaces the file whole or not at all: written beside it, flushed to disk, renamed. Mode 0600.
OptionalError writePropertyListFile(const std::filesystem::path& path, const KSDictionary& root);

}  // namespace keepsakes
