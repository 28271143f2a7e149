// SPDX-License-Identifier: Apache-2.0
#include "wire/BusLoop.h"

#include <fmt/format.h>
#include <poll.h>
#include <pthread.h>

#include <array>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <ctime>
#include <exception>
#include <system_error>

#include "Introspection.h"
#include "bus/BusHandles.h"
#include "core/Log.h"
#include "core/Text.h"
#include "wire/BusListener.h"
#include "wire/BusNames.h"
#include "wire/ConduitCalls.h"
#include "wire/StatusProperties.h"

namespace keepsakes {

namespace {

/// Bytes of a long reply written between two looks at the bus.
constexpr std::size_t kSlice = std::size_t{1} << 20;
/// Replies of at most this many records are written at once, ahead of long ones.
constexpr std::size_t kShortReply = 64;
/// Messages that may wait to be written before progress is dropped.
constexpr std::uint64_t kKeepingUp = 64;
constexpr std::chrono::seconds kLongestFinish{5};

constexpr const char* kTooLarge =
    "the reply does not fit in one message; set a limit or ask for a shorter interval";

}  // namespace

/// Stands for one request on the side of whoever answers it.
class BusLoop::Ticket {
  public:
    Ticket(std::shared_ptr<Mailbox> mailbox, std::uint64_t request)
        : mailbox_(std::move(mailbox)), request_(request) {}
    Ticket(const Ticket&) = delete;
    Ticket& operator=(const Ticket&) = delete;
    ~Ticket() {
        respond({.error = KSError::make("BusListener", 0, "the request ended without an answer")});
    }

    void respond(Answer answer) {
        if (answered_.exchange(true)) return;
        mailbox_->post([request = request_, answer = std::move(answer)](BusLoop& loop) mutable {
            loop.answer(request, std::move(answer));
        });
    }

  private:
    const std::shared_ptr<Mailbox> mailbox_;
    const std::uint64_t request_;
    std::atomic<bool> answered_ = false;
};

BusLoop::BusLoop(bus::Connection connection) : connection_(std::move(connection)) {}

BusLoop::~BusLoop() { stop(); }

void BusLoop::start(KSKeepsakesConduitProtocol& exported, StatusSource& status) {
    exported_ = &exported;
    status_ = &status;
    thread_ = std::thread([this] { run(); });
}

void BusLoop::stop() {
    mailbox_->post([](BusLoop& loop) { loop.stopping_ = true; });
    if (thread_.joinable()) thread_.join();
    mailbox_->close();
    // Unless the thread is gone there is nobody else who could touch it.
    connection_.reset();
}

void BusLoop::run() {
    pthread_setname_np(pthread_self(), "bus");
    sd_bus_slot* slot = nullptr;
    const int result =
        sd_bus_add_object(connection_.get(), &slot, bus::kPath, &BusLoop::onMessage, this);
    object_.reset(slot);
    if (result < 0) {
        logError(fmt::format("bus: cannot export {}: {}", bus::kPath,
                             std::generic_category().message(-result)));
        lost_ = true;
    }
    while (!stopping_ && !lost_) turn();
    if (lost_) {
        mailbox_->close();
    } else {
        finish();
    }
    longReplies_.clear();
    requests_.clear();
    object_.reset();
    if (lost_ && disconnected_) disconnected_();
}

/// Does what can be done at once, then waits for more.
bool BusLoop::turn() {
    for (auto& letter : mailbox_->take()) letter(*this);
    writeLongReplies();
    const bool reading = mayRead();
    if (reading && process()) return true;
    return !lost_ && idle(reading);
}

/// One step of the connection; whether there may be more.
bool BusLoop::process() {
    const int result = sd_bus_process(connection_.get(), nullptr);
    if (result < 0 || sd_bus_is_open(connection_.get()) <= 0) {
        if (!lost_) logError("bus: the connection to the session bus is lost");
        lost_ = true;
        return false;
    }
    return result > 0;
}

/// Waits for the connection or the mailbox. While calls are not to be read, the connection is
/// touched only when it can be written to.
bool BusLoop::idle(bool reading) {
    const int wanted = sd_bus_get_events(connection_.get());
    if (wanted < 0) return !(lost_ = true);
    std::array<pollfd, 2> descriptors{};
    descriptors[0].fd = sd_bus_get_fd(connection_.get());
    descriptors[0].events = static_cast<short>(reading ? wanted : wanted & ~POLLIN);
    descriptors[1] = {mailbox_->descriptor(), POLLIN, 0};

    int timeout = -1;
    if (!longReplies_.empty() && unwritten() == 0) timeout = 0;
    if (reading) {
        std::uint64_t due = 0;
        if (sd_bus_get_timeout(connection_.get(), &due) > 0 && due != UINT64_MAX) {
            timespec now{};
            clock_gettime(CLOCK_MONOTONIC, &now);
            const auto current = static_cast<std::uint64_t>(now.tv_sec) * 1000000 +
                                 static_cast<std::uint64_t>(now.tv_nsec) / 1000;
            const auto wait = due > current ? (due - current) / 1000 + 1 : 0;
            if (timeout < 0) timeout = static_cast<int>(std::min<std::uint64_t>(wait, 60000));
        }
    }
    if (stopping_ && timeout < 0) timeout = 100;
    if (poll(descriptors.data(), descriptors.size(), timeout) < 0 && errno != EINTR) {
        return !(lost_ = true);
    }
    if (!reading && descriptors[0].revents != 0) process();
    return !lost_;
}

/// Sends what is ready: the answers in the mailbox, and what was begun.
void BusLoop::finish() {
    const auto deadline = std::chrono::steady_clock::now() + kLongestFinish;
    for (auto& letter : mailbox_->take()) letter(*this);
    while (!lost_ && (!longReplies_.empty() || unwritten() > 0)) {
        if (std::chrono::steady_clock::now() > deadline) break;
        writeLongReplies();
        if (unwritten() > 0) idle(false);
    }
    if (!lost_) sd_bus_release_name(connection_.get(), bus::kName);
}

bool BusLoop::mayRead() const {
    return requests_.size() + longReplies_.size() < BusListener::kMostRequests &&
           held_ < BusListener::kMostBytesHeld;
}

std::uint64_t BusLoop::unwritten() const {
    std::uint64_t count = 0;
    return sd_bus_get_n_queued_write(connection_.get(), &count) < 0 ? 0 : count;
}

int BusLoop::onMessage(sd_bus_message* message, void* loop, sd_bus_error*) {
    auto& self = *static_cast<BusLoop*>(loop);
    try {
        return self.handle(message);
    } catch (const std::exception& exception) {
        logError(fmt::format("bus: a call failed: {}", exception.what()));
        self.sendError(message, bus::kFailed, exception.what());
        return 1;
    }
}

/// A positive answer means that the message is dealt with; with 0 the library answers it.
int BusLoop::handle(sd_bus_message* message) {
    std::uint8_t type = 0;
    sd_bus_message_get_type(message, &type);
    if (type != SD_BUS_MESSAGE_METHOD_CALL) return 0;
    const auto interface = bus::view(sd_bus_message_get_interface(message));
    const auto member = bus::view(sd_bus_message_get_member(message));

    if (interface == "org.freedesktop.DBus.Introspectable" && member == "Introspect") {
        send(bus::Message(sd_bus_message_ref(message)), 0, {.body = [](sd_bus_message* out) {
                 return sd_bus_message_append_basic(out, 's', bus::kIntrospection);
             }});
        return 1;
    }
    if (interface == "org.freedesktop.DBus.Properties") {
        return handleCall(message, [this](sd_bus_message* call, Respond respond) {
            return callProperties(call, *status_, std::move(respond));
        });
    }
    if (!interface.empty() && interface != bus::kConduitInterface) return 0;
    const auto* method = findConduitMethod(member);
    if (!method) return 0;
    const auto signature = bus::view(sd_bus_message_get_signature(message, 1));
    if (signature != method->signature) {
        sendError(message, bus::kInvalidArgs,
                  fmt::format("{} takes arguments of type \"{}\", not \"{}\"", method->name,
                              method->signature, signature));
        return 1;
    }
    return handleCall(message, [this, method](sd_bus_message* call, Respond respond) {
        return method->call(call, *exported_, std::move(respond));
    });
}

int BusLoop::handleCall(sd_bus_message* message,
                        const std::function<Admission(sd_bus_message*, Respond)>& call) {
    if (stopping_) {
        sendError(message, bus::kFailed, "the daemon is ending");
        return 1;
    }
    if (requests_.size() >= BusListener::kRequestsRefused) {
        sendError(message, bus::kLimitsExceeded, "too many calls wait for an answer");
        return 1;
    }
    const auto number = nextRequest_++;
    requests_[number].call.reset(sd_bus_message_ref(message));
    const auto ticket = std::make_shared<Ticket>(mailbox_, number);
    Admission admission;
    try {
        admission = call(message, [ticket](Answer given) { ticket->respond(std::move(given)); });
    } catch (const std::exception& exception) {
        admission = {bus::kFailed, exception.what()};
    }
    if (admission.refused()) {
        requests_.erase(number);
        sendError(message, admission.name, admission.text);
    } else {
        requests_[number].cost = admission.cost;
        held_ += admission.cost;
    }
    return 1;
}

void BusLoop::answer(std::uint64_t request, Answer answer) {
    const auto found = requests_.find(request);
    if (found == requests_.end()) return;
    auto taken = std::move(found->second);
    requests_.erase(found);
    send(std::move(taken.call), taken.cost, std::move(answer));
}

void BusLoop::send(bus::Message call, std::size_t cost, Answer answer) {
    const auto release = [this, cost] { held_ -= cost; };
    if (sd_bus_message_get_expect_reply(call.get()) <= 0) return release();
    if (answer.error) {
        sendError(call.get(), *answer.error);
        return release();
    }
    sd_bus_message* made = nullptr;
    if (sd_bus_message_new_method_return(call.get(), &made) < 0) return release();
    bus::Message message(made);
    if (!answer.record) {
        const int status = answer.body ? answer.body(message.get()) : 0;
        sendBody(call.get(), std::move(message), status);
        return release();
    }
    auto encoder = std::make_unique<MessageEncoder>(message.get());
    encoder->beginRecords();
    longReplies_.push_back(
        {std::move(call), std::move(message), std::move(encoder), std::move(answer), 0, cost});
    if (longReplies_.back().answer.count > kShortReply) return;
    auto reply = std::move(longReplies_.back());
    longReplies_.pop_back();
    while (reply.message) writeSlice(reply);
}

/// Writes some records; having written the last one, sends the message.
void BusLoop::writeSlice(LongReply& reply) {
    auto& encoder = *reply.encoder;
    const auto enough = encoder.size() + kSlice;
    while (reply.next < reply.answer.count && encoder.ok() && encoder.size() < enough) {
        encoder.appendRecord([&reply](KeyedEncoder& out) { reply.answer.record(reply.next, out); });
        ++reply.next;
    }
    if (reply.next < reply.answer.count && encoder.ok()) return;
    encoder.endRecords();
    const int status = encoder.tooLarge() ? -E2BIG : encoder.status();
    sendBody(reply.call.get(), std::move(reply.message), status);
    held_ -= reply.cost;
}

// The next long reply is begun when the one before has left: one message at a time is in memory.
void BusLoop::writeLongReplies() {
    if (longReplies_.empty() || unwritten() > 0) return;
    writeSlice(longReplies_.front());
    if (!longReplies_.front().message) longReplies_.pop_front();
}

void BusLoop::sendBody(sd_bus_message* call, bus::Message message, int status) {
    if (status >= 0) status = sd_bus_send(connection_.get(), message.get(), nullptr);
    if (status >= 0) return;
    message.reset();
    if (status == -E2BIG || status == -EMSGSIZE) {
        sendError(call, bus::kLimitsExceeded, kTooLarge);
    } else {
        logWarning(fmt::format("bus: a reply could not be sent: {}",
                               std::generic_category().message(-status)));
        sendError(call, bus::kFailed,
                  fmt::format("the reply could not be sent: {}",
                              std::generic_category().message(-status)));
    }
}

void BusLoop::sendError(sd_bus_message* call, const KSError& error) {
    const bool ours = error.domain == KSErrorDomain && error.code >= 0;
    const auto name =
        ours ? fmt::format("{}{}", bus::kErrorCodePrefix, error.code) : std::string(bus::kFailed);
    sendError(call, name.c_str(), error.description());
}

void BusLoop::sendError(sd_bus_message* call, const char* name, const std::string& text) {
    const auto plain = plainUtf8(text);
    sd_bus_error error{name, plain.c_str(), 0};
    sd_bus_reply_method_error(call, &error);
}

void BusLoop::emitChange(const char* signal) {
    sd_bus_emit_signal(connection_.get(), bus::kPath, bus::kStatusInterface, signal, "");
}

void BusLoop::emitProgress(const std::string& activity, std::uint64_t done, std::uint64_t total) {
    if (unwritten() > kKeepingUp) return;
    sd_bus_emit_signal(connection_.get(), bus::kPath, bus::kStatusInterface, "Progress", "stt",
                       plainUtf8(activity).c_str(), done, total);
}

}  // namespace keepsakes
