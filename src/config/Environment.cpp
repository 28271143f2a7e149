// SPDX-License-Identifier: Apache-2.0
#include "config/Environment.h"

#include <fmt/format.h>
#include <pwd.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdlib>

namespace keepsakes {

namespace {

std::optional<std::string> homeFromUserDatabase() {
    passwd entry{};
    passwd* found = nullptr;
    std::array<char, 16384> buffer{};
    if (getpwuid_r(getuid(), &entry, buffer.data(), buffer.size(), &found) != 0 || !found ||
        !found->pw_dir || !*found->pw_dir) {
        return std::nullopt;
    }
    return found->pw_dir;
}

bool isNameCharacter(char c) {
    return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') || c == '_';
}

/// Takes the name of a variable, "NAME" or "{NAME}", off the front; empty when there is none.
std::string takeName(std::string_view& rest) {
    if (rest.starts_with('{')) {
        const auto end = rest.find('}');
        if (end == std::string_view::npos) return {};
        std::string name(rest.substr(1, end - 1));
        rest.remove_prefix(end + 1);
        return name;
    }
    std::size_t length = 0;
    while (length < rest.size() && isNameCharacter(rest[length])) ++length;
    std::string name(rest.substr(0, length));
    rest.remove_prefix(length);
    return name;
}

std::expected<std::string, std::string> expandVariables(std::string_view rest,
                                                        const Environment& environment) {
    std::string text;
    while (!rest.empty()) {
        const auto plain = rest.substr(0, rest.find('$'));
        text += plain;
        rest.remove_prefix(plain.size());
        if (rest.empty()) break;
        rest.remove_prefix(1);
        const auto name = takeName(rest);
        if (name.empty()) return std::unexpected("has a $ that no variable name follows");
        const auto value = environment(name);
        if (!value) return std::unexpected(fmt::format("needs ${}, which is not set", name));
        text += *value;
    }
    return text;
}

}  // namespace

Environment processEnvironment() {
    return [](const std::string& name) -> std::optional<std::string> {
        // NOLINTNEXTLINE(concurrency-mt-unsafe): nothing in the daemon changes the environment
        const char* value = std::getenv(name.c_str());
        if (value && *value) return value;
        return name == "HOME" ? homeFromUserDatabase() : std::nullopt;
    };
}

std::expected<std::filesystem::path, std::string> expandFolder(std::string_view text,
                                                               const std::filesystem::path& base,
                                                               const Environment& environment) {
    if (text.empty()) return std::unexpected("must not be empty");
    if (text.find('\0') != std::string_view::npos) return std::unexpected("holds a null character");
    std::string home;
    if (text.starts_with('~')) {
        if (text.size() > 1 && text[1] != '/') {
            return std::unexpected("cannot expand another user's home folder");
        }
        auto found = environment("HOME");
        if (!found) return std::unexpected("needs a home folder, and there is none");
        home = std::move(*found);
        text.remove_prefix(1);
    }
    const auto rest = expandVariables(text, environment);
    if (!rest) return std::unexpected(rest.error());
    auto path = (base / (home + *rest)).lexically_normal();
    return path.has_filename() || path == path.root_path() ? path : path.parent_path();
}

std::expected<StandardFolders, KSError> StandardFolders::find(const Environment& environment) {
    const auto home = environment("HOME");
    const auto folder = [&](const std::string& variable,
                            const char* fallback) -> std::optional<std::filesystem::path> {
        const auto value = environment(variable);
        if (value && value->starts_with('/')) return *value;
        if (home) return std::filesystem::path(*home) / fallback;
        return std::nullopt;
    };
    const auto cache = folder("XDG_CACHE_HOME", ".cache");
    const auto config = folder("XDG_CONFIG_HOME", ".config");
    const auto state = folder("XDG_STATE_HOME", ".local/state");
    if (!cache || !config || !state) {
        return std::unexpected(KSError::make(
            kPosixErrorDomain, ENOENT,
            "HOME is not set, and neither are XDG_CACHE_HOME, XDG_CONFIG_HOME and XDG_STATE_HOME"));
    }
    return StandardFolders{*cache / "com.brindle.keepsakesd", *config / "keepsakesd",
                           *state / "keepsakesd"};
}

}  // namespace keepsakes
