// SPDX-License-Identifier: Apache-2.0
#include "linux/IndexerProcess.h"

#include <fmt/format.h>

#include <algorithm>
#include <csignal>
#include <cstring>

#include "core/Json.h"
#include "core/Log.h"
#include "linux/ChildProcess.h"

namespace keepsakes {

/// A caller of `refresh`.
struct IndexerProcess::Waiter {
    Semaphore woken;
    bool isExpired = false;  ///< Under the mutex.
};

/// What the children of one scan said.
struct IndexerProcess::ChildReport {
    ScanReport scan;                    ///< `problems` oldest first.
    std::vector<std::string> failures;  ///< Of the indexer itself.
    bool isReported = false;
    Timer silence;
};

namespace {

std::uint64_t count(const KSDictionary& dictionary, std::string_view key) {
    const auto number = valueForKey(dictionary, key).asInteger();
    return number && *number > 0 ? static_cast<std::uint64_t>(*number) : 0;
}

}  // namespace

IndexerProcess::IndexerProcess(Clock& clock, IndexerOptions options)
    : clock_(clock), options_(std::move(options)) {}

IndexerProcess::~IndexerProcess() {
    stop();
    std::thread supervisor;
    {
        const std::lock_guard held(mutex_);
        supervisor = std::move(supervisor_);
    }
    if (supervisor.joinable()) supervisor.join();
}

ScanReport IndexerProcess::refresh(const Progress& progress) {
    const auto waiter = std::make_shared<Waiter>();
    std::unique_lock lock(mutex_);
    if (!isStopped_ && !isScanning_) startScan();
    const auto scan = scanNumber_;
    waiters_.push_back(waiter);
    lock.unlock();
    const auto limit = clock_.after(timers_, options_.replyLimit, [this, waiter] {
        const std::lock_guard held(mutex_);
        waiter->isExpired = true;
        waiter->woken.signal();
    });
    lock.lock();
    std::pair<std::uint64_t, std::uint64_t> told;
    while (isScanning_ && scanNumber_ == scan && !waiter->isExpired && !isStopped_) {
        const std::pair now(done_, total_);
        lock.unlock();
        if (progress && now != told) progress(now.first, now.second);
        told = now;
        waiter->woken.wait();
        lock.lock();
    }
    std::erase(waiters_, waiter);
    auto report = last_;
    const bool isOver = !isScanning_ || scanNumber_ != scan;
    report.complete = report.complete && isOver && !isStopped_;
    return report;
}

ScanReport IndexerProcess::lastReport() const {
    const std::lock_guard held(mutex_);
    return last_;
}

void IndexerProcess::stop() {
    const std::lock_guard held(mutex_);
    isStopped_ = true;
    if (child_) child_->end(SIGTERM);
    wakeWaiters();
}

/// Under the mutex.
void IndexerProcess::wakeWaiters() {
    for (const auto& waiter : waiters_) waiter->woken.signal();
}

/// Under the mutex; the supervisor of the scan before has nothing left to do but return.
void IndexerProcess::startScan() {
    if (supervisor_.joinable()) supervisor_.join();
    abandoned_.clear();
    isScanning_ = true;
    ++scanNumber_;
    done_ = 0;
    total_ = 0;
    // A thread of its own: it blocks on the child for as long as that runs, and whoever waits for
    // the queues to come to rest shall not wait for a child.
    supervisor_ = std::thread([this] { supervise(); });
}

void IndexerProcess::supervise() {
    ChildReport report;
    auto outcome = Outcome::crashed;
    int starts = 0;
    const auto hardLimit = clock_.after(timers_, options_.hardLimit, [this] {
        const std::lock_guard held(mutex_);
        logWarning("the scan of the owner's files takes too long and is ended");
        if (child_) child_->end(SIGTERM);
    });
    while (outcome == Outcome::crashed && starts < options_.mostStarts) {
        ++starts;
        outcome = runChild(report);
    }
    if (outcome == Outcome::crashed) {
        report.failures.push_back(
            fmt::format("the indexer crashed {} times; the next scan goes on", starts));
    }
    const std::lock_guard held(mutex_);
    if (outcome == Outcome::complete) {
        last_ = std::move(report.scan);
        last_.complete = true;
        std::ranges::reverse(last_.problems);
    } else {
        for (const auto& failure : report.failures) logError(failure);
        last_.complete = false;
        auto problems = std::move(report.failures);
        for (auto& problem : last_.problems) {
            if (std::ranges::find(problems, problem) == problems.end()) {
                problems.push_back(std::move(problem));
            }
        }
        last_.problems = std::move(problems);
    }
    if (last_.problems.size() > kMostProblems) last_.problems.resize(kMostProblems);
    isScanning_ = false;
    wakeWaiters();
}

IndexerProcess::Outcome IndexerProcess::runChild(ChildReport& report) {
    report.scan = {};
    report.isReported = false;
    std::shared_ptr<ChildProcess> child;
    {
        const std::lock_guard held(mutex_);
        if (isStopped_) return Outcome::failed;
        auto started = ChildProcess::start(arguments());
        if (!started) {
            report.failures.push_back(started.error().description());
            return Outcome::failed;
        }
        child = *started;
        child_ = child;
    }
    const auto watchSilence = [this, &report, &child] {
        report.silence =
            clock_.after(timers_, options_.silenceLimit, [weak = std::weak_ptr(child)] {
                logWarning("the indexer hangs and is killed");
                if (const auto hung = weak.lock()) hung->end(SIGKILL);
            });
    };
    watchSilence();
    const auto end = child->run([this, &report, &watchSilence](std::string_view line) {
        watchSilence();
        takeLine(line, report);
    });
    report.silence.cancel();
    {
        const std::lock_guard held(mutex_);
        if (end.abandoned) abandoned_.push_back(std::move(child_));
        child_.reset();
    }
    return judge(end, report);
}

void IndexerProcess::takeLine(std::string_view line, ChildReport& report) {
    const auto value = parseJson(line);
    const auto* message = value ? value->asDictionary() : nullptr;
    if (!message) {
        logWarning("the indexer wrote a line that is no JSON object");
        return;
    }
    if (const auto* progress = valueForKey(*message, "progress").asDictionary()) {
        const std::lock_guard held(mutex_);
        done_ = count(*progress, "done");
        total_ = count(*progress, "total");
        wakeWaiters();
    }
    if (const auto* problem = valueForKey(*message, "problem").asString()) {
        auto& problems = report.scan.problems;
        if (problems.size() == kMostProblems) problems.erase(problems.begin());
        problems.push_back(*problem);
    }
    if (const auto* counts = valueForKey(*message, "report").asDictionary()) {
        report.scan.filesIndexed = count(*counts, "indexed");
        report.scan.filesRefused = count(*counts, "refused");
        report.isReported = true;
    }
}

IndexerProcess::Outcome IndexerProcess::judge(const ChildEnd& end, ChildReport& report) {
    if (end.exited && end.status == 0 && report.isReported) return Outcome::complete;
    bool isStopped = false;
    {
        const std::lock_guard held(mutex_);
        isStopped = isStopped_;
    }
    // Status 4 is the indexer's word for having been told to stop, which the hard limit does too.
    if (isStopped || (end.exited && end.status == 4) || end.signal == SIGTERM) {
        if (!isStopped) report.failures.emplace_back("the scan of files took too long");
        return Outcome::failed;
    }
    if (end.abandoned) {
        report.failures.emplace_back("the indexer hangs and cannot be ended");
        return Outcome::failed;
    }
    if (end.exited) {
        report.failures.push_back(
            fmt::format("the indexer failed with status {}; its log says why", end.status));
        return Outcome::failed;
    }
    logWarning(fmt::format("the indexer was ended by signal {}", end.signal));
    return Outcome::crashed;
}

std::vector<std::string> IndexerProcess::arguments() const {
    std::vector<std::string> words{
        options_.program.string(), "--json", "--index",
        options_.index.string(),   "--now",  fmt::format("{}", clock_.now().seconds)};
    const auto add = [&words](const char* option, const std::vector<std::filesystem::path>& paths) {
        if (paths.empty()) return;
        words.emplace_back(option);
        for (const auto& path : paths) words.push_back(std::filesystem::absolute(path).string());
    };
    add("--tracks", options_.tracks);
    add("--photos", options_.photos);
    add("--places", options_.places);
    if (!options_.gazetteer.empty()) add("--gazetteer", {options_.gazetteer});
    add("--messages", options_.messages);
    add("--contacts", options_.contacts);
    add("--calendars", options_.calendars);
    if (!options_.ownerAddresses.empty()) {
        words.emplace_back("--owner");
        words.insert(words.end(), options_.ownerAddresses.begin(), options_.ownerAddresses.end());
    }
    return words;
}

}  // namespace keepsakes
