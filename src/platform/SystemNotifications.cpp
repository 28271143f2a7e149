// SPDX-License-Identifier: Apache-2.0
#include "platform/SystemNotifications.h"

#include <utility>

namespace keepsakes {

void SystemNotifications::post(std::string_view name) { observers_.notify(std::string(name)); }

Observation SystemNotifications::observe(std::string_view name, const WorkQueue& queue,
                                         Task handler) {
    return observers_.add(
        queue, [wanted = std::string(name), run = std::move(handler)](const std::string& posted) {
            if (posted == wanted) run();
        });
}

}  // namespace keepsakes
