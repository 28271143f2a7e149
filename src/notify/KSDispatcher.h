// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <memory>

#include "core/KSValue.h"

namespace keepsakes {

class KSNotifier;

/// A consumer's side of one notifier: a handler for each notification it cares for. Handlers run
/// on the notifier's queue and hand long work on.
/// While registered, notifier and dispatcher hold each other; the owner ends that with
/// `invalidate`.
class KSDispatcher final : public std::enable_shared_from_this<KSDispatcher> {
  public:
    using Handler = std::function<void(std::int32_t identifier, const KSValue& payload)>;

    static std::shared_ptr<KSDispatcher> initWithNotifier(std::shared_ptr<KSNotifier> notifier);

    /// The first handler for an identifier stays; a second one, or none, changes nothing. A
    /// payload that the notifier remembers is handed over before this returns. Not on its queue.
    void registerForNotification(std::int32_t identifier, Handler handler);

    /// Drops the handler and detaches from the notifier as a whole: handlers for other
    /// identifiers stay but hear nothing until one is registered again. Not on its queue.
    void unregisterForNotification(std::int32_t identifier);

    /// Drops every handler and detaches. Not on the notifier's queue.
    void invalidate();

  private:
    friend class KSNotifier;
    explicit KSDispatcher(std::shared_ptr<KSNotifier> notifier);
    void onNotification(std::int32_t identifier, const KSValue& payload);

    const std::shared_ptr<KSNotifier> notifier_;
    std::map<std::int32_t, Handler> handlerMap_;  // only on its queue while attached
};

}  // namespace keepsakes
