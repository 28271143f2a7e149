// SPDX-License-Identifier: Apache-2.0
#include "notify/KSWatchDog.h"

#include <fmt/format.h>

#include <utility>

#include "platform/AnalyticsService.h"
#include "platform/PlatformServices.h"

namespace keepsakes {

namespace {

constexpr std::string_view kAnalyticsEvent = "com.brindle.Keepsakes.DaemonWatchDog";
constexpr int kFatalExitStatus = 255;

}  // namespace

KSWatchDog::KSWatchDog(std::string_view name, const PlatformServices& platform,
                       WarningHandler handler)
    : name_(name),
      platform_(platform),
      handler_(std::move(handler)),
      queue_(fmt::format("KSWatchDog:{}", name)) {
    setCadenceSeconds(kDefaultCadenceSeconds);
}

KSWatchDog::~KSWatchDog() {
    if (queue_.isCurrent()) return;  // the last holder let go inside its own warning handler
    queue_.sync([this] { _cancel(); });
}

void KSWatchDog::setCadenceSeconds(float seconds) {
    if (!(seconds > 0)) return;
    cadenceSeconds_ = seconds;
    pet();
}

void KSWatchDog::pet() {
    queue_.async([this] { _pet(); });
}

void KSWatchDog::cancel() {
    queue_.async([this] { _cancel(); });
}

void KSWatchDog::_pet() {
    cancel();
    _arm();
}

void KSWatchDog::_arm() {
    timer_ = platform_.clock->after(queue_, cadenceSeconds_, [this] {
        _arm();
        fire();
    });
}

void KSWatchDog::_cancel() {
    timer_.cancel();
    failureCount_ = 0;
}

void KSWatchDog::fire() {
    if (failureCount_ >= kMostWarnings) {
        report(true);
        platform_.exitProcess(kFatalExitStatus);
        return;
    }
    ++failureCount_;
    report(false);
    if (handler_) handler_(failureCount_);
}

void KSWatchDog::report(bool fatal) {
    platform_.analytics->send(
        kAnalyticsEvent,
        {{"Name", name_}, {"SuccessiveWarningCount", failureCount_}, {"Fatal", fatal ? 1 : 0}});
}

}  // namespace keepsakes
