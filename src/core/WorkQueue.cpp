// SPDX-License-Identifier: Apache-2.0
#include "core/WorkQueue.h"

#include <fmt/format.h>

#include <chrono>
#include <condition_variable>
#include <deque>
#include <mutex>
#include <thread>
#include <utility>
#include <vector>

#include "core/KSAssertion.h"
#include "core/Log.h"
#include "core/Semaphore.h"

namespace keepsakes {

namespace {

constexpr auto kIdleThreadLife = std::chrono::seconds(30);

/// Set on threads that WorkerThreads started: only they count as busy.
thread_local bool isWorker = false;
/// The queue states whose tasks this thread is inside of, outermost first (sync nests).
thread_local std::vector<const void*> currentQueues;

void runGuarded(const Task& task, const std::string& label) {
    try {
        task();
    } catch (const std::exception& error) {
        logError(fmt::format("a task on queue {} threw: {}", label, error.what()));
    } catch (...) {
        logError(fmt::format("a task on queue {} threw something unknown", label));
    }
}

}  // namespace

struct WorkerThreads::State {
    std::mutex mutex;
    std::condition_variable work;     // a task was added
    std::condition_variable quieter;  // a thread became idle, began to wait or ended
    std::deque<Task> tasks;
    std::size_t threads = 0;
    std::size_t idle = 0;
    std::size_t waiting = 0;

    bool settled() const { return tasks.empty() && threads == idle + waiting; }

    void threadMain() {
        isWorker = true;
        std::unique_lock lock(mutex);
        while (true) {
            ++idle;
            quieter.notify_all();
            const bool woken =
                work.wait_for(lock, kIdleThreadLife, [this] { return !tasks.empty(); });
            --idle;
            if (!woken) break;
            Task task = std::move(tasks.front());
            tasks.pop_front();
            lock.unlock();
            runGuarded(task, "(worker)");
            task = nullptr;
            lock.lock();
        }
        --threads;
        quieter.notify_all();
    }
};

WorkerThreads::WorkerThreads() : state_(std::make_unique<State>()) {}
WorkerThreads::~WorkerThreads() = default;

WorkerThreads& WorkerThreads::shared() {
    // Never destroyed: threads may still be ending while the process exits.
    static auto* threads = new WorkerThreads();
    return *threads;
}

void WorkerThreads::run(Task task) {
    const std::lock_guard lock(state_->mutex);
    state_->tasks.push_back(std::move(task));
    if (state_->idle >= state_->tasks.size()) {
        state_->work.notify_one();
        return;
    }
    std::thread([state = state_.get()] { state->threadMain(); }).detach();
    ++state_->threads;
}

void WorkerThreads::settle() {
    std::unique_lock lock(state_->mutex);
    state_->quieter.wait(lock, [this] { return state_->settled(); });
}

bool WorkerThreads::beginWaiting() {
    if (!isWorker) return false;
    auto& state = *shared().state_;
    const std::lock_guard lock(state.mutex);
    ++state.waiting;
    state.quieter.notify_all();
    return true;
}

void WorkerThreads::endWaiting() {
    auto& state = *shared().state_;
    const std::lock_guard lock(state.mutex);
    --state.waiting;
}

struct WorkQueue::State : std::enable_shared_from_this<State> {
    explicit State(std::string name) : label(std::move(name)) {
        const std::lock_guard lock(allMutex());
        all().push_back(this);
    }
    ~State() {
        const std::lock_guard lock(allMutex());
        std::erase(all(), this);
    }
    State(const State&) = delete;
    State& operator=(const State&) = delete;

    // Never destroyed, since queues may outlive what is. Taken before a queue's own mutex.
    static std::mutex& allMutex() {
        static auto* mutex = new std::mutex();
        return *mutex;
    }
    static std::vector<State*>& all() {
        static auto* states = new std::vector<State*>();
        return *states;
    }

    const std::string label;
    std::mutex mutex;
    std::deque<Task> tasks;
    bool running = false;  // a thread is draining the queue, or is about to
    bool closed = false;

    void append(Task task) {
        const std::lock_guard lock(mutex);
        if (closed) return;
        tasks.push_back(std::move(task));
        startLocked();
    }

    void startLocked() {
        if (running) return;
        running = true;
        WorkerThreads::shared().run([self = shared_from_this()] { self->drain(); });
    }

    void runOne(const Task& task) {
        currentQueues.push_back(this);
        runGuarded(task, label);
        currentQueues.pop_back();
    }

    void drain() {
        std::unique_lock lock(mutex);
        while (!tasks.empty()) {
            Task task = std::move(tasks.front());
            tasks.pop_front();
            lock.unlock();
            runOne(task);
            task = nullptr;
            lock.lock();
        }
        running = false;
    }

    /// Takes an idle queue for the calling thread and runs `task` there.
    bool runHereWhenIdle(const Task& task) {
        {
            const std::lock_guard lock(mutex);
            if (running) return false;
            running = true;
        }
        runOne(task);
        const std::lock_guard lock(mutex);
        running = false;
        if (!tasks.empty()) startLocked();
        return true;
    }

    bool isCurrent() const {
        for (const void* queue : currentQueues) {
            if (queue == this) return true;
        }
        return false;
    }
};

WorkQueue::WorkQueue(std::string label) : state_(std::make_shared<State>(std::move(label))) {}

WorkQueue::~WorkQueue() {
    if (!isCurrent()) sync([] {});
    const std::lock_guard lock(state_->mutex);
    state_->closed = true;
}

const std::string& WorkQueue::label() const { return state_->label; }

void WorkQueue::async(Task task) { state_->append(std::move(task)); }

void WorkQueue::sync(const Task& task) {
    if (isCurrent()) {
        assertionFailed("a queue cannot wait for itself", "WorkQueue", __LINE__);
        task();
        return;
    }
    if (state_->runHereWhenIdle(task)) return;

    struct SignalAtEnd {
        explicit SignalAtEnd(Semaphore toSignal) : semaphore(std::move(toSignal)) {}
        ~SignalAtEnd() { semaphore.signal(); }
        SignalAtEnd(const SignalAtEnd&) = delete;
        SignalAtEnd& operator=(const SignalAtEnd&) = delete;
        Semaphore semaphore;
    };
    Semaphore done;
    async([&task, done] {
        const SignalAtEnd signal{done};  // even when the task throws
        task();
    });
    done.wait();
}

bool WorkQueue::isCurrent() const { return state_->isCurrent(); }

std::function<void(Task)> WorkQueue::detachedAppender() const {
    return [weak = std::weak_ptr(state_)](Task task) {
        if (auto state = weak.lock()) state->append(std::move(task));
    };
}

std::vector<WorkQueue::Report> WorkQueue::reports() {
    std::vector<Report> reports;
    const std::lock_guard lock(State::allMutex());
    for (auto* state : State::all()) {
        const std::lock_guard held(state->mutex);
        reports.push_back({state->label, state->running, state->tasks.size()});
    }
    return reports;
}

}  // namespace keepsakes
