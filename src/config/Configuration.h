// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <filesystem>
#include <optional>
#include <vector>

#include "config/Environment.h"
#include "core/KSError.h"

namespace keepsakes {

inline constexpr std::string_view kConfigurationErrorDomain = "ConfigurationErrorDomain";

/// What the owner set in config.toml, checked and expanded; a plain value that nothing changes
/// after the start. Every key has a default; keepsakesd.toml(5) documents them.
struct Configuration {
    using Folders = std::vector<std::filesystem::path>;

    struct {
        bool diagnostics = true;
        bool healthData = true;
    } policy;

    /// Folders are absolute; none of them need exist.
    struct {
        Folders tracks;
        Folders photos;
        Folders calendars;
        Folders messages;
        Folders contacts;
        Folders places;
        std::filesystem::path gazetteer;   ///< A file; empty when there is none.
        std::filesystem::path topicWords;  ///< A file; empty when there is none.
        bool media = true;
    } deviceData;

    struct Day {
        int year = 0;
        int month = 0;
        int day = 0;
        friend bool operator==(const Day&, const Day&) = default;
    };
    struct {
        std::optional<Day> dateOfBirth;
        int biologicalSex = 0;  ///< 0 not set, 1 female, 2 male, 3 other.
        /// The owner's own mail addresses and telephone numbers, beside those that files tell.
        std::vector<std::string> addresses;
    } owner;

    struct {
        /// Chats whose links are highlighted of themselves: addresses, or names of rooms.
        std::vector<std::string> chats;
    } links;

    struct {
        bool contentProtection = false;
    } device;

    /// Periods in seconds; 0 turns the timer off.
    struct {
        double collection = 3600;
        double compute = 6 * 3600.0;
        double purge = 24 * 3600.0;
        bool requireExternalPower = false;
    } activities;

    struct {
        bool devices = false;
        bool scan = false;
    } nearby;
};

/// What holds when there is no file. The folders are those below the home folder, or none where
/// there is no home.
Configuration defaultConfiguration(const Environment& environment = processEnvironment());

/// Reads a file of at most 1 MiB; a missing one is an error (of `kPosixErrorDomain`, code ENOENT).
/// Whatever else is wrong is an error of `kConfigurationErrorDomain` whose description is one line,
/// "<file>:<line>: <section.key>: <what is wrong>", for the first such line.
std::expected<Configuration, KSError> loadConfiguration(
    const std::filesystem::path& file, const Environment& environment = processEnvironment());

/// As `loadConfiguration`, but a file that does not exist means the defaults.
std::expected<Configuration, KSError> loadConfigurationIfAny(
    const std::filesystem::path& file, const Environment& environment = processEnvironment());

}  // namespace keepsakes
