// SPDX-License-Identifier: Apache-2.0
#include "indexer/IndexerMain.h"

#include <fmt/format.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <charconv>
#include <chrono>
#include <expected>
#include <span>
#include <string_view>

#include "config/Configuration.h"
#include "core/Calendar.h"
#include "core/Files.h"
#include "core/Log.h"
#include "indexer/FolderScan.h"
#include "indexer/Sandbox.h"
#include "indexer/ScanReporter.h"

namespace keepsakes {

namespace {

constexpr int kFailed = 1;
constexpr int kUsage = 2;
constexpr int kBusy = 3;

constexpr const char* kHelp =
    "usage: keepsakes-indexer [--config FILE] [--index FILE] [--tracks FOLDER...]\n"
    "                         [--photos FOLDER...] [--places FOLDER...] [--gazetteer FILE]\n"
    "                         [--messages FOLDER...] [--contacts FOLDER...]\n"
    "                         [--calendars FOLDER...]\n"
    "                         [--owner ADDRESS...] [--now SECONDS] [--seconds-per-file N]\n"
    "                         [--json | --human]\n"
    "Scans the folders once and brings the index up to date.\n"
    "  --config   whose folders to scan when none are given; otherwise the daemon's\n"
    "  --index    the index; otherwise the daemon's, in the user's cache folder\n"
    "  --gazetteer  a table of towns in the format of GeoNames, to call places by\n"
    "  --owner    mail addresses and telephone numbers of the owner\n"
    "  --now      the time to take for now, in seconds since 2001-01-01 UTC\n"
    "  --json     one JSON object a line on standard output\n"
    "  --human    sentences for people; the default on a terminal\n";

struct Arguments {
    ScanOptions scan;
    std::filesystem::path config;
    unsigned secondsPerFile = ReadMark::kSecondsPerFile;
    bool json = ::isatty(STDOUT_FILENO) != 1;
    bool help = false;
};

KSDate systemNow() {
    return KSDate::fromUnix(
        std::chrono::duration<double>(std::chrono::system_clock::now().time_since_epoch()).count());
}

/// Completes what the arguments leave open: the folders from the configuration, the index from the
/// user's cache folder. Why that cannot be done, or nothing.
std::optional<std::string> complete(Arguments& arguments) {
    auto& scan = arguments.scan;
    const bool needsFolders = scan.tracks.empty() && scan.photos.empty() && scan.places.empty() &&
                              scan.messages.empty() && scan.contacts.empty() &&
                              scan.calendars.empty();
    if (!needsFolders && !scan.index.empty()) return std::nullopt;
    const auto standard = StandardFolders::find();
    if (!standard) return standard.error().description();
    if (scan.index.empty()) scan.index = standard->cache / "deviceData.sqlite";
    if (!needsFolders) return std::nullopt;
    const auto configuration = arguments.config.empty()
                                   ? loadConfigurationIfAny(standard->configurationFile())
                                   : loadConfiguration(arguments.config);
    if (!configuration) return configuration.error().description();
    scan.tracks = configuration->deviceData.tracks;
    scan.photos = configuration->deviceData.photos;
    scan.places = configuration->deviceData.places;
    if (scan.gazetteer.empty()) scan.gazetteer = configuration->deviceData.gazetteer;
    scan.messages = configuration->deviceData.messages;
    scan.contacts = configuration->deviceData.contacts;
    scan.calendars = configuration->deviceData.calendars;
    if (scan.ownerAddresses.empty()) scan.ownerAddresses = configuration->owner.addresses;
    return std::nullopt;
}

template <class T>
bool parseNumber(std::string_view text, T& number) {
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    return error == std::errc() && end == text.data() + text.size();
}

/// The list of folders that an option fills; null for another option.
std::vector<std::filesystem::path>* foldersOf(std::string_view option, ScanOptions& scan) {
    if (option == "--tracks") return &scan.tracks;
    if (option == "--photos") return &scan.photos;
    if (option == "--places") return &scan.places;
    if (option == "--messages") return &scan.messages;
    if (option == "--contacts") return &scan.contacts;
    if (option == "--calendars") return &scan.calendars;
    return nullptr;
}

/// Why the arguments cannot be taken, or nothing.
std::optional<std::string> parse(std::span<char*> words, Arguments& arguments) {
    std::size_t i = 0;
    const auto isOption = [](std::string_view word) { return word.starts_with("--"); };
    const auto value = [&words, &i]() -> std::optional<std::string_view> {
        return i < words.size() ? std::optional<std::string_view>(words[i++]) : std::nullopt;
    };
    while (i < words.size()) {
        const std::string_view option(words[i++]);
        if (auto* folders = foldersOf(option, arguments.scan)) {
            while (i < words.size() && !isOption(words[i])) folders->emplace_back(words[i++]);
        } else if (option == "--owner") {
            while (i < words.size() && !isOption(words[i])) {
                arguments.scan.ownerAddresses.emplace_back(words[i++]);
            }
        } else if (option == "--index") {
            const auto path = value();
            if (!path) return "--index needs a file";
            arguments.scan.index = *path;
        } else if (option == "--gazetteer") {
            const auto path = value();
            if (!path) return "--gazetteer needs a file";
            arguments.scan.gazetteer = *path;
        } else if (option == "--config") {
            const auto path = value();
            if (!path) return "--config needs a file";
            arguments.config = *path;
        } else if (option == "--now") {
            const auto text = value();
            if (!text || !parseNumber(*text, arguments.scan.now.seconds)) {
                return "--now needs seconds since 2001-01-01 UTC";
            }
        } else if (option == "--seconds-per-file") {
            const auto text = value();
            if (!text || !parseNumber(*text, arguments.secondsPerFile) ||
                arguments.secondsPerFile == 0) {
                return "--seconds-per-file needs a number above 0";
            }
        } else if (option == "--json" || option == "--human") {
            arguments.json = option == "--json";
        } else if (option == "--help") {
            arguments.help = true;
        } else {
            return fmt::format("what is {}?", option);
        }
    }
    return std::nullopt;
}

int scan(const Arguments& arguments, FileReader& reader) {
    auto options = arguments.scan;
    options.latest = std::max(options.now, systemNow());
    const auto folder = std::filesystem::absolute(options.index).parent_path();
    if (const auto error = makePrivateFolder(folder)) {
        logError(error->description());
        return kFailed;
    }
    const auto mark = ReadMark::take(options.index.string() + ".scan", arguments.secondsPerFile);
    if (!mark) {
        logError(mark.error());
        return kBusy;
    }
    const auto standard = defaultConfiguration().deviceData;
    for (const auto& folders : {standard.tracks, standard.photos, standard.messages,
                                standard.contacts, standard.calendars}) {
        options.standardFolders.insert(options.standardFolders.end(), folders.begin(),
                                       folders.end());
    }
    // Loads the owner's zone while its file can be read.
    calendar::offsetAt(options.now);
    auto readable = options.tracks;
    for (const auto& folders :
         {options.photos, options.places, options.messages, options.contacts, options.calendars}) {
        readable.insert(readable.end(), folders.begin(), folders.end());
    }
    if (!options.gazetteer.empty()) {
        // The configured file may be a link; what it leads to is read.
        std::error_code ignored;
        options.gazetteer = std::filesystem::weakly_canonical(options.gazetteer, ignored);
        readable.push_back(options.gazetteer);
    }
    confineProcess(readable, {folder});
    // People read of each problem in the report.
    if (!arguments.json) setLogLevel(LogLevel::error);
    const auto reporter = arguments.json ? makeJsonReporter() : makeHumanReporter();
    if (const auto error = scanFolders(options, reader, **mark, *reporter)) {
        logError(error->description());
        return kFailed;
    }
    return 0;
}

}  // namespace

int runIndexer(int argc, char** argv, FileReader& reader) {
    ::umask(077);
    Arguments arguments;
    arguments.scan.now = systemNow();
    if (const auto error =
            parse({argv + 1, static_cast<std::size_t>(argc > 0 ? argc - 1 : 0)}, arguments)) {
        fmt::print(stderr, "keepsakes-indexer: {}\n{}", *error, kHelp);
        return kUsage;
    }
    if (arguments.help) {
        fmt::print("{}", kHelp);
        return 0;
    }
    if (const auto error = complete(arguments)) {
        fmt::print(stderr, "keepsakes-indexer: {}\n", *error);
        return kFailed;
    }
    return scan(arguments, reader);
}

}  // namespace keepsakes
