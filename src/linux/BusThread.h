// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <memory>
#include <string>

#include "core/Clock.h"

struct sd_bus_message;

namespace keepsakes {

/// Somebody who follows one service on a message bus. Called on the bus thread only.
class BusFollower {
  public:
    virtual ~BusFollower() = default;
    /// The service's well-known name.
    virtual const char* service() const = 0;
    /// The bus is there, or the service has come back: time to ask it. May come twice in a row; the
    /// service need not run yet, since a call may start it.
    virtual void becameAvailable() = 0;
    /// There is no bus, or the service has gone.
    virtual void becameUnavailable() = 0;
    /// A signal that says it comes from the service. Anybody can send one: a reason to ask, no
    /// more.
    virtual void received(sd_bus_message* signal) = 0;
};

/// What came of a call, valid during the call that hands it over.
struct BusReply {
    enum class Outcome {
        answered,  ///< With `message`.
        refused,   ///< By the service, with an error.
        missing,   ///< Nobody has the service's name, nor can be started for it.
        silent,    ///< Nothing came back, in time or at all.
    };
    Outcome outcome = Outcome::answered;
    sd_bus_message* message = nullptr;
    std::string error;  ///< The error's name on the bus.
};

/// A thread that follows services on a message bus: one connection, one poll loop, asynchronous
/// calls only. A bus that is lost is tried again after a second, then after twice that and so on,
/// at most an hour; a system bus that is not there is watched for, without any waking. The daemon
/// owns it; followers and the clock outlive `stop`.
class BusThread final {
  public:
    enum class Bus { session, system };
    using Build = std::function<int(sd_bus_message*)>;
    using Handler = std::function<void(const BusReply&)>;

    /// Seconds after which a call without an answer is given up.
    static constexpr double kCallLimitSeconds = 15;

    BusThread(Bus bus, Clock& clock);
    /// As `stop`.
    ~BusThread();
    BusThread(const BusThread&) = delete;
    BusThread& operator=(const BusThread&) = delete;

    /// Before `start`.
    void follow(BusFollower& follower);

    /// Returns at once; the connection is made on the thread. Once.
    void start();

    /// Ends the thread, at once: calls without an answer are dropped. May be repeated; not on it.
    void stop();

    /// On the thread only: calls a method; `build`, where given, appends its arguments. `handler`
    /// is called later (at once for a call that cannot be made), unless the connection is lost
    /// before that.
    void call(const char* service, const char* path, const char* interface, const char* member,
              const Build& build, Handler handler);

  private:
    class Loop;
    const std::unique_ptr<Loop> loop_;
};

}  // namespace keepsakes
