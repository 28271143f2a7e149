// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <expected>
#include <functional>
#include <memory>
#include <string>

#include "core/KSError.h"
#include "wire/KSKeepsakesConduitProtocol.h"

namespace keepsakes {

class BusLoop;
class Mailbox;

/// The daemon's side of the session bus: takes its name, reads calls into typed requests, carries
/// typed replies and signals back. The daemon owns it; the protocol and the status source are
/// called on its thread, the bus thread, and outlive `invalidate`.
///
/// One thread does all that touches the bus, since the bus library's objects bear no sharing.
/// Others hand it their typed replies (records are shared, so that costs nothing), and it writes
/// them into messages in slices of about a megabyte: some 200,000 records a second were measured,
/// so a reply of 32 MiB takes it a quarter of a second, during which it turns to the bus every few
/// milliseconds. The arguments of a call are read in one go, about 100,000 records a second.
///
/// A call that cannot be read whole is answered with InvalidArgs and not carried out. Beyond
/// `kMostRequests` unanswered calls, or `kMostBytesHeld` that they hold, it stops reading, so that
/// a flood waits in the bus and not here.
class BusListener final {
  public:
    static constexpr std::size_t kMostRequests = 64;
    static constexpr std::size_t kMostBytesHeld = std::size_t{128} << 20;
    /// While a reply is being written the bus library reads on a little; beyond this many
    /// unanswered calls, further ones are refused with LimitsExceeded.
    static constexpr std::size_t kRequestsRefused = 512;

    /// Connects and takes the name, neither queueing for it nor replacing its owner. Fails with a
    /// text that says whether there is no bus or the name is taken (code EEXIST). What clients
    /// send from then on waits until `resume`.
    static std::expected<std::unique_ptr<BusListener>, KSError> claim();

    /// As `invalidate`.
    ~BusListener();
    BusListener(const BusListener&) = delete;
    BusListener& operator=(const BusListener&) = delete;

    /// Called once, on the bus thread, when the bus goes away; the thread then ends. Set it before
    /// `resume`. It must not destroy the listener.
    void setDisconnectedHandler(std::function<void()> handler);

    /// Exports the object and starts the bus thread. Once.
    void resume(KSKeepsakesConduitProtocol& exported, StatusSource& status);

    /// Any thread may call these; before `resume` the signals wait, after `invalidate` they are
    /// dropped. Signals and replies leave in the order in which they were handed over, except that
    /// long replies take their time. Progress is dropped while the bus is not keeping up.
    void emitEventsChanged();
    void emitBundlesChanged();
    void emitProgress(std::string activity, std::uint64_t done, std::uint64_t total);

    /// Takes no more calls, sends the replies that are ready (for at most five seconds), gives the
    /// name back and ends the thread. Replies that come later are dropped. May be repeated; not
    /// from the bus thread.
    void invalidate();

  private:
    explicit BusListener(std::unique_ptr<BusLoop> loop);

    std::unique_ptr<BusLoop> loop_;
    std::shared_ptr<Mailbox> mailbox_;
};

}  // namespace keepsakes
