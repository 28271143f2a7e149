// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <expected>
#include <filesystem>
#include <string>
#include <string_view>

#include "core/KSError.h"

namespace keepsakes {

/// The whole content of a regular file of at most `largest` bytes. Errors are of
/// `kPosixErrorDomain` (EFBIG for a larger file) and name the path.
std::expected<std::string, KSError> readFile(const std::filesystem::path& path,
                                             std::uintmax_t largest);

/// Replaces the file whole or not at all: written beside it, flushed to disk, renamed. Mode 0600.
OptionalError replaceFile(const std::filesystem::path& path, std::string_view content);

/// Makes the folder, and those above it, where missing, each with mode 0700 as XDG asks.
OptionalError makePrivateFolder(const std::filesystem::path& path);

/// An error of `kPosixErrorDomain`: "<what> <path>: <text of the errno>".
KSError posixError(int code, std::string_view what, const std::filesystem::path& path);

}  // namespace keepsakes
