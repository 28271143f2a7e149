// SPDX-License-Identifier: Apache-2.0
#include "daemon/DiagnosticReport.h"

#include <fmt/format.h>
#include <fmt/ranges.h>
#include <unistd.h>

#include <algorithm>
#include <fstream>
#include <memory>
#include <mutex>
#include <optional>
#include <utility>

#include "collect/KSEventManager.h"
#include "core/Clock.h"
#include "core/Log.h"
#include "daemon/KSDaemonUniverse.h"
#include "platform/DeviceState.h"
#include "platform/PlatformServices.h"
#include "platform/PowerSources.h"
#include "platform/SystemNotifications.h"
#include "service/StatusReporter.h"
#include "store/KSPersistenceManager.h"

namespace keepsakes {

namespace {

constexpr double kLongestCountSeconds = 5;

const char* word(bool yes) { return yes ? "yes" : "no"; }

const char* lockWord(int state) {
    switch (state) {
        case 0:
            return "unlocked";
        case 1:
            return "locked";
        case 2:
            return "locking";
        default:
            return "not known";
    }
}

/// The value of one line of /proc/self/status, such as "VmRSS"; see proc(5).
std::string processStatus(std::string_view key) {
    std::ifstream in("/proc/self/status");
    for (std::string line; std::getline(in, line);) {
        if (!line.starts_with(key) || line.substr(key.size(), 1) != ":") continue;
        const auto value = line.find_first_not_of(": \t", key.size());
        return value == line.npos ? "" : line.substr(value);
    }
    return "?";
}

}  // namespace

DiagnosticReport::DiagnosticReport(const KSDaemonUniverse& universe)
    : universe_(universe), startedAt_(universe.platform().clock->now()) {}

void DiagnosticReport::start() {
    universe_.platform().systemNotifications->post(SystemNotifications::kDiagnosticReportStarted);
    queue_.async([this] { write(); });
}

void DiagnosticReport::write() {
    const auto section = [](std::string_view title, const std::vector<std::string>& lines) {
        logInfo(fmt::format("report: {}", title));
        for (const auto& line : lines) logInfo(fmt::format("report:   {}", line));
    };
    section("begins: daemon", daemonLines());
    section("device", deviceLines());
    section("services", serviceLines());
    section("queues", queueLines());
    section("counts", countLines());
    logInfo("report: ends");
}

std::vector<std::string> DiagnosticReport::daemonLines() const {
    const auto& platform = universe_.platform();
    const auto& switches = platform.switches;
    return {
        fmt::format("version {}, process {}, resident {}, threads {}", KEEPSAKES_VERSION,
                    ::getpid(), processStatus("VmRSS"), processStatus("Threads")),
        fmt::format("time {}, started {}", formatISO8601(platform.clock->now()),
                    formatISO8601(startedAt_)),
        fmt::format("collection {}, compute {}, purge {}", switches.collectEnabled ? "on" : "off",
                    switches.computeEnabled ? "on" : "off", switches.purgeEnabled ? "on" : "off"),
    };
}

std::vector<std::string> DiagnosticReport::deviceLines() const {
    const auto& platform = universe_.platform();
    const auto& lock = *platform.lockState;
    const auto& policy = *platform.devicePolicy;
    return {
        fmt::format("content protection {}, {}, unlocked since boot {}",
                    lock.formattedForContentProtection() ? "on" : "off",
                    lockWord(lock.currentState()), word(lock.unlockedSinceBoot())),
        fmt::format("external power {}", word(platform.powerSources->hasExternalPower())),
        fmt::format("allowed: diagnostics {}, health data {}",
                    word(policy.diagnosticSubmissionAllowed()),
                    word(policy.healthDataSubmissionAllowed())),
    };
}

std::vector<std::string> DiagnosticReport::serviceLines() const {
    std::vector<std::string> lines;
    for (const auto& name : universe_.serviceNames()) {
        const auto service = universe_.getService(name);
        const auto told = service ? service->diagnosticLines() : std::vector<std::string>{"absent"};
        lines.push_back(name + (told.size() == 1 ? ": " + told.front() : ""));
        if (told.size() == 1) continue;
        for (const auto& line : told) lines.push_back("  " + line);
    }
    return lines;
}

std::vector<std::string> DiagnosticReport::queueLines() {
    std::vector<std::string> lines;
    std::vector<std::string> idle;
    for (const auto& queue : WorkQueue::reports()) {
        if (queue.isRunning) {
            lines.push_back(fmt::format("{}: running, {} waiting", queue.label, queue.waiting));
        } else {
            idle.push_back(queue.label);
        }
    }
    lines.push_back(fmt::format("idle: {}", fmt::join(idle, ", ")));
    return lines;
}

std::vector<std::string> DiagnosticReport::countLines() const {
    struct Reply {
        std::mutex mutex;
        std::optional<DaemonStatus> status;
    };
    const auto reply = std::make_shared<Reply>();
    Semaphore answered;
    StatusReporter reporter(universe_.platform(),
                            universe_.service<KSPersistenceManager>("PersistenceManager"));
    reporter.status([reply, answered](DaemonStatus status) mutable {
        {
            const std::lock_guard lock(reply->mutex);
            reply->status = std::move(status);
        }
        answered.signal();
    });
    universe_.platform().clock->wait(answered, kLongestCountSeconds);
    const std::lock_guard lock(reply->mutex);
    if (!reply->status) return {"the database is busy"};
    const auto& status = *reply->status;
    const auto outcome = universe_.service<KSEventManager>("EventManager")->lastOutcome();
    std::vector<std::string> lines = {
        fmt::format("database {}, last collection {}", status.databaseAvailable ? "open" : "closed",
                    status.lastCollection == 0 ? "never" : formatISO8601({status.lastCollection})),
        fmt::format("events {}, bundles {}", status.eventCount, status.bundleCount),
        fmt::format("files indexed {}, refused {}", status.filesIndexed, status.filesRefused),
        fmt::format("sources answered {}, failed {}", outcome.answered.size(),
                    outcome.failed.size()),
        fmt::format("problems {}", status.problems.size()),
    };
    for (const auto& problem : status.problems) lines.push_back("  " + problem);
    return lines;
}

}  // namespace keepsakes
