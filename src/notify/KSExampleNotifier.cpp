// SPDX-License-Identifier: Apache-2.0
#include "notify/KSExampleNotifier.h"

namespace keepsakes {

namespace {

constexpr double kPeriodSeconds = 1;
constexpr std::int32_t kTicksPerMinute = 60;

}  // namespace

KSExampleNotifier::KSExampleNotifier(std::string_view name, Clock& clock)
    : KSNotifier(name), clock_(clock) {}

KSExampleNotifier::~KSExampleNotifier() {
    queue().sync([this] { next_.cancel(); });
}

void KSExampleNotifier::onEnable() {
    count_ = 0;
    tick();
}

void KSExampleNotifier::tick() {
    if (!isEnabled()) return;
    notify(0, count_);
    if (count_ % kTicksPerMinute == 0) notify(1, count_);
    next_ = clock_.after(queue(), kPeriodSeconds, [this] {
        ++count_;
        tick();
    });
}

}  // namespace keepsakes
