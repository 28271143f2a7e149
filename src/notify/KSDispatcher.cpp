// SPDX-License-Identifier: Apache-2.0
#include "notify/KSDispatcher.h"

#include <utility>

#include "notify/KSNotifier.h"

namespace keepsakes {

KSDispatcher::KSDispatcher(std::shared_ptr<KSNotifier> notifier) : notifier_(std::move(notifier)) {}

std::shared_ptr<KSDispatcher> KSDispatcher::initWithNotifier(std::shared_ptr<KSNotifier> notifier) {
    return std::shared_ptr<KSDispatcher>(new KSDispatcher(std::move(notifier)));
}

void KSDispatcher::registerForNotification(std::int32_t identifier, Handler handler) {
    if (!handler) return;
    // On the notifier's queue, for an earlier handler may be hearing something right now.
    bool isFirst = false;
    notifier_->queue().sync([this, identifier, &handler, &isFirst] {
        isFirst = handlerMap_.emplace(identifier, std::move(handler)).second;
    });
    if (isFirst) notifier_->registerDispatcher(shared_from_this(), identifier);
}

void KSDispatcher::unregisterForNotification(std::int32_t identifier) {
    // Detached first, so that the map never changes under a delivery; the other handlers hear
    // nothing from here on either way.
    notifier_->unregisterDispatcher(shared_from_this());
    handlerMap_.erase(identifier);
}

void KSDispatcher::invalidate() {
    notifier_->unregisterDispatcher(shared_from_this());
    handlerMap_.clear();
}

void KSDispatcher::onNotification(std::int32_t identifier, const KSValue& payload) {
    const auto handler = handlerMap_.find(identifier);
    if (handler != handlerMap_.end()) handler->second(identifier, payload);
}

}  // namespace keepsakes
