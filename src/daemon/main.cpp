// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>
#include <malloc.h>

#include <CLI/CLI.hpp>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <optional>
#include <string>

#include "bundle/KSEventBundleManager.h"
#include "collect/KSEventManager.h"
#include "config/Configuration.h"
#include "core/Calendar.h"
#include "core/KSAssertion.h"
#include "core/Log.h"
#include "daemon/DevicePorts.h"
#include "daemon/DiagnosticReport.h"
#include "daemon/KSDaemonUniverse.h"
#include "daemon/MainLoop.h"
#include "daemon/ProgressReport.h"
#include "linux/FileWatch.h"
#include "platform/BackgroundActivities.h"
#include "platform/DeviceDataIndex.h"
#include "platform/DeviceState.h"
#include "platform/NearbyDevices.h"
#include "store/KSPersistenceManager.h"
#include "wire/BusListener.h"

namespace {

using namespace keepsakes;

struct Arguments {
    std::string config;
    std::string logLevel = "info";
    std::string now;
    bool abortOnAssertion = false;
};

/// The one line that says why the daemon does not start.
int refuse(std::string_view reason) {
    fmt::print(stderr, "keepsakesd: {}\n", reason);
    return EXIT_FAILURE;
}

std::filesystem::path configurationFile(const Arguments& arguments,
                                        const StandardFolders& folders) {
    return arguments.config.empty() ? folders.configurationFile()
                                    : std::filesystem::path(arguments.config);
}

/// A file that was named has to be there; the owner's own need not.
std::expected<Configuration, KSError> configurationOf(const Arguments& arguments,
                                                      const StandardFolders& folders) {
    const auto file = configurationFile(arguments, folders);
    return arguments.config.empty() ? loadConfigurationIfAny(file) : loadConfiguration(file);
}

/// The system's clock, or one that starts at the given time; without a zone that is the owner's.
std::unique_ptr<Clock> clockStartingAt(const std::string& text) {
    if (text.empty()) return std::make_unique<SystemClock>();
    const auto time = parseISO8601(text);
    if (!time) return nullptr;
    return std::make_unique<SystemClock>(time->offsetSeconds ? time->date
                                                             : calendar::fromLocal(time->date));
}

void connectSignals(const KSDaemonUniverse& universe, BusListener& listener, Clock& clock) {
    universe.service<KSPersistenceManager>("PersistenceManager")
        ->setChangeObserver([&listener](ManagedObjectContext::Changes changes) {
            if (changes.events) listener.emitEventsChanged();
            if (changes.bundles) listener.emitBundlesChanged();
        });
    universe.service<KSEventManager>("EventManager")
        ->setProgressObserver(
            [&listener, report = std::make_shared<ProgressReport>(clock)](
                std::string_view activity, std::uint64_t done, std::uint64_t total) {
                if (report->isDue(activity, done)) {
                    listener.emitProgress(std::string(activity), done, total);
                }
            });
}

/// Ends the process should ending in order not come to an end: what was answered is on disk.
Timer limitOnEnding(Clock& clock, const WorkQueue& queue) {
    constexpr double kLongestEnding = 15;
    return clock.after(queue, kLongestEnding, [] {
        logError("ending in order took too long");
        std::_Exit(EXIT_SUCCESS);
    });
}

int runDaemon(const Arguments& arguments, MainLoop& mainLoop) {
    const auto folders = StandardFolders::find();
    if (!folders) return refuse(folders.error().description());
    FileWatch settings(configurationFile(arguments, *folders));  // misses nothing from here on
    const auto configuration = configurationOf(arguments, *folders);
    if (!configuration) return refuse(configuration.error().description());
    auto clock = clockStartingAt(arguments.now);
    if (!clock) return refuse(fmt::format("--now: \"{}\" is not an ISO 8601 time", arguments.now));

    auto listener = BusListener::claim();
    if (!listener) return refuse(listener.error().description());
    (*listener)->setDisconnectedHandler([&mainLoop] {
        logError("the session bus went away");
        mainLoop.stop(EXIT_FAILURE);
    });

    DevicePorts ports(
        *configuration,
        [arguments, folders = *folders] { return configurationOf(arguments, folders); }, *folders,
        std::move(clock));
    mainLoop.watch(settings.descriptor(), [&settings, &ports] {
        if (settings.take()) ports.policy().fileChanged();
    });
    auto& services = ports.services();
    services.listener = listener->get();
    // Asked and not used: health data decides nothing at start.
    static_cast<void>(services.devicePolicy->healthDataSubmissionAllowed());
    const bool allowed = services.devicePolicy->diagnosticSubmissionAllowed();
    services.switches = {allowed, allowed, allowed, allowed};

    WorkQueue endQueue("end");
    std::optional<KSDaemonUniverse> universe(std::in_place, services);
    connectSignals(*universe, **listener, *services.clock);
    universe->run(services.switches.anyEnabled, [&mainLoop] { mainLoop.stop(EXIT_SUCCESS); });

    std::optional<DiagnosticReport> report(std::in_place, *universe);
    mainLoop.setReportHandler([&report] { report->start(); });

    const int status = mainLoop.run();

    // First what feeds the services, then they themselves.
    const auto limit = limitOnEnding(*services.clock, endQueue);
    (*listener)->invalidate();
    services.activities->stop();
    services.deviceData->stop();
    if (services.nearbyDevices) services.nearbyDevices->stop();
    WorkerThreads::shared().settle();
    report.reset();
    universe.reset();
    return status;
}

}  // namespace

int main(int argc, char** argv) {
    std::setvbuf(stdout, nullptr, _IOLBF, 0);
    // Each arena keeps what its threads freed; queues move from thread to thread.
    mallopt(M_ARENA_MAX, 2);  // NOLINT(concurrency-mt-unsafe): no other thread runs yet

    Arguments arguments;
    CLI::App app("Gathers what happened in its owner's life into a local database.", "keepsakesd");
    app.add_option("--config", arguments.config, "Read this file in place of the owner's");
    app.add_option("--log-level", arguments.logLevel, "debug, info, warning, error or off");
    app.add_option("--now", arguments.now, "Start the daemon's clock at this time (ISO 8601)");
    app.add_flag("--abort-on-assertion", arguments.abortOnAssertion,
                 "End with a core dump when an assertion fails");
    app.set_version_flag("--version", "keepsakesd " KEEPSAKES_VERSION);
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        return app.exit(error) == 0 ? EXIT_SUCCESS : EXIT_FAILURE;
    }

    const auto level = parseLogLevel(arguments.logLevel);
    if (!level) return refuse(fmt::format("--log-level: unknown level {}", arguments.logLevel));
    setLogLevel(*level);
    if (arguments.abortOnAssertion) {
        setAssertionHandler([](const KSAssertionFailure&) { std::abort(); });
    }
    try {
        MainLoop mainLoop;
        return runDaemon(arguments, mainLoop);
    } catch (const std::exception& error) {
        return refuse(error.what());
    }
}
