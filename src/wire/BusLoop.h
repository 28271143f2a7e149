// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <deque>
#include <functional>
#include <memory>
#include <string>
#include <thread>
#include <unordered_map>

#include "bus/BusHandles.h"
#include "wire/Answer.h"
#include "wire/KSKeepsakesConduitProtocol.h"
#include "wire/Mailbox.h"
#include "wire/MessageEncoder.h"

namespace keepsakes {

/// The bus thread of `BusListener`: one poll loop over the connection and the mailbox. Private to
/// the folder.
class BusLoop final {
  public:
    explicit BusLoop(bus::Connection connection);
    ~BusLoop();

    const std::shared_ptr<Mailbox>& mailbox() const { return mailbox_; }
    void setDisconnectedHandler(std::function<void()> handler) {
        disconnected_ = std::move(handler);
    }
    void start(KSKeepsakesConduitProtocol& exported, StatusSource& status);
    void stop();

    // On the bus thread, out of the mailbox:
    void emitChange(const char* signal);
    void emitProgress(const std::string& activity, std::uint64_t done, std::uint64_t total);
    void answer(std::uint64_t request, Answer answer);

  private:
    /// A call that was taken and is not answered yet.
    struct Request {
        bus::Message call;
        std::size_t cost = 0;
    };
    /// A reply of many records, written into its message slice by slice.
    struct LongReply {
        bus::Message call;
        bus::Message message;
        std::unique_ptr<MessageEncoder> encoder;
        Answer answer;
        std::size_t next = 0;
        std::size_t cost = 0;
    };
    class Ticket;

    void run();
    bool turn();
    bool process();
    bool idle(bool reading);
    void finish();
    bool mayRead() const;
    std::uint64_t unwritten() const;

    static int onMessage(sd_bus_message* message, void* loop, sd_bus_error* error);
    int handle(sd_bus_message* message);
    int handleCall(sd_bus_message* message,
                   const std::function<Admission(sd_bus_message*, Respond)>& call);

    void send(bus::Message call, std::size_t cost, Answer answer);
    void writeSlice(LongReply& reply);
    void writeLongReplies();
    void sendBody(sd_bus_message* call, bus::Message message, int status);
    void sendError(sd_bus_message* call, const KSError& error);
    void sendError(sd_bus_message* call, const char* name, const std::string& text);

    // Fixed once the thread runs:
    bus::Connection connection_;
    const std::shared_ptr<Mailbox> mailbox_ = std::make_shared<Mailbox>();
    KSKeepsakesConduitProtocol* exported_ = nullptr;
    StatusSource* status_ = nullptr;
    std::function<void()> disconnected_;
    std::thread thread_;

    // Only on the bus thread:
    bus::Slot object_;
    std::unordered_map<std::uint64_t, Request> requests_;
    std::deque<LongReply> longReplies_;
    std::uint64_t nextRequest_ = 1;
    std::size_t held_ = 0;  ///< Cost of all requests and long replies.
    bool stopping_ = false;
    bool lost_ = false;
};

}  // namespace keepsakes
