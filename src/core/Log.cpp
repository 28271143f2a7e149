// SPDX-License-Identifier: Apache-2.0
#include "core/Log.h"

#include <fmt/format.h>
#include <spdlog/sinks/stdout_sinks.h>
#include <spdlog/spdlog.h>

#include <cstdlib>
#include <memory>
#include <string>

namespace keepsakes {

namespace {

constexpr std::size_t kLongestLine = 8192;

spdlog::level::level_enum spdlogLevel(LogLevel level) {
    switch (level) {
        case LogLevel::debug:
            return spdlog::level::debug;
        case LogLevel::info:
            return spdlog::level::info;
        case LogLevel::warning:
            return spdlog::level::warn;
        case LogLevel::error:
            return spdlog::level::err;
        case LogLevel::off:
            break;
    }
    return spdlog::level::off;
}

/// The journal reads the level from "<N>" at a line's start (sd-daemon(3)).
const char* journalPrefix(spdlog::level::level_enum level) {
    switch (level) {
        case spdlog::level::err:
            return "<3>";
        case spdlog::level::warn:
            return "<4>";
        case spdlog::level::info:
            return "<6>";
        default:
            return "<7>";
    }
}

struct Logger {
    std::shared_ptr<spdlog::logger> logger =
        std::make_shared<spdlog::logger>("", std::make_shared<spdlog::sinks::stderr_sink_mt>());
    // NOLINTNEXTLINE(concurrency-mt-unsafe): nothing in the daemon changes the environment
    bool toJournal = std::getenv("JOURNAL_STREAM") != nullptr;

    Logger() {
        logger->set_pattern(toJournal ? "%v" : "%Y-%m-%d %H:%M:%S.%e %l: %v");
        logger->flush_on(spdlog::level::debug);
    }
};

Logger& shared() {
    static Logger logger;
    return logger;
}

std::string printable(std::string_view message) {
    std::string text;
    text.reserve(message.size());
    for (char c : message.substr(0, kLongestLine)) {
        const auto byte = static_cast<unsigned char>(c);
        if (byte < 0x20 || byte == 0x7f) {
            text += fmt::format("\\x{:02x}", byte);
        } else {
            text += c;
        }
    }
    if (message.size() > kLongestLine) text += " …";
    return text;
}

void write(spdlog::level::level_enum level, std::string_view message) {
    auto& log = shared();
    if (!log.logger->should_log(level)) return;
    log.logger->log(level, "{}{}", log.toJournal ? journalPrefix(level) : "", printable(message));
}

}  // namespace

std::optional<LogLevel> parseLogLevel(std::string_view word) {
    if (word == "debug") return LogLevel::debug;
    if (word == "info") return LogLevel::info;
    if (word == "warning") return LogLevel::warning;
    if (word == "error") return LogLevel::error;
    if (word == "off") return LogLevel::off;
    return std::nullopt;
}

void logDebug(std::string_view message) { write(spdlog::level::debug, message); }
void logInfo(std::string_view message) { write(spdlog::level::info, message); }
void logWarning(std::string_view message) { write(spdlog::level::warn, message); }
void logError(std::string_view message) { write(spdlog::level::err, message); }

void setLogLevel(LogLevel level) { shared().logger->set_level(spdlogLevel(level)); }

bool logsDebug() { return shared().logger->should_log(spdlog::level::debug); }

}  // namespace keepsakes
