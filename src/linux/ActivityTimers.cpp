// SPDX-License-Identifier: Apache-2.0
#include "linux/ActivityTimers.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <cmath>
#include <optional>
#include <utility>

#include "core/Clock.h"
#include "core/Files.h"
#include "core/KSAssertion.h"
#include "core/Log.h"
#include "core/PropertyList.h"

namespace keepsakes {

namespace {

constexpr std::string_view kUnit = "ActivityTimers";

/// "45 s", "12 min", "2 h 30 min", "3 d": its largest unit and, where that leaves a rest, the next.
std::string durationText(double seconds) {
    constexpr std::array<std::pair<std::int64_t, std::string_view>, 4> kUnits = {
        {{86400, "d"}, {3600, "h"}, {60, "min"}, {1, "s"}}};
    auto rest = std::llround(std::max(seconds, 0.0));
    std::string text;
    for (const auto& [unit, name] : kUnits) {
        const auto count = rest / unit;
        rest %= unit;
        if (!text.empty()) return count > 0 ? fmt::format("{} {} {}", text, count, name) : text;
        if (count > 0) text = fmt::format("{} {}", count, name);
    }
    return text.empty() ? "0 s" : text;
}

/// A run as its holders see it; tells its end once.
class TimedRun final : public ActivityRun {
  public:
    explicit TimedRun(std::function<void(bool finished)> atEnd) : atEnd_(std::move(atEnd)) {}
    ~TimedRun() override { end(false); }
    TimedRun(const TimedRun&) = delete;
    TimedRun& operator=(const TimedRun&) = delete;
    void finish() override { end(true); }

  private:
    void end(bool finished) {
        if (!ended_.exchange(true)) atEnd_(finished);
    }

    const std::function<void(bool)> atEnd_;
    std::atomic<bool> ended_ = false;
};

}  // namespace

/// Shared with the runs under way, whose ends may come late. All on its queue.
class ActivityTimers::State : public std::enable_shared_from_this<State> {
  public:
    State(Clock& clock, std::vector<ActivityCriteria> criteria, std::filesystem::path stateFile);

    void add(std::string_view identifier, ActivityBlock block);
    void remove(std::string_view identifier);
    std::vector<std::string> describe() const;
    void stop();
    void setExternalPower(bool connected);

    WorkQueue& queue() { return queue_; }

  private:
    struct Activity {
        ActivityCriteria criteria;
        std::optional<KSDate> lastStart;  // of the last run that finished
        ActivityBlock block;              // null while nothing is registered
        double due = 0;                   // on the clock's elapsed time, as what follows
        double started = 0;
        KSDate startDate;
        bool running = false;

        bool isIdle() const { return block && criteria.periodSeconds > 0 && !running; }
    };

    Activity* find(std::string_view identifier);
    bool lacksPower(const Activity& activity) const {
        return activity.criteria.requireExternalPower && !externalPower_;
    }
    void startWhatIsDue();
    void start(Activity& activity);
    void ended(const std::string& identifier, bool finished);
    std::string describe(const Activity& activity) const;
    void readStateFile();
    void writeStateFile();

    Clock& clock_;
    const std::filesystem::path stateFile_;
    std::vector<Activity> activities_;
    double settleSeconds_ = kSettleSeconds;
    double secondsBetweenStarts_ = kSecondsBetweenStarts;
    double earliestStart_ = 0;
    bool externalPower_ = true;
    bool stopped_ = false;
    bool writeFailed_ = false;
    Timer timer_;
    WorkQueue queue_{"ActivityTimers"};
};

ActivityTimers::State::State(Clock& clock, std::vector<ActivityCriteria> criteria,
                             std::filesystem::path stateFile)
    : clock_(clock), stateFile_(std::move(stateFile)) {
    for (auto& one : criteria) {
        if (one.periodSeconds > 0) {
            settleSeconds_ = std::min(settleSeconds_, one.periodSeconds);
            secondsBetweenStarts_ =
                std::min(secondsBetweenStarts_,
                         one.periodSeconds / static_cast<double>(2 * criteria.size()));
        }
        activities_.push_back({.criteria = std::move(one)});
    }
    readStateFile();
}

ActivityTimers::State::Activity* ActivityTimers::State::find(std::string_view identifier) {
    const auto found = std::ranges::find_if(activities_, [&](const Activity& activity) {
        return activity.criteria.identifier == identifier;
    });
    return found == activities_.end() ? nullptr : &*found;
}

void ActivityTimers::State::add(std::string_view identifier, ActivityBlock block) {
    auto* activity = find(identifier);
    if (!activity) {
        logError(fmt::format("no times are declared for the activity {}", identifier));
        return;
    }
    if (!assertParameter(!activity->block, "the activity is not registered yet", kUnit, __LINE__)) {
        return;
    }
    activity->block = std::move(block);
    const double period = activity->criteria.periodSeconds;
    double remaining = 0;
    // A start in the future means that the clock was set back since.
    if (activity->lastStart) {
        remaining = std::clamp(*activity->lastStart + period - clock_.now(), 0.0, period);
    }
    activity->due = clock_.elapsed() + std::max(remaining, settleSeconds_);
    startWhatIsDue();
}

void ActivityTimers::State::remove(std::string_view identifier) {
    auto* activity = find(identifier);
    if (activity) activity->block = nullptr;
}

void ActivityTimers::State::startWhatIsDue() {
    timer_.cancel();
    if (stopped_) return;
    const double now = clock_.elapsed();
    Activity* next = nullptr;
    for (auto& activity : activities_) {
        if (!activity.isIdle()) continue;
        if (activity.due <= now && lacksPower(activity)) continue;  // the charger's coming wakes it
        if (!next || activity.due < next->due) next = &activity;
    }
    if (!next) return;
    const double begin = std::max(next->due, earliestStart_);
    if (begin > now) {
        timer_ = clock_.afterElapsed(queue_, begin - now, [this] { startWhatIsDue(); });
        return;
    }
    earliestStart_ = now + secondsBetweenStarts_;
    start(*next);
    startWhatIsDue();
}

void ActivityTimers::State::start(Activity& activity) {
    activity.running = true;
    activity.started = clock_.elapsed();
    activity.startDate = clock_.now();
    logInfo(fmt::format("{} starts", activity.criteria.identifier));
    const auto block = activity.block;
    block(std::make_shared<TimedRun>([weak = weak_from_this(), append = queue_.detachedAppender(),
                                      identifier = activity.criteria.identifier](bool finished) {
        append([weak, identifier, finished] {
            if (const auto state = weak.lock()) state->ended(identifier, finished);
        });
    }));
}

void ActivityTimers::State::ended(const std::string& identifier, bool finished) {
    auto& activity = *find(identifier);
    activity.running = false;
    const double now = clock_.elapsed();
    const double period = activity.criteria.periodSeconds;
    activity.due = activity.started + period * (std::floor((now - activity.started) / period) + 1);
    logInfo(fmt::format("{} {} after {}", identifier, finished ? "finished" : "was given up",
                        durationText(now - activity.started)));
    if (finished) {
        activity.lastStart = activity.startDate;
        writeStateFile();
    }
    startWhatIsDue();
}

void ActivityTimers::State::stop() {
    stopped_ = true;
    timer_.cancel();
}

void ActivityTimers::State::setExternalPower(bool connected) {
    if (std::exchange(externalPower_, connected) != connected) startWhatIsDue();
}

std::string ActivityTimers::State::describe(const Activity& activity) const {
    const double now = clock_.elapsed();
    if (activity.running) return "running for " + durationText(now - activity.started);
    if (activity.criteria.periodSeconds <= 0) return "off";
    if (stopped_) return "stopped";
    const double until = std::max(activity.due, earliestStart_) - now;
    if (activity.due <= now && lacksPower(activity)) {
        return fmt::format("due for {}, waiting for external power",
                           durationText(now - activity.due));
    }
    return fmt::format("due in {}", durationText(until));
}

std::vector<std::string> ActivityTimers::State::describe() const {
    std::vector<std::string> lines;
    for (const auto& activity : activities_) {
        if (!activity.block) continue;
        const auto& [identifier, period, power] = activity.criteria;
        std::string line = fmt::format("{}: {}", identifier, describe(activity));
        if (period > 0) line += fmt::format("; every {}", durationText(period));
        if (period > 0 && power) line += " on external power";
        line += activity.lastStart ? "; last run " + formatISO8601(*activity.lastStart)
                                   : std::string("; no run yet");
        lines.push_back(std::move(line));
    }
    return lines;
}

void ActivityTimers::State::readStateFile() {
    const auto kept = readPropertyListFile(stateFile_);
    if (!kept) {
        const auto& error = kept.error();
        if (error.domain == kPosixErrorDomain && error.code == ENOENT) return;
        logWarning(fmt::format("the times of the last runs are lost: {} ({})", error.description(),
                               stateFile_.string()));
        return;
    }
    for (auto& activity : activities_) {
        activity.lastStart = valueForKey(*kept, activity.criteria.identifier).asDate();
    }
}

void ActivityTimers::State::writeStateFile() {
    KSDictionary kept;
    for (const auto& activity : activities_) {
        if (activity.lastStart) kept.emplace(activity.criteria.identifier, *activity.lastStart);
    }
    auto error = makePrivateFolder(stateFile_.parent_path());
    if (!error) error = writePropertyListFile(stateFile_, kept);
    if (error && !writeFailed_) {
        logWarning(
            fmt::format("the times of the last runs are not kept: {}", error->description()));
    }
    writeFailed_ = error.has_value();
}

ActivityTimers::ActivityTimers(Clock& clock, std::vector<ActivityCriteria> criteria,
                               std::filesystem::path stateFile)
    : state_(std::make_shared<State>(clock, std::move(criteria), std::move(stateFile))) {}

ActivityTimers::~ActivityTimers() { stop(); }

ActivityRegistration ActivityTimers::schedulePreregistered(std::string_view identifier,
                                                           ActivityBlock block) {
    state_->queue().async([state = state_, name = std::string(identifier),
                           block = std::move(block)] { state->add(name, block); });
    return ActivityRegistration([state = state_, name = std::string(identifier)] {
        if (state->queue().isCurrent()) {
            state->remove(name);
        } else {
            state->queue().sync([&] { state->remove(name); });
        }
    });
}

std::vector<std::string> ActivityTimers::describe() const {
    std::vector<std::string> lines;
    state_->queue().sync([this, &lines] { lines = state_->describe(); });
    return lines;
}

void ActivityTimers::stop() {
    state_->queue().sync([this] { state_->stop(); });
}

void ActivityTimers::setExternalPower(bool connected) {
    state_->queue().async([state = state_, connected] { state->setExternalPower(connected); });
}

}  // namespace keepsakes
