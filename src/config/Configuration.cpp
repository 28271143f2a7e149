// SPDX-License-Identifier: Apache-2.0
#include "config/Configuration.h"

#include <fmt/format.h>
#include <toml++/toml.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <functional>
#include <iterator>
#include <string>

#include "config/Period.h"
#include "core/Files.h"

namespace keepsakes {

namespace {

constexpr std::uintmax_t kLargestFile = 1u << 20;

struct Problem {
    std::uint32_t line = 0;
    std::string what;
};
using OptionalProblem = std::optional<Problem>;

/// What a setter may ask beside the value itself.
struct Surroundings {
    std::filesystem::path folderOfFile;
    const Environment& environment;
};

using Setter = std::function<OptionalProblem(const toml::node&, const Surroundings&)>;

Problem problemAt(const toml::node& value, std::string what) {
    return {value.source().begin.line, std::move(what)};
}

Setter boolean(bool& target) {
    return [&target](const toml::node& value, const Surroundings&) -> OptionalProblem {
        const auto read = value.value_exact<bool>();
        if (!read) return problemAt(value, "must be true or false");
        target = *read;
        return std::nullopt;
    };
}

Setter period(double& target) {
    return [&target](const toml::node& value, const Surroundings&) -> OptionalProblem {
        const auto text = value.value_exact<std::string>();
        const auto seconds = text ? parsePeriod(*text) : std::nullopt;
        if (!seconds) {
            return problemAt(value, R"(must be a period such as "90m" or "6h", or "0" for never)");
        }
        target = *seconds;
        return std::nullopt;
    };
}

Setter folders(Configuration::Folders& target) {
    return [&target](const toml::node& value, const Surroundings& around) -> OptionalProblem {
        const auto* array = value.as_array();
        if (!array) return problemAt(value, "must be an array of folders");
        Configuration::Folders read;
        for (const auto& item : *array) {
            const auto text = item.value_exact<std::string>();
            if (!text) return problemAt(item, "must hold strings only");
            auto folder = expandFolder(*text, around.folderOfFile, around.environment);
            if (!folder) {
                return problemAt(item, fmt::format("\"{}\" {}", *text, folder.error()));
            }
            if (std::ranges::find(read, *folder) == read.end()) {
                read.push_back(std::move(*folder));
            }
        }
        target = std::move(read);
        return std::nullopt;
    };
}

Setter file(std::filesystem::path& target) {
    return [&target](const toml::node& value, const Surroundings& around) -> OptionalProblem {
        const auto text = value.value_exact<std::string>();
        if (!text) return problemAt(value, "must be a file's name");
        auto path = expandFolder(*text, around.folderOfFile, around.environment);
        if (!path) return problemAt(value, fmt::format("\"{}\" {}", *text, path.error()));
        target = std::move(*path);
        return std::nullopt;
    };
}

Setter localDate(std::optional<Configuration::Day>& target) {
    return [&target](const toml::node& value, const Surroundings&) -> OptionalProblem {
        const auto date = value.value_exact<toml::date>();
        if (!date) return problemAt(value, "must be a date such as 1990-05-01, without quotes");
        target = Configuration::Day{date->year, date->month, date->day};
        return std::nullopt;
    };
}

Setter biologicalSex(int& target) {
    return [&target](const toml::node& value, const Surroundings&) -> OptionalProblem {
        constexpr std::array<std::string_view, 4> kWords{"not set", "female", "male", "other"};
        const auto word = value.value_exact<std::string>();
        const auto* const found =
            word ? std::ranges::find(kWords, std::string_view(*word)) : kWords.end();
        if (found == kWords.end()) {
            return problemAt(value, R"(must be "not set", "female", "male" or "other")");
        }
        target = static_cast<int>(std::distance(kWords.begin(), found));
        return std::nullopt;
    };
}

Setter addresses(std::vector<std::string>& target) {
    return [&target](const toml::node& value, const Surroundings&) -> OptionalProblem {
        const auto* array = value.as_array();
        if (!array) return problemAt(value, "must be an array of addresses");
        std::vector<std::string> read;
        for (const auto& item : *array) {
            const auto text = item.value_exact<std::string>();
            if (!text) return problemAt(item, "must hold strings only");
            const bool isNumber = text->find_first_not_of("+-./() 0123456789") == text->npos &&
                                  text->find_first_of("0123456789") != text->npos;
            if (!isNumber && text->find('@') == text->npos) {
                return problemAt(
                    item,
                    fmt::format("\"{}\" is neither an address nor a telephone number", *text));
            }
            read.push_back(*text);
        }
        target = std::move(read);
        return std::nullopt;
    };
}

Setter texts(std::vector<std::string>& target) {
    return [&target](const toml::node& value, const Surroundings&) -> OptionalProblem {
        const auto* array = value.as_array();
        if (!array) return problemAt(value, "must be an array of strings");
        std::vector<std::string> read;
        for (const auto& item : *array) {
            const auto text = item.value_exact<std::string>();
            if (!text || text->empty()) return problemAt(item, "must hold strings only");
            read.push_back(*text);
        }
        target = std::move(read);
        return std::nullopt;
    };
}

struct Key {
    std::string_view section;
    std::string_view name;
    Setter set;
};

std::vector<Key> keysOf(Configuration& to) {
    return {
        {"policy", "diagnostics", boolean(to.policy.diagnostics)},
        {"policy", "health_data", boolean(to.policy.healthData)},
        {"device_data", "tracks", folders(to.deviceData.tracks)},
        {"device_data", "photos", folders(to.deviceData.photos)},
        {"device_data", "calendars", folders(to.deviceData.calendars)},
        {"device_data", "messages", folders(to.deviceData.messages)},
        {"device_data", "contacts", folders(to.deviceData.contacts)},
        {"device_data", "places", folders(to.deviceData.places)},
        {"device_data", "gazetteer", file(to.deviceData.gazetteer)},
        {"device_data", "topic_words", file(to.deviceData.topicWords)},
        {"device_data", "media", boolean(to.deviceData.media)},
        {"owner", "date_of_birth", localDate(to.owner.dateOfBirth)},
        {"owner", "biological_sex", biologicalSex(to.owner.biologicalSex)},
        {"owner", "addresses", addresses(to.owner.addresses)},
        {"links", "chats", texts(to.links.chats)},
        {"device", "content_protection", boolean(to.device.contentProtection)},
        {"activities", "collection", period(to.activities.collection)},
        {"activities", "compute", period(to.activities.compute)},
        {"activities", "purge", period(to.activities.purge)},
        {"activities", "require_external_power", boolean(to.activities.requireExternalPower)},
        {"nearby", "devices", boolean(to.nearby.devices)},
        {"nearby", "scan", boolean(to.nearby.scan)},
    };
}

/// Applies the keys of one section; what is wrong with them goes to `problems`.
void applySection(const toml::key& section, const toml::node& content, const std::vector<Key>& keys,
                  const Surroundings& around, std::vector<Problem>& problems) {
    const auto inSection = [&](const Key& key) { return key.section == section.str(); };
    const auto line = section.source().begin.line;
    if (!std::ranges::any_of(keys, inSection)) {
        problems.push_back({line, fmt::format("{}: unknown key", section.str())});
        return;
    }
    const auto* table = content.as_table();
    if (!table) {
        problems.push_back({line, fmt::format("{}: must be a table", section.str())});
        return;
    }
    for (const auto& [name, value] : *table) {
        const auto key = std::ranges::find_if(keys, [&](const Key& candidate) {
            return inSection(candidate) && candidate.name == name.str();
        });
        OptionalProblem problem;
        if (key == keys.end()) {
            problem = Problem{name.source().begin.line, "unknown key"};
        } else {
            problem = key->set(value, around);
        }
        if (problem) {
            problems.push_back({problem->line, fmt::format("{}.{}: {}", section.str(), name.str(),
                                                           problem->what)});
        }
    }
}

KSError configurationError(const std::filesystem::path& file, std::uint32_t line,
                           std::string_view what) {
    return KSError::make(kConfigurationErrorDomain, 1,
                         fmt::format("{}:{}: {}", file.string(), line, what));
}

}  // namespace

Configuration defaultConfiguration(const Environment& environment) {
    Configuration configuration;
    if (const auto home = environment("HOME")) {
        const std::filesystem::path base(*home);
        configuration.deviceData.tracks = {base / "Tracks"};
        configuration.deviceData.photos = {base / "Pictures"};
        configuration.deviceData.calendars = {base / ".calendars"};
        configuration.deviceData.messages = {base / "Mail"};
        configuration.deviceData.contacts = {base / ".contacts"};
    }
    return configuration;
}

std::expected<Configuration, KSError> loadConfiguration(const std::filesystem::path& file,
                                                        const Environment& environment) {
    const auto text = readFile(file, kLargestFile);
    if (!text) return std::unexpected(text.error());
    toml::table root;
    try {
        root = toml::parse(*text);
    } catch (const toml::parse_error& error) {
        return std::unexpected(
            configurationError(file, error.source().begin.line, error.description()));
    }
    auto configuration = defaultConfiguration(environment);
    const auto keys = keysOf(configuration);
    const Surroundings around{std::filesystem::absolute(file).parent_path(), environment};
    std::vector<Problem> problems;
    for (const auto& [section, content] : root) {
        applySection(section, content, keys, around, problems);
    }
    const auto first = std::ranges::min_element(problems, {}, &Problem::line);
    if (first != problems.end()) {
        return std::unexpected(configurationError(file, first->line, first->what));
    }
    return configuration;
}

std::expected<Configuration, KSError> loadConfigurationIfAny(const std::filesystem::path& file,
                                                             const Environment& environment) {
    auto loaded = loadConfiguration(file, environment);
    if (!loaded && loaded.error().domain == kPosixErrorDomain && loaded.error().code == ENOENT) {
        return defaultConfiguration(environment);
    }
    return loaded;
}

}  // namespace keepsakes
