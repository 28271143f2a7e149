// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <optional>
#include <string_view>

namespace keepsakes {

enum class LogLevel { debug, info, warning, error, off };

/// "debug", "info", "warning", "error" or "off"; nothing for another word.
std::optional<LogLevel> parseLogLevel(std::string_view word);

/// One line each on standard error, from any thread. Where standard error is the journal, lines
/// carry the journal's level prefix in place of a time. Control characters are escaped, so that a
/// file's name cannot forge a line; a line is cut at 8 KiB.
void logDebug(std::string_view message);
void logInfo(std::string_view message);
void logWarning(std::string_view message);
void logError(std::string_view message);

/// Messages below `level` are dropped. The level at start is info.
void setLogLevel(LogLevel level);

/// Whether a debug message would be written, so that a costly one need not be made.
bool logsDebug();

}  // namespace keepsakes
