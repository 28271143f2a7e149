// SPDX-License-Identifier: Apache-2.0
#include "linux/BusThread.h"

#include <fmt/format.h>
#include <poll.h>
#include <pthread.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <cstdlib>
#include <ctime>
#include <exception>
#include <filesystem>
#include <list>
#include <optional>
#include <string_view>
#include <system_error>
#include <thread>

#include "bus/BusHandles.h"
#include "core/Log.h"
#include "linux/FileWatch.h"
#include "linux/Guarded.h"

namespace keepsakes {

namespace {

constexpr std::string_view kFollowerFailed = "bus: a follower failed";

constexpr double kFirstRetrySeconds = 1;
constexpr double kLongestRetrySeconds = 3600;

constexpr const char* kNoReply = "org.freedesktop.DBus.Error.NoReply";
constexpr const char* kTimeout = "org.freedesktop.DBus.Error.Timeout";
constexpr const char* kTimedOut = "org.freedesktop.DBus.Error.TimedOut";

int openEvent() {
    const int descriptor = eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    if (descriptor < 0) throw std::system_error(errno, std::generic_category(), "eventfd");
    return descriptor;
}

/// Where the system bus listens; nothing when that is not a plain path.
std::optional<std::filesystem::path> systemBusSocket() {
    // NOLINTNEXTLINE(concurrency-mt-unsafe): nothing in the daemon changes the environment
    const char* set = std::getenv("DBUS_SYSTEM_BUS_ADDRESS");
    std::string_view address = set ? set : "unix:path=/run/dbus/system_bus_socket";
    constexpr std::string_view kPrefix = "unix:path=";
    if (!address.starts_with(kPrefix)) return std::nullopt;
    address = address.substr(kPrefix.size());
    address = address.substr(0, address.find_first_of(",;"));
    if (address.contains('%')) return std::nullopt;
    return address;
}

/// Milliseconds until `due`, in microseconds of the monotonic clock.
int millisecondsUntil(std::uint64_t due) {
    constexpr std::uint64_t kLongest = 60000;
    timespec now{};
    clock_gettime(CLOCK_MONOTONIC, &now);
    const auto current = static_cast<std::uint64_t>(now.tv_sec) * 1000000 +
                         static_cast<std::uint64_t>(now.tv_nsec) / 1000;
    const auto wait = due > current ? (due - current) / 1000 + 1 : 0;
    return static_cast<int>(std::min(wait, kLongest));
}

BusReply replyOf(sd_bus_message* message) {
    using Outcome = BusReply::Outcome;
    const auto* error = sd_bus_message_get_error(message);
    if (!error) return {.outcome = Outcome::answered, .message = message};
    const std::string name = error->name ? error->name : "";
    if (name == kNoReply || name == kTimeout || name == kTimedOut) {
        return {.outcome = Outcome::silent, .error = name};
    }
    // The bus itself answers where no service does.
    const char* sender = sd_bus_message_get_sender(message);
    const bool isFromBus = sender && std::string_view(sender) == "org.freedesktop.DBus";
    return {.outcome = isFromBus ? Outcome::missing : Outcome::refused, .error = name};
}

}  // namespace

class BusThread::Loop {
  public:
    Loop(Bus bus, Clock& clock) : bus_(bus), clock_(clock), wake_(openEvent()) {}
    ~Loop() {
        stop();
        ::close(wake_);
    }
    Loop(const Loop&) = delete;
    Loop& operator=(const Loop&) = delete;

    void follow(BusFollower& follower) { followings_.emplace_back(&follower); }
    void start() {
        thread_ = std::thread([this] { run(); });
    }
    void stop();
    void call(const char* service, const char* path, const char* interface, const char* member,
              const Build& build, Handler handler);

  private:
    struct Following {
        explicit Following(BusFollower* toTell) : follower(toTell) {}
        BusFollower* const follower;
        bus::Slot owner;
        bus::Slot signals;
    };
    struct PendingCall {
        Loop* loop = nullptr;
        Handler handler;
        bus::Slot slot;
        std::list<PendingCall>::iterator self;
    };

    void run();
    void connect();
    int open();
    int subscribe(Following& following);
    void lose(int result);
    bool waitsForSocket(int result);
    void tryLater();
    void process();
    void wait();
    void wake() const { eventfd_write(wake_, 1); }

    static int onOwnerChanged(sd_bus_message* message, void* following, sd_bus_error*);
    static int onSignal(sd_bus_message* message, void* following, sd_bus_error*);
    static int onReply(sd_bus_message* message, void* pending, sd_bus_error*);

    const Bus bus_;
    Clock& clock_;
    const int wake_;
    std::atomic<bool> isStopping_ = false;
    std::atomic<bool> mayConnect_ = true;

    // Only on the thread, once it runs.
    bus::Connection connection_;
    std::list<Following> followings_;
    std::list<PendingCall> pending_;
    double retrySeconds_ = kFirstRetrySeconds;
    std::unique_ptr<FileWatch> socket_;  ///< While there is none to connect to.

    std::thread thread_;
    Timer retry_;  // only on timers_
    WorkQueue timers_{"BusThread"};
};

void BusThread::Loop::stop() {
    timers_.sync([this] {
        isStopping_ = true;
        retry_.cancel();
    });
    wake();
    if (thread_.joinable()) thread_.join();
}

void BusThread::Loop::run() {
    pthread_setname_np(pthread_self(), bus_ == Bus::system ? "system bus" : "session bus");
    while (!isStopping_) {
        if (!connection_ && mayConnect_.exchange(false)) connect();
        if (connection_) process();
        wait();
    }
    pending_.clear();
    for (auto& following : followings_) {
        following.owner.reset();
        following.signals.reset();
    }
    connection_.reset();
}

void BusThread::Loop::connect() {
    if (const int result = open(); result < 0) {
        lose(result);
        return;
    }
    for (const auto& following : followings_) {
        guarded(kFollowerFailed, [&following] { following.follower->becameAvailable(); });
    }
}

int BusThread::Loop::open() {
    sd_bus* opened = nullptr;
    const int result =
        bus_ == Bus::system ? sd_bus_open_system(&opened) : sd_bus_open_user(&opened);
    if (result < 0) return result;
    connection_.reset(opened);
    for (auto& following : followings_) {
        if (const int status = subscribe(following); status < 0) return status;
    }
    return 0;
}

int BusThread::Loop::subscribe(Following& following) {
    const std::string service = following.follower->service();
    const auto match = [this, &following](bus::Slot& slot, const std::string& rule,
                                          sd_bus_message_handler_t handler) {
        sd_bus_slot* made = nullptr;
        const int result = sd_bus_add_match_async(connection_.get(), &made, rule.c_str(), handler,
                                                  nullptr, &following);
        slot.reset(made);
        return result;
    };
    const int result =
        match(following.owner,
              fmt::format("type='signal',sender='org.freedesktop.DBus',"
                          "interface='org.freedesktop.DBus',member='NameOwnerChanged',arg0='{}'",
                          service),
              &Loop::onOwnerChanged);
    if (result < 0) return result;
    return match(following.signals, fmt::format("type='signal',sender='{}'", service),
                 &Loop::onSignal);
}

/// Drops the connection, tells the followers and sees to it that there is another attempt.
void BusThread::Loop::lose(int result) {
    logInfo(fmt::format("no {} bus: {}", bus_ == Bus::system ? "system" : "session",
                        std::generic_category().message(-result)));
    pending_.clear();
    for (auto& following : followings_) {
        following.owner.reset();
        following.signals.reset();
        guarded(kFollowerFailed, [&following] { following.follower->becameUnavailable(); });
    }
    connection_.reset();
    if (!waitsForSocket(result)) tryLater();
}

/// Whether the bus will be seen when it comes: a device without one is not to be woken for it.
bool BusThread::Loop::waitsForSocket(int result) {
    if (bus_ != Bus::system || result != -ENOENT) return false;
    const auto path = systemBusSocket();
    if (!path) return false;
    socket_ = std::make_unique<FileWatch>(*path);
    // It may have come just before it was watched.
    std::error_code error;
    if (socket_->descriptor() >= 0 && !std::filesystem::exists(*path, error)) return true;
    socket_.reset();
    return false;
}

void BusThread::Loop::tryLater() {
    timers_.async([this, delay = retrySeconds_] {
        if (isStopping_) return;
        retry_ = clock_.after(timers_, delay, [this] {
            mayConnect_ = true;
            wake();
        });
    });
    retrySeconds_ = std::min(2 * retrySeconds_, kLongestRetrySeconds);
}

void BusThread::Loop::process() {
    int result = 1;
    while (result > 0 && !isStopping_) result = sd_bus_process(connection_.get(), nullptr);
    if (result < 0) {
        lose(result);
    } else if (sd_bus_is_ready(connection_.get()) > 0) {
        retrySeconds_ = kFirstRetrySeconds;
    }
}

void BusThread::Loop::wait() {
    std::array<pollfd, 3> descriptors = {
        {{wake_, POLLIN, 0}, {-1, 0, 0}, {socket_ ? socket_->descriptor() : -1, POLLIN, 0}}};
    int timeout = -1;
    if (connection_) {
        const int events = sd_bus_get_events(connection_.get());
        if (events < 0) return lose(events);
        descriptors[1] = {sd_bus_get_fd(connection_.get()), static_cast<short>(events), 0};
        std::uint64_t due = 0;
        if (sd_bus_get_timeout(connection_.get(), &due) >= 0 && due != UINT64_MAX) {
            timeout = millisecondsUntil(due);
        }
    } else if (mayConnect_) {
        return;
    }
    ::poll(descriptors.data(), descriptors.size(), timeout);
    eventfd_t ignored = 0;
    if (descriptors[0].revents != 0) eventfd_read(wake_, &ignored);
    if (descriptors[2].revents != 0 && socket_->take()) {
        socket_.reset();
        mayConnect_ = true;
    }
}

void BusThread::Loop::call(const char* service, const char* path, const char* interface,
                           const char* member, const Build& build, Handler handler) {
    pending_.emplace_back();
    auto& pending = pending_.back();
    pending.loop = this;
    pending.handler = std::move(handler);
    pending.self = std::prev(pending_.end());

    sd_bus_message* made = nullptr;
    int result =
        sd_bus_message_new_method_call(connection_.get(), &made, service, path, interface, member);
    const bus::Message message(made);
    if (result >= 0 && build) result = build(made);
    sd_bus_slot* slot = nullptr;
    if (result >= 0) {
        result = sd_bus_call_async(connection_.get(), &slot, made, &Loop::onReply, &pending,
                                   static_cast<std::uint64_t>(kCallLimitSeconds * 1e6));
    }
    if (result >= 0) {
        pending.slot.reset(slot);
        return;
    }
    const auto failed = std::move(pending.handler);
    pending_.pop_back();
    failed({.outcome = BusReply::Outcome::refused,
            .error = fmt::format("not sent: {}", std::generic_category().message(-result))});
}

int BusThread::Loop::onOwnerChanged(sd_bus_message* message, void* following, sd_bus_error*) {
    auto& follower = *static_cast<Following*>(following)->follower;
    const char* name = nullptr;
    const char* before = nullptr;
    const char* owner = nullptr;
    if (sd_bus_message_read(message, "sss", &name, &before, &owner) < 0) return 0;
    guarded(kFollowerFailed, [&follower, owner] {
        if (*owner) {
            follower.becameAvailable();
        } else {
            follower.becameUnavailable();
        }
    });
    return 0;
}

int BusThread::Loop::onSignal(sd_bus_message* message, void* following, sd_bus_error*) {
    guarded(kFollowerFailed, [message, following] {
        static_cast<Following*>(following)->follower->received(message);
    });
    return 0;
}

int BusThread::Loop::onReply(sd_bus_message* message, void* pending, sd_bus_error*) {
    auto& call = *static_cast<PendingCall*>(pending);
    // Off the list first: the handler may make the next call.
    std::list<PendingCall> answered;
    answered.splice(answered.begin(), call.loop->pending_, call.self);
    const auto reply = replyOf(message);
    guarded(kFollowerFailed, [&call, &reply] { call.handler(reply); });
    return 0;
}

BusThread::BusThread(Bus bus, Clock& clock) : loop_(std::make_unique<Loop>(bus, clock)) {}
BusThread::~BusThread() = default;
void BusThread::follow(BusFollower& follower) { loop_->follow(follower); }
void BusThread::start() { loop_->start(); }
void BusThread::stop() { loop_->stop(); }

void BusThread::call(const char* service, const char* path, const char* interface,
                     const char* member, const Build& build, Handler handler) {
    loop_->call(service, path, interface, member, build, std::move(handler));
}

}  // namespace keepsakes
