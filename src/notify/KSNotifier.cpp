// SPDX-License-Identifier: Apache-2.0
#include "notify/KSNotifier.h"

#include <fmt/format.h>

#include <algorithm>
#include <utility>

#include "notify/KSDispatcher.h"

namespace keepsakes {

KSNotifier::KSNotifier(std::string_view name)
    : queue_(fmt::format("com.brindle.keepsakesd:{}", name.empty() ? "anonymous" : name)) {}

KSNotifier::~KSNotifier() = default;

void KSNotifier::notify(std::int32_t identifier, KSValue payload) {
    queue_.async([this, identifier, payload = std::move(payload)] {
        for (const auto& dispatcher : dispatchers_) dispatcher->onNotification(identifier, payload);
    });
}

void KSNotifier::notifyAndPersist(std::int32_t identifier, KSValue payload) {
    queue_.async([this, identifier, payload = std::move(payload)] {
        notify(identifier, payload);
        persistedPayload_.insert_or_assign(identifier, payload);
    });
}

std::size_t KSNotifier::observerCount() {
    std::size_t count = 0;
    queue_.sync([this, &count] { count = dispatchers_.size(); });
    return count;
}

std::vector<std::string> KSNotifier::diagnosticLines() const {
    return {enabled_ ? "somebody listens" : "nobody listens"};
}

void KSNotifier::registerDispatcher(const std::shared_ptr<KSDispatcher>& dispatcher,
                                    std::int32_t identifier) {
    queue_.sync([this, &dispatcher, identifier] {
        if (std::ranges::find(dispatchers_, dispatcher) == dispatchers_.end()) {
            dispatchers_.push_back(dispatcher);
            onObserverCountChange(dispatchers_.size());
            if (!enabled_) {
                enabled_ = true;
                onEnable();
            }
        }
        const auto persisted = persistedPayload_.find(identifier);
        if (persisted != persistedPayload_.end()) {
            dispatcher->onNotification(identifier, KSValue(persisted->second));
        }
    });
}

void KSNotifier::unregisterDispatcher(const std::shared_ptr<KSDispatcher>& dispatcher) {
    queue_.sync([this, &dispatcher] {
        if (std::erase(dispatchers_, dispatcher) == 0) return;
        onObserverCountChange(dispatchers_.size());
        if (dispatchers_.empty() && enabled_) {
            enabled_ = false;
            onDisable();
        }
    });
}

void KSNotifier::onObserverCountChange(std::size_t) {}
void KSNotifier::onEnable() {}
void KSNotifier::onDisable() {}

}  // namespace keepsakes
