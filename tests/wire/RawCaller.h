// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <stdexcept>
#include <string>

#include "bus/BusHandles.h"
#include "wire/BusNames.h"

namespace keepsakes {

/// A client that sends whatever it likes.
class RawCaller {
  public:
    using Build = std::function<int(sd_bus_message*)>;

    RawCaller() {
        sd_bus* opened = nullptr;
        require(sd_bus_open_user(&opened), "connect");
        connection_.reset(opened);
        // Waits for the bus's greeting: until then everything sent is kept back.
        const char* name = nullptr;
        require(sd_bus_get_unique_name(opened, &name), "greet");
    }

    bus::Message make(const char* interface, const char* method, const Build& build) const {
        sd_bus_message* made = nullptr;
        require(sd_bus_message_new_method_call(connection_.get(), &made, bus::kName, bus::kPath,
                                               interface, method),
                "make");
        bus::Message message(made);
        if (build) require(build(made), "build");
        return message;
    }

    /// "<error name>: <text>", or "" when the call was answered.
    std::string call(const char* interface, const char* method, const Build& build) {
        return call(make(interface, method, build));
    }
    std::string call(const bus::Message& message) {
        sd_bus_error error{};
        sd_bus_message* reply = nullptr;
        sd_bus_call(connection_.get(), message.get(), 60000000, &error, &reply);
        reply_.reset(reply);
        std::string text;
        if (sd_bus_error_is_set(&error)) text = std::string(error.name) + ": " + error.message;
        sd_bus_error_free(&error);
        return text;
    }
    sd_bus_message* reply() const { return reply_.get(); }

    void send(const bus::Message& message, bool wantsReply) {
        require(sd_bus_message_set_expect_reply(message.get(), wantsReply), "expect");
        require(sd_bus_send(connection_.get(), message.get(), nullptr), "send");
    }
    sd_bus* connection() const { return connection_.get(); }
    void disconnect() { connection_.reset(); }

    static void require(int result, const char* what) {
        if (result < 0) throw std::runtime_error(std::string(what) + " " + std::to_string(result));
    }

  private:
    bus::Connection connection_;
    bus::Message reply_;
};

}  // namespace keepsakes
