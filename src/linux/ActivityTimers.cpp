// SPDX-License-Identifier: Apache-2.0
#include "linux/ActivityTimers.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <cmath>
#include <mutex>
#include <optional>
#include <utility>

#include "core/Clock.h"
#include "core/Files.h"
#include "core/KSAssertion.h"
#include "core/Log.h"
#include "core/Observers.h"
#include "core/PropertyList.h"
#include "core/WorkQueue.h"
#include "platform/PowerSources.h"

namespace keepsakes {

namespace {

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

/// Shared with the runs under way, whose ends may come late. On its queue but where it says so.
class ActivityTimers::State : public std::enable_shared_from_this<State> {
  public:
    State(Clock& clock, PowerSources& power, std::vector<ActivityCriteria> criteria,
          std::filesystem::path stateFile);

    void add(std::string_view identifier, ActivityBlock block);
    void remove(std::string_view identifier);
    void stop();
    std::string describe(std::string_view identifier) const;  // on any thread

    WorkQueue& queue() { return queue_; }

  private:
    struct Activity {
        ActivityCriteria criteria;
        std::optional<KSDate> lastStart;  // of the last run that finished
        bool registered = false;
        bool running = false;
        bool waits = false;  // for power, and the log says so
        double due = 0;      // on the clock's elapsed time, as what follows
        double started = 0;
        KSDate startDate;
        ActivityBlock block = nullptr;

        bool isIdle() const { return registered && criteria.periodSeconds > 0 && !running; }
    };

    template <class Activities>
    static auto find(Activities& activities, std::string_view identifier) {
        return std::ranges::find_if(activities, [&](const Activity& activity) {
            return activity.criteria.identifier == identifier;
        });
    }
    bool lacksPower(const Activity& activity) const {
        return activity.criteria.requireExternalPower && !power_.hasExternalPower();
    }
    void reconsider();
    void startWhatIsDue();
    void waitForPower(Activity& activity);
    void start(Activity& activity);
    void ended(const std::string& identifier, bool finished);
    std::string stateOf(const Activity& activity) const;
    void readStateFile();
    void writeStateFile();

    Clock& clock_;
    PowerSources& power_;
    const std::filesystem::path stateFile_;
    std::vector<Activity> activities_;
    double settleSeconds_ = kSettleSeconds;
    double secondsBetweenStarts_ = kSecondsBetweenStarts;
    double earliestStart_ = 0;
    bool stopped_ = false;
    bool writeFailed_ = false;
    Timer timer_;
    Observation powerChanges_;

    mutable std::mutex mutex_;
    std::vector<Activity> shown_;  // under mutex_: the activities as of the last change

    WorkQueue queue_{"ActivityTimers"};
};

ActivityTimers::State::State(Clock& clock, PowerSources& power,
                             std::vector<ActivityCriteria> criteria,
                             std::filesystem::path stateFile)
    : clock_(clock), power_(power), stateFile_(std::move(stateFile)) {
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
    shown_ = activities_;
    powerChanges_ = power_.observeExternalPower(queue_, [this] { reconsider(); });
}

void ActivityTimers::State::add(std::string_view identifier, ActivityBlock block) {
    const auto activity = find(activities_, identifier);
    if (activity == activities_.end()) {
        logError(fmt::format("no times are declared for the activity {}", identifier));
        return;
    }
    if (!assertParameter(!activity->registered, "!activity.registered", kUnit, __LINE__)) return;
    activity->registered = true;
    activity->block = std::move(block);
    const double period = activity->criteria.periodSeconds;
    const KSDate now = clock_.now();
    double remaining = 0;
    // A start in the future tells nothing but that the clock was set back since.
    if (const auto last = activity->lastStart; last && *last <= now) {
        remaining = *last + period - now;
    }
    activity->due = clock_.elapsed() + std::max(remaining, settleSeconds_);
    reconsider();
}

void ActivityTimers::State::remove(std::string_view identifier) {
    const auto activity = find(activities_, identifier);
    if (activity == activities_.end()) return;
    activity->registered = false;
    activity->block = nullptr;
    reconsider();
}

/// After every change.
void ActivityTimers::State::reconsider() {
    startWhatIsDue();
    auto copy = activities_;
    for (auto& activity : copy) activity.block = nullptr;
    const std::lock_guard lock(mutex_);
    shown_ = std::move(copy);
}

void ActivityTimers::State::startWhatIsDue() {
    timer_.cancel();
    if (stopped_) return;
    const double now = clock_.elapsed();
    Activity* next = nullptr;
    for (auto& activity : activities_) {
        if (!activity.isIdle()) continue;
        if (activity.due <= now && lacksPower(activity)) {
            waitForPower(activity);
            continue;
        }
        if (!next || activity.due < next->due) next = &activity;
    }
    if (!next) return;
    const double begin = std::max(next->due, earliestStart_);
    if (begin > now) {
        timer_ = clock_.afterElapsed(queue_, begin - now, [this] { reconsider(); });
        return;
    }
    earliestStart_ = now + secondsBetweenStarts_;
    start(*next);
    startWhatIsDue();
}

/// Its coming is heard of.
void ActivityTimers::State::waitForPower(Activity& activity) {
    if (std::exchange(activity.waits, true)) return;
    logInfo(fmt::format("{} waits for external power", activity.criteria.identifier));
}

void ActivityTimers::State::start(Activity& activity) {
    activity.running = true;
    activity.waits = false;
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
    auto& activity = *find(activities_, identifier);
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
    reconsider();
}

void ActivityTimers::State::stop() {
    stopped_ = true;
    timer_.cancel();
    powerChanges_ = nullptr;
}

std::string ActivityTimers::State::stateOf(const Activity& activity) const {
    if (!activity.registered) return "not registered";
    const double now = clock_.elapsed();
    if (activity.running) return "running for " + durationText(now - activity.started);
    if (activity.criteria.periodSeconds <= 0) return "off";
    if (activity.due > now) return "due in " + durationText(activity.due - now);
    return fmt::format("due for {}{}", durationText(now - activity.due),
                       lacksPower(activity) ? ", waiting for external power" : "");
}

std::string ActivityTimers::State::describe(std::string_view identifier) const {
    const std::lock_guard lock(mutex_);
    const auto found = find(shown_, identifier);
    if (found == shown_.end()) return fmt::format("{}: not declared", identifier);
    const auto& criteria = found->criteria;
    auto line = fmt::format("{}: {}", identifier, stateOf(*found));
    if (criteria.periodSeconds > 0) {
        line += fmt::format("; every {}{}", durationText(criteria.periodSeconds),
                            criteria.requireExternalPower ? " on external power" : "");
    }
    return line + (found->lastStart ? "; last run " + formatISO8601(*found->lastStart)
                                    : std::string("; no run yet"));
}

void ActivityTimers::State::readStateFile() {
    const auto kept = readPropertyListFile(stateFile_);
    if (!kept) {
        const auto& error = kept.error();
        if (error.domain == kPosixErrorDomain && error.code == ENOENT) return;
        const bool namesFile = error.domain == kPosixErrorDomain;
        logWarning(fmt::format("the times of the last runs are lost: {}{}", error.description(),
                               namesFile ? "" : " in " + stateFile_.string()));
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

ActivityTimers::ActivityTimers(Clock& clock, PowerSources& power,
                               std::vector<ActivityCriteria> criteria,
                               std::filesystem::path stateFile)
    : state_(std::make_shared<State>(clock, power, std::move(criteria), std::move(stateFile))) {}

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

std::string ActivityTimers::describe(std::string_view identifier) const {
    return state_->describe(identifier);
}

void ActivityTimers::stop() {
    state_->queue().sync([this] { state_->stop(); });
}

}  // namespace keepsakes
