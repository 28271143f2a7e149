// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <memory>
#include <mutex>
#include <utility>
#include <vector>

#include "core/WorkQueue.h"

namespace keepsakes {

/// Keeps a handler registered while it lives. Dropped on the queue that the handler runs on, it is
/// the end: the handler does not run afterwards. Dropped elsewhere, a call that has begun goes on.
using Observation = std::shared_ptr<const void>;

/// Those who want to hear of something, each on a queue of its own. Any thread may call it.
template <class... Arguments>
class Observers {
  public:
    using Handler = std::function<void(const Arguments&...)>;

    [[nodiscard]] Observation add(const WorkQueue& queue, Handler handler) {
        auto entry = std::make_shared<Entry>(queue.detachedAppender(), std::move(handler));
        const std::lock_guard lock(mutex_);
        std::erase_if(entries_, [](const auto& known) { return known.expired(); });
        entries_.push_back(entry);
        return entry;
    }

    /// Returns at once. What is announced in turn is heard in that order.
    void notify(const Arguments&... arguments) const {
        const std::lock_guard lock(mutex_);
        for (const auto& entry : entries_) tell(entry, arguments...);
    }

    /// As `notify`, to one that `add` answered.
    void notifyOnly(const Observation& observation, const Arguments&... arguments) const {
        tell(std::static_pointer_cast<const Entry>(observation), arguments...);
    }

  private:
    struct Entry {
        Entry(std::function<void(Task)> appender, Handler toCall)
            : append(std::move(appender)), handler(std::move(toCall)) {}
        const std::function<void(Task)> append;
        const Handler handler;
    };

    static void tell(const std::weak_ptr<const Entry>& observer, const Arguments&... arguments) {
        const auto entry = observer.lock();
        if (!entry) return;
        entry->append([observer, ... copies = arguments] {
            if (const auto listening = observer.lock()) listening->handler(copies...);
        });
    }

    mutable std::mutex mutex_;
    std::vector<std::weak_ptr<const Entry>> entries_;
};

}  // namespace keepsakes
