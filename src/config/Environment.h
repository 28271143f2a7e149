// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <filesystem>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

#include "core/KSError.h"

namespace keepsakes {

/// Answers an environment variable, or nothing when it is unset or empty.
using Environment = std::function<std::optional<std::string>(const std::string& name)>;

/// The process's own environment. HOME falls back to the user database, so that a service started
/// without it still finds the owner's folders.
Environment processEnvironment();

/// `text` as an absolute path: a leading "~" stands for the home folder, $NAME and ${NAME} for
/// variables, and what is still relative is taken from `base`. The error says what cannot be
/// expanded; an unset variable is one, because "$PHOTOS/2024" must not become "/2024".
std::expected<std::filesystem::path, std::string> expandFolder(std::string_view text,
                                                               const std::filesystem::path& base,
                                                               const Environment& environment);

/// Where the daemon and its client keep things, by the XDG Base Directory Specification: a variable
/// that is unset or holds a relative path counts as its default. None of them is made here.
struct StandardFolders {
    std::filesystem::path cache;   ///< $XDG_CACHE_HOME/com.brindle.keepsakesd
    std::filesystem::path config;  ///< $XDG_CONFIG_HOME/keepsakesd
    std::filesystem::path state;   ///< $XDG_STATE_HOME/keepsakesd

    std::filesystem::path configurationFile() const { return config / "config.toml"; }
    std::filesystem::path defaultsFolder() const { return config / "defaults"; }
    std::filesystem::path analyticsFile() const { return state / "analytics.jsonl"; }
    /// When the background activities ran last.
    std::filesystem::path activitiesFile() const { return state / "activities.plist"; }
    /// Since which start of the machine the session has been unlocked.
    std::filesystem::path unlockFile() const { return state / "unlocked-boot"; }

    /// An error when a default is needed and there is no home folder.
    static std::expected<StandardFolders, KSError> find(
        const Environment& environment = processEnvironment());
};

}  // namespace keepsakes
