// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>
#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "core/KSValue.h"
#include "core/ServiceLookup.h"
#include "core/WorkQueue.h"

namespace keepsakes {

class KSDispatcher;

/// A named source of numbered notifications. Delivers each, with a copy of its payload, to every
/// attached dispatcher on its own serial queue, and remembers the payloads it is told to, for
/// dispatchers that attach later. Owned by the registry or by its maker. `notify` may be called
/// from any thread; attaching and detaching wait for the queue and must not be called on it.
class KSNotifier : public KSService {
  public:
    /// The queue is labelled "com.brindle.keepsakesd:<name>", or "…:anonymous" for an empty name.
    explicit KSNotifier(std::string_view name);
    ~KSNotifier() override;
    KSNotifier(const KSNotifier&) = delete;
    KSNotifier& operator=(const KSNotifier&) = delete;

    static bool isAvailable() { return true; }

    /// Return at once; the delivery follows on the queue.
    void notify(std::int32_t identifier, KSValue payload);
    void notifyAndPersist(std::int32_t identifier, KSValue payload);

    /// Whether a dispatcher is attached.
    bool isEnabled() const { return enabled_; }
    std::size_t observerCount();
    std::vector<std::string> diagnosticLines() const override;
    WorkQueue& queue() { return queue_; }

  protected:
    friend class KSDispatcher;
    void registerDispatcher(const std::shared_ptr<KSDispatcher>& dispatcher,
                            std::int32_t identifier);
    void unregisterDispatcher(const std::shared_ptr<KSDispatcher>& dispatcher);

    /// On the queue: after every change of the dispatchers, when the first one attaches, when the
    /// last one detaches.
    virtual void onObserverCountChange(std::size_t count);
    virtual void onEnable();
    virtual void onDisable();

  private:
    // Only on the queue.
    std::vector<std::shared_ptr<KSDispatcher>> dispatchers_;
    std::map<std::int32_t, KSValue> persistedPayload_;

    std::atomic<bool> enabled_ = false;
    WorkQueue queue_;  // last: its end waits for the tasks that use the members above
};

}  // namespace keepsakes
