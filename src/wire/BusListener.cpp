// SPDX-License-Identifier: Apache-2.0
#include "wire/BusListener.h"

#include <fmt/format.h>

#include <cerrno>
#include <system_error>

#include "wire/BusLoop.h"
#include "wire/BusNames.h"

namespace keepsakes {

namespace {

std::unexpected<KSError> failure(int result, std::string_view what) {
    return std::unexpected(KSError::make(kPosixErrorDomain, -result, what));
}

}  // namespace

std::expected<std::unique_ptr<BusListener>, KSError> BusListener::claim() {
    sd_bus* opened = nullptr;
    if (const int result = sd_bus_open_user(&opened); result < 0) {
        return failure(result,
                       fmt::format("no session bus: {}", std::generic_category().message(-result)));
    }
    bus::Connection connection(opened);
    if (const int result = sd_bus_request_name(connection.get(), bus::kName, 0); result < 0) {
        if (result == -EEXIST || result == -EALREADY) {
            return failure(-EEXIST, fmt::format("the bus name {} is taken: another keepsakesd runs",
                                                bus::kName));
        }
        return failure(result, fmt::format("the bus does not give the name {}: {}", bus::kName,
                                           std::generic_category().message(-result)));
    }
    return std::unique_ptr<BusListener>(
        new BusListener(std::make_unique<BusLoop>(std::move(connection))));
}

BusListener::BusListener(std::unique_ptr<BusLoop> loop)
    : loop_(std::move(loop)), mailbox_(loop_->mailbox()) {}

BusListener::~BusListener() { invalidate(); }

void BusListener::setDisconnectedHandler(std::function<void()> handler) {
    loop_->setDisconnectedHandler(std::move(handler));
}

void BusListener::resume(KSKeepsakesConduitProtocol& exported, StatusSource& status) {
    loop_->start(exported, status);
}

void BusListener::emitEventsChanged() {
    mailbox_->post([](BusLoop& loop) { loop.emitChange("EventsChanged"); });
}

void BusListener::emitBundlesChanged() {
    mailbox_->post([](BusLoop& loop) { loop.emitChange("BundlesChanged"); });
}

void BusListener::emitProgress(std::string activity, std::uint64_t done, std::uint64_t total) {
    mailbox_->post([activity = std::move(activity), done, total](BusLoop& loop) {
        loop.emitProgress(activity, done, total);
    });
}

void BusListener::invalidate() { loop_->stop(); }

}  // namespace keepsakes
