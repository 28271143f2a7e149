// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <fmt/format.h>

#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "core/WorkQueue.h"
#include "notify/KSDispatcher.h"
#include "notify/KSNotifier.h"

namespace keepsakes {

/// Writes down what it hears, a line each: "<identifier> <payload>".
class Listener {
  public:
    explicit Listener(std::shared_ptr<KSNotifier> notifier)
        : dispatcher(KSDispatcher::initWithNotifier(std::move(notifier))) {}
    ~Listener() { dispatcher->invalidate(); }

    void hear(std::int32_t identifier, const std::string& name = "") {
        dispatcher->registerForNotification(
            identifier, [this, name](std::int32_t sent, const KSValue& payload) {
                heard.push_back(fmt::format("{}{} {}", name, sent, payload.description()));
            });
    }

    std::shared_ptr<KSDispatcher> dispatcher;
    std::vector<std::string> heard;
};

inline void settle() { WorkerThreads::shared().settle(); }

}  // namespace keepsakes
