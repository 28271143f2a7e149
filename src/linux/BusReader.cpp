// SPDX-License-Identifier: Apache-2.0
#include "linux/BusReader.h"

#include <fmt/format.h>
#include <systemd/sd-bus.h>

#include <utility>

#include "core/Log.h"
#include "linux/BusProperties.h"

namespace keepsakes {

BusReader::BusReader(BusThread& bus, const char* service, Begin begin, Complete complete,
                     Missing missing)
    : bus_(bus),
      service_(service),
      begin_(std::move(begin)),
      complete_(std::move(complete)),
      missing_(std::move(missing)) {}

void BusReader::read() {
    isDue_ = open_ > 0;
    if (isDue_) return;
    ++number_;
    open_ = 1;
    isMissing_ = false;
    failure_.clear();
    begin_();
    leave();
}

void BusReader::abandon() {
    ++number_;
    open_ = 0;
    isDue_ = false;
}

void BusReader::ask(const std::string& path, const char* interface, const char* member,
                    const BusThread::Build& build, Take take, OnRefusal onRefusal) {
    ++open_;
    bus_.call(service_, path.c_str(), interface, member, build,
              [this, number = number_, takeAnswer = std::move(take),
               takeRefusal = std::move(onRefusal)](const BusReply& reply) {
                  if (number != number_) return;
                  if (reply.outcome == BusReply::Outcome::answered) {
                      takeAnswer(reply.message);
                  } else if (takeRefusal && reply.outcome == BusReply::Outcome::refused) {
                      takeRefusal();
                  } else {
                      failBy(reply);
                  }
                  leave();
              });
}

void BusReader::askProperties(const std::string& path, const char* interface, Take take,
                              OnRefusal onRefusal) {
    ask(
        path, bus::kPropertiesInterface, "GetAll",
        [interface](sd_bus_message* message) {
            return sd_bus_message_append_basic(message, 's', interface);
        },
        std::move(take), std::move(onRefusal));
}

void BusReader::fail(std::string_view reason) {
    if (failure_.empty()) failure_ = reason;
}

void BusReader::failBy(const BusReply& reply) {
    isMissing_ = isMissing_ || reply.outcome == BusReply::Outcome::missing;
    fail(reply.error);
}

void BusReader::leave() {
    if (--open_ > 0) return;
    if (isMissing_) {
        missing_();
    } else if (!failure_.empty()) {
        if (!wasFailing_) {
            logWarning(fmt::format("{}: {}; its last known state stays", service_, failure_));
        }
    } else {
        complete_();
    }
    wasFailing_ = !failure_.empty();
    if (std::exchange(isDue_, false)) read();
}

}  // namespace keepsakes
